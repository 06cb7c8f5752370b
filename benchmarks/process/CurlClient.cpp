#include "benchmarks/process/CurlClient.h"

#include <stdexcept>

namespace zelkord::bench {
namespace {

std::size_t appendBody(char* bytes, std::size_t, std::size_t size, void* body) {
  static_cast<std::string*>(body)->append(bytes, size);
  return size;
}

}  // namespace

CurlClient::CurlClient(const std::filesystem::path& roots)
    : multi_(curl_multi_init()), easy_(curl_easy_init()) {
  curl_easy_setopt(easy_.get(), CURLOPT_CAINFO, roots.c_str());
  curl_easy_setopt(easy_.get(), CURLOPT_NOSIGNAL, 1L);
  curl_easy_setopt(easy_.get(), CURLOPT_ACCEPT_ENCODING, "gzip");
  curl_easy_setopt(easy_.get(), CURLOPT_TIMEOUT, 30L);
  curl_easy_setopt(easy_.get(), CURLOPT_WRITEFUNCTION, &appendBody);
  curl_easy_setopt(easy_.get(), CURLOPT_WRITEDATA, &body_);
}

void CurlClient::prepare(const std::string& url, const Headers& headers) {
  curl_slist* list = nullptr;
  for (const auto& [name, value] : headers) {
    list = curl_slist_append(list, (name + ": " + value).c_str());
  }
  curl_easy_setopt(easy_.get(), CURLOPT_URL, url.c_str());
  curl_easy_setopt(easy_.get(), CURLOPT_HTTPHEADER, list);
  curl_easy_setopt(easy_.get(), CURLOPT_HTTPGET, 1L);
  headers_.reset(list);
}

std::size_t CurlClient::fetch() {
  _perform();
  return body_.size();
}

std::string CurlClient::post(const std::string& url, const std::string& body) {
  prepare(url, {});
  curl_easy_setopt(easy_.get(), CURLOPT_COPYPOSTFIELDS, body.c_str());
  _perform();
  return body_;
}

void CurlClient::_perform() {
  body_.clear();
  curl_multi_add_handle(multi_.get(), easy_.get());
  int running = 1;
  while (curl_multi_perform(multi_.get(), &running) == CURLM_OK && running > 0) {
    curl_multi_poll(multi_.get(), nullptr, 0, 1000, nullptr);
  }
  curl_multi_remove_handle(multi_.get(), easy_.get());
  long status = 0;
  curl_easy_getinfo(easy_.get(), CURLINFO_RESPONSE_CODE, &status);
  if (status / 100 != 2) throw std::runtime_error("the sandbox said " + std::to_string(status));
}

}  // namespace zelkord::bench
