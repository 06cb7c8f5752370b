#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "base/Data.h"
#include "base/Error.h"
#include "corezelkor/Messages.h"

namespace zelkor {

// What a call gave: a value, an error, or neither where the daemon had nothing to say.
template <typename T>
struct ClientResult {
  std::optional<T> value;
  std::optional<Error> error;
};

struct Nothing {};

// The answer to one query. Neither reply nor error: there is nothing for this query, because a
// newer one came, the text is too short, or the service is switched off.
struct ClientAnswer {
  std::int64_t queryId = 0;
  std::optional<ZLKReply> reply;
  std::optional<Error> error;
};

// The configuration document as this client sees it.
struct ClientBag {
  std::optional<std::string> version;
  bool enabled = true;
  bool feedbackEnabled = false;
  std::string rawBag;  // the whole document as JSON, without the overrides by user agent
};

// One client that the daemon knows.
struct ClientSessionEntry {
  std::string identifier;
  std::string agent;
};

// An image to load: by URL, or by the identifier that the bag maps to a URL.
struct ImageDescriptor {
  std::string url;
  std::string id;
  Data data;
};

// A file that the daemon keeps, opened for reading.
struct ResourceFile {
  std::shared_ptr<const int> descriptor;  // closed with the last copy
  std::uint64_t size = 0;
  double modificationDate = 0;  // seconds since 1970
  double creationDate = 0;
  std::uint32_t posixPermissions = 0;
};

}  // namespace zelkor
