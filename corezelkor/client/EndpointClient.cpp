#include "corezelkor/client/EndpointClient.h"

#include <algorithm>
#include <chrono>

#include "corezelkor/Constants.h"
#include "corezelkor/client/internal/ClientCore.h"
#include "corezelkor/client/internal/RequestCall.h"
#include "corezelkor/client/internal/Wire.h"

namespace zelkor {
namespace {

ClientCore::Target endpointCall(std::string_view member) {
  return {ClientCore::Place::Endpoint, kEndpointInterface, member};
}

}  // namespace

ZLKFuture<ClientAnswer> EndpointClient::request(std::shared_ptr<const ZLKRequest> request) const {
  return callWithRequest(core_, endpointCall("Request"), std::move(request),
                         [&core = core_](MessageWriter& writer) {
                           writeConfiguration(writer, core.options().configuration);
                         });
}

ZLKFuture<ClientResult<std::map<std::string, Data>>> EndpointClient::loadImages(
    std::vector<ImageDescriptor> images, Duration timeout) const {
  const auto limit = std::chrono::ceil<std::chrono::milliseconds>(timeout).count();
  return core_.call<ClientResult<std::map<std::string, Data>>>(
      endpointCall("LoadImages"),
      [images = std::move(images), limit](MessageWriter& writer) {
        writeDescriptors(writer, images);
        writer.uint64(static_cast<std::uint64_t>(std::max<std::int64_t>(limit, 0)));
      },
      [](MessageReader& reader, auto& result) { result.value = readImages(reader); });
}

}  // namespace zelkor
