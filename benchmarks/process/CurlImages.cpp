#include "benchmarks/process/CurlImages.h"

#include <stdexcept>

namespace zelkord::bench {
namespace {

std::size_t appendBody(char* bytes, std::size_t, std::size_t size, void* body) {
  static_cast<std::string*>(body)->append(bytes, size);
  return size;
}

}  // namespace

CurlImages::CurlImages(const std::filesystem::path& roots, std::size_t count)
    : multi_(curl_multi_init()), bodies_(count) {
  // As many as the daemon keeps.
  curl_multi_setopt(multi_, CURLMOPT_MAXCONNECTS, 32L);
  for (auto& body : bodies_) {
    auto* easy = handles_.emplace_back(curl_easy_init()).get();
    curl_easy_setopt(easy, CURLOPT_CAINFO, roots.c_str());
    curl_easy_setopt(easy, CURLOPT_NOSIGNAL, 1L);
    curl_easy_setopt(easy, CURLOPT_TIMEOUT, 30L);
    curl_easy_setopt(easy, CURLOPT_WRITEFUNCTION, &appendBody);
    curl_easy_setopt(easy, CURLOPT_WRITEDATA, &body);
  }
}

CurlImages::~CurlImages() {
  handles_.clear();
  curl_multi_cleanup(multi_);
}

std::size_t CurlImages::fetch(const std::vector<std::string>& urls) {
  for (std::size_t i = 0; i < handles_.size(); ++i) {
    bodies_[i].clear();
    curl_easy_setopt(handles_[i].get(), CURLOPT_URL, urls[i].c_str());
    curl_multi_add_handle(multi_, handles_[i].get());
  }
  int running = 1;
  while (curl_multi_perform(multi_, &running) == CURLM_OK && running > 0) {
    curl_multi_poll(multi_, nullptr, 0, 1000, nullptr);
  }
  std::size_t sum = 0;
  for (std::size_t i = 0; i < handles_.size(); ++i) {
    curl_multi_remove_handle(multi_, handles_[i].get());
    long status = 0;
    curl_easy_getinfo(handles_[i].get(), CURLINFO_RESPONSE_CODE, &status);
    if (status != 200) throw std::runtime_error("an image came with " + std::to_string(status));
    sum += bodies_[i].size();
  }
  return sum;
}

}  // namespace zelkord::bench
