#pragma once

#include <curl/curl.h>

#include <cstddef>
#include <filesystem>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace zelkord::bench {

// The least that a program can do to talk to the service: one libcurl handle on a multi loop of the
// caller's thread, whose connection stays open.
//
// Threading: one thread. Errors: throws std::runtime_error unless the answer is a 2xx.
class CurlClient {
 public:
  using Headers = std::vector<std::pair<std::string, std::string>>;

  explicit CurlClient(const std::filesystem::path& roots);
  CurlClient(const CurlClient&) = delete;
  CurlClient& operator=(const CurlClient&) = delete;

  // What the next fetches ask for.
  void prepare(const std::string& url, const Headers& headers);
  // Size of the body.
  std::size_t fetch();
  std::string post(const std::string& url, const std::string& body);

 private:
  struct Release {
    void operator()(CURL* easy) const { curl_easy_cleanup(easy); }
    void operator()(curl_slist* list) const { curl_slist_free_all(list); }
  };
  struct ReleaseMulti {
    void operator()(CURLM* multi) const { curl_multi_cleanup(multi); }
  };

  void _perform();

  const std::unique_ptr<CURLM, ReleaseMulti> multi_;
  const std::unique_ptr<CURL, Release> easy_;
  std::unique_ptr<curl_slist, Release> headers_;
  std::string body_;
};

}  // namespace zelkord::bench
