#pragma once

#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "corezelkor/Messages.h"
#include "platform/api/URLRequest.h"
#include "zelkord/network/exchange/URLComponents.h"

namespace zelkord {

// Assembles a request: a base URL whose own query items are kept, further items and header fields.
// At most one item and one header a name; names compare exactly. "force" replaces, "default" adds
// what is absent. Items are written sorted by name (UTF-16 code unit), whatever the order in which
// they came; headers in the order in which they came.
//
// A value: threading as for any value. Errors: `make` gives none for a malformed URL.
class ZelkorURLRequestBuilder final {
 public:
  static std::optional<ZelkorURLRequestBuilder> make(std::string_view url);
  // Of several own items of a name the last one counts.
  explicit ZelkorURLRequestBuilder(URLComponents components);

  bool containsQueryItemWithName(std::string_view name) const;
  void forceQueryItem(URLQueryItem item);
  void forceQueryItemWithName(std::string_view name, std::optional<std::string> value);
  void forceQueryItemsFromArray(std::span<const QueryItem> items);
  void defaultQueryItem(URLQueryItem item);
  void defaultQueryItemWithName(std::string_view name, std::optional<std::string> value);

  bool containsHttpHeaderWithName(std::string_view name) const;
  void forceHttpHeaderWithName(std::string_view name, std::string value);
  void defaultHttpHeaderWithName(std::string_view name, std::string value);

  URLRequest createMutableUrlRequest() const;
  URLRequest createUrlRequest() const { return createMutableUrlRequest(); }

 private:
  using Items = std::vector<URLQueryItem>;

  // Where the name stands or belongs among the sorted items.
  Items::const_iterator _place(std::string_view name) const;
  bool _stands(Items::const_iterator place, std::string_view name) const;

  URLComponents urlComponents_;  // its items: sorted, one a name
  HTTPHeaders httpHeaders_;
};

}  // namespace zelkord
