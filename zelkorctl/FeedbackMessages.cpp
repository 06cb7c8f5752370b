#include "zelkorctl/FeedbackMessages.h"

#include <google/protobuf/descriptor.h>
#include <google/protobuf/message.h>
#include <google/protobuf/util/json_util.h>

#include <initializer_list>
#include <memory>
#include <string_view>

#include "corezelkor/proto/Feedback.pb.h"

namespace zelkorctl {
namespace {

using google::protobuf::Message;

std::unique_ptr<Message> newMessage(const std::string& className) {
  // Naming one of them links them all.
  const auto* pool = corezelkor::CZError::descriptor()->file()->pool();
  const auto* type = pool->FindMessageTypeByName("corezelkor." + messageNameOf(className));
  if (!type) return nullptr;
  return std::unique_ptr<Message>(
      google::protobuf::MessageFactory::generated_factory()->GetPrototype(type)->New());
}

}  // namespace

std::string messageNameOf(const std::string& className) {
  for (const std::string_view prefix : {"HV", "ZLK", "Zelkor"}) {
    if (!className.starts_with(prefix)) continue;
    auto name = "CZ" + className.substr(prefix.size());
    if (!name.ends_with("Feedback")) name += "Feedback";
    return name;
  }
  return className;
}

std::optional<std::string> messageFromJson(const std::string& className, const std::string& json,
                                           std::string& problem) {
  const auto message = newMessage(className);
  if (!message) {
    problem = "no feedback class '" + className + "'";
    return std::nullopt;
  }
  const auto status = google::protobuf::util::JsonStringToMessage(json, message.get());
  if (status.ok()) return message->SerializeAsString();
  problem = std::string(status.message());
  return std::nullopt;
}

json::value jsonOfMessage(const std::string& className, const std::string& bytes) {
  const auto message = newMessage(className);
  if (!message || !message->ParseFromString(bytes)) return nullptr;
  google::protobuf::util::JsonPrintOptions options;
  options.preserve_proto_field_names = true;
  std::string text;
  if (!google::protobuf::util::MessageToJsonString(*message, &text, options).ok()) return nullptr;
  return parseJson(text).value_or(nullptr);
}

}  // namespace zelkorctl
