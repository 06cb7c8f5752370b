#include "corezelkor/client/internal/Wire.h"

#include <utility>

#include "corezelkor/internal/RequestKinds.h"

namespace zelkor {
namespace {

void textEntry(MessageWriter& writer, std::string_view key, const std::string& value) {
  if (!value.empty()) writer.entry(key, "s", [&] { writer.text(value); });
}

// Writes a field under the type that its place has.
struct FieldWriter {
  MessageWriter& writer;
  std::string_view key;

  void operator()(bool value) const { entry("b", value, &MessageWriter::flag); }
  void operator()(std::uint32_t value) const { entry("u", value, &MessageWriter::uint32); }
  void operator()(std::int64_t value) const { entry("x", value, &MessageWriter::int64); }
  void operator()(std::uint64_t value) const { entry("t", value, &MessageWriter::uint64); }
  void operator()(double value) const { entry("d", value, &MessageWriter::real); }
  void operator()(const std::string& value) const { textEntry(writer, key, value); }
  void operator()(const std::vector<QueryItem>& items) const {
    writer.entry(key, "a(ss)", [&] {
      writer.array("(ss)", [&] {
        for (const auto& item : items) {
          writer.structure("ss", [&] {
            writer.text(item.first);
            writer.text(item.second);
          });
        }
      });
    });
  }
  template <typename T>
  void entry(const char* type, T value, void (MessageWriter::*append)(T)) const {
    writer.entry(key, type, [&] { (writer.*append)(value); });
  }
};

HeaderFields readHeaders(MessageReader& reader) {
  HeaderFields headers;
  reader.value("a{ss}", [&] {
    reader.texts([&](std::string name, std::string value) {
      headers.emplace_back(std::move(name), std::move(value));
    });
  });
  return headers;
}

ZLKHTTPRequest readHTTPRequest(MessageReader& reader) {
  ZLKHTTPRequest request;
  reader.value("a{sv}", [&] {
    reader.dictionary([&](std::string_view key) {
      if (key == "url") request.url = reader.textValue();
      if (key == "headers") request.headers = readHeaders(reader);
    });
  });
  return request;
}

ZLKHTTPResponse readHTTPResponse(MessageReader& reader) {
  ZLKHTTPResponse response;
  reader.value("a{sv}", [&] {
    reader.dictionary([&](std::string_view key) {
      if (key == "url") response.url = reader.textValue();
      if (key == "status") reader.value("i", [&] { response.status = reader.int32(); });
      if (key == "headers") response.headers = readHeaders(reader);
    });
  });
  return response;
}

void readAttributes(MessageReader& reader, ResourceFile& file) {
  reader.dictionary([&](std::string_view key) {
    if (key == "size") reader.value("t", [&] { file.size = reader.uint64(); });
    if (key == "modificationDate")
      reader.value("d", [&] { file.modificationDate = reader.real(); });
    if (key == "creationDate") reader.value("d", [&] { file.creationDate = reader.real(); });
    if (key == "posixPermissions") {
      reader.value("u", [&] { file.posixPermissions = reader.uint32(); });
    }
  });
}

}  // namespace

void writeRequest(MessageWriter& writer, const ZLKRequest& request) {
  const auto& kind = *requestKindOf(request);
  writer.text(kind.name);
  writer.dictionary([&] {
    for (const auto fields : {commonRequestFields(), kind.fields}) {
      visitFields(request, fields, [&]<typename T>(std::string_view key, const T& value) {
        if (value != T()) FieldWriter{writer, key}(value);
      });
    }
  });
}

void writeConfiguration(MessageWriter& writer, const ZLKSessionConfiguration& configuration) {
  writer.dictionary([&] {
    textEntry(writer, "identifier", configuration.identifier);
    textEntry(writer, "userAgent", configuration.userAgent);
  });
}

void writeDescriptors(MessageWriter& writer, const std::vector<ImageDescriptor>& descriptors) {
  writer.array("a{sv}", [&] {
    for (const auto& image : descriptors) {
      writer.dictionary([&] {
        textEntry(writer, "url", image.url);
        textEntry(writer, "id", image.id);
        if (!image.data.empty()) {
          writer.entry("data", "ay", [&] { writer.bytes(image.data.view()); });
        }
      });
    }
  });
}

std::optional<Error> readError(MessageReader& reader) {
  Error error;
  const auto count = reader.dictionary([&](std::string_view key) {
    if (key == "domain") error.domain = reader.textValue();
    if (key == "code") reader.value("x", [&] { error.code = reader.int64(); });
    if (key == "userInfo") {
      reader.value("a{sv}", [&] {
        reader.dictionary([&](std::string_view name) {
          if (name == "reason") error.userInfo.emplace("reason", reader.textValue());
        });
      });
    }
  });
  return count > 0 ? std::optional(std::move(error)) : std::nullopt;
}

std::optional<ZLKReply> readReply(MessageReader& reader) {
  ZLKReply reply;
  const auto count = reader.dictionary([&](std::string_view key) {
    if (key == "scale") reader.value("d", [&] { reply.scale = reader.real(); });
    if (key == "data") reader.value("ay", [&] { reply.data = Data(reader.bytes()); });
    if (key == "geoSessionEntityString") reply.geoSessionEntityString = reader.textValue();
    if (key == "httpRequest") reply.httpRequest = readHTTPRequest(reader);
    if (key == "httpResponse") reply.httpResponse = readHTTPResponse(reader);
  });
  return count > 0 ? std::optional(std::move(reply)) : std::nullopt;
}

std::optional<ClientBag> readBag(MessageReader& reader) {
  ClientBag bag;
  const auto count = reader.dictionary([&](std::string_view key) {
    if (key == "version") bag.version = reader.textValue();
    if (key == "enabled") reader.value("b", [&] { bag.enabled = reader.flag(); });
    if (key == "feedbackEnabled") reader.value("b", [&] { bag.feedbackEnabled = reader.flag(); });
    if (key == "rawBag") bag.rawBag = reader.textValue();
  });
  return count > 0 ? std::optional(std::move(bag)) : std::nullopt;
}

ClientAnswer readAnswer(MessageReader& reader) {
  ClientAnswer answer;
  answer.queryId = reader.int64();
  answer.reply = readReply(reader);
  answer.error = readError(reader);
  return answer;
}

std::vector<ClientSessionEntry> readSessions(MessageReader& reader) {
  std::vector<ClientSessionEntry> sessions;
  reader.array("a{ss}", [&] {
    ClientSessionEntry entry;
    reader.texts([&](const std::string& key, const std::string& value) {
      if (key == "identifier") entry.identifier = value;
      if (key == "agent") entry.agent = value;
    });
    sessions.push_back(std::move(entry));
  });
  return sessions;
}

std::vector<std::string> readTexts(MessageReader& reader) {
  std::vector<std::string> texts;
  reader.array("s", [&] { texts.push_back(reader.text()); });
  return texts;
}

std::map<std::string, Data> readImages(MessageReader& reader) {
  std::map<std::string, Data> images;
  reader.entries("say", [&] {
    auto key = reader.text();
    images.insert_or_assign(std::move(key), Data(reader.bytes()));
  });
  return images;
}

std::map<std::string, std::int64_t> readMetrics(MessageReader& reader) {
  std::map<std::string, std::int64_t> metrics;
  reader.entries("sx", [&] {
    auto key = reader.text();
    metrics.insert_or_assign(std::move(key), reader.int64());
  });
  return metrics;
}

std::optional<ResourceFile> readResource(MessageReader& reader) {
  ResourceFile file;
  reader.array("h", [&] { file.descriptor = reader.descriptor(); });
  readAttributes(reader, file);
  return file.descriptor ? std::optional(std::move(file)) : std::nullopt;
}

}  // namespace zelkor
