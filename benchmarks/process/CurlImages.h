#pragma once

#include <curl/curl.h>

#include <cstddef>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

namespace zelkord::bench {

// The least that a program can do to get many files at once: as many libcurl handles on one multi
// loop of the caller's thread, whose connections stay open.
//
// Threading: one thread. Errors: throws std::runtime_error unless all answers are 200.
class CurlImages {
 public:
  CurlImages(const std::filesystem::path& roots, std::size_t count);
  ~CurlImages();
  CurlImages(const CurlImages&) = delete;
  CurlImages& operator=(const CurlImages&) = delete;

  // The sum of the bodies' sizes; as many URLs as there are handles.
  std::size_t fetch(const std::vector<std::string>& urls);

 private:
  struct Release {
    void operator()(CURL* easy) const { curl_easy_cleanup(easy); }
  };
  using Handle = std::unique_ptr<CURL, Release>;

  CURLM* const multi_;
  std::vector<Handle> handles_;
  std::vector<std::string> bodies_;
};

}  // namespace zelkord::bench
