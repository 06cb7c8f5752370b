#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "corezelkor/client/ClientTypes.h"
#include "corezelkor/client/internal/MessageReader.h"
#include "corezelkor/client/internal/MessageWriter.h"

namespace zelkor {

// The client library's messages in the form of the D-Bus interfaces. Each reader takes the
// arguments that are next; whether they were well-formed is the reader's `ok`.

// The kind's name and a{sv}, without the keys that have their default. Requires a known class.
void writeRequest(MessageWriter& writer, const ZLKRequest& request);
void writeConfiguration(MessageWriter& writer, const ZLKSessionConfiguration& configuration);
// aa{sv}
void writeDescriptors(MessageWriter& writer, const std::vector<ImageDescriptor>& descriptors);

// From a{sv}; an empty one is nothing.
std::optional<Error> readError(MessageReader& reader);
std::optional<ZLKReply> readReply(MessageReader& reader);
std::optional<ClientBag> readBag(MessageReader& reader);
// (x a{sv} a{sv})
ClientAnswer readAnswer(MessageReader& reader);
// aa{ss}
std::vector<ClientSessionEntry> readSessions(MessageReader& reader);
// as
std::vector<std::string> readTexts(MessageReader& reader);
// a{say}
std::map<std::string, Data> readImages(MessageReader& reader);
// a{sx}
std::map<std::string, std::int64_t> readMetrics(MessageReader& reader);
// (ah a{sv}); nothing without a descriptor.
std::optional<ResourceFile> readResource(MessageReader& reader);

}  // namespace zelkor
