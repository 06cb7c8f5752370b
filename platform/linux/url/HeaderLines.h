#pragma once

#include <curl/curl.h>

#include <string>
#include <string_view>
#include <vector>

#include "platform/api/URLRequest.h"

namespace zelkord {

// A request's headers in libcurl's form: the given ones exactly and in order, and nothing that
// libcurl would add by itself on account of a body. The storage is used again by the next request.
//
// Ownership: the list is valid until the next `set` or the object's end.
class HeaderLines {
 public:
  HeaderLines() = default;
  HeaderLines(const HeaderLines&) = delete;
  HeaderLines& operator=(const HeaderLines&) = delete;

  void set(const URLRequest& request);
  // Null when there are none.
  curl_slist* list() { return nodes_.empty() ? nullptr : nodes_.data(); }

 private:
  std::string& _nextLine();

  std::vector<std::string> lines_;
  std::size_t count_ = 0;
  std::vector<curl_slist> nodes_;
};

}  // namespace zelkord
