#pragma once

#include <concepts>
#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "base/Export.h"
#include "base/Time.h"
#include "corezelkor/client/Client.h"

namespace zelkor {

// The daemon's second connection, for what goes on beside typing: further results, cards, images.
// Its address comes with the client's configuration. The daemon serves few of them at a time.
//
// Threading, errors: as Client. Ownership: the client outlives it; copies are the same connection.
class ZK_EXPORT EndpointClient {
 public:
  explicit EndpointClient(Client& client) : core_(*client.core_) {}

  // A ZLKMoreResultsRequest or ZLKCardRequest; others are never answered.
  ZLKFuture<ClientAnswer> request(std::shared_ptr<const ZLKRequest> request) const;
  template <std::derived_from<ZLKRequest> Request>
  ZLKFuture<ClientAnswer> request(Request query) const {
    return request(std::make_shared<const Request>(std::move(query)));
  }

  // Bytes by URL or identifier, of the images that were there within `timeout`; at most 1,000. The
  // call as a whole still ends with ClientOptions::timeout.
  ZLKFuture<ClientResult<std::map<std::string, Data>>> loadImages(
      std::vector<ImageDescriptor> images, Duration timeout) const;

 private:
  ClientCore& core_;
};

}  // namespace zelkor
