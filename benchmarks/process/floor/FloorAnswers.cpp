#include "benchmarks/process/floor/FloorAnswers.h"

namespace zelkord::bench {
namespace {

zelkor::MessagePointer returnOf(sd_bus_message* call) {
  sd_bus_message* reply = nullptr;
  sd_bus_message_new_method_return(call, &reply);
  return zelkor::MessagePointer(reply);
}

}  // namespace

bool asksForConfiguration(sd_bus_message* call) {
  return std::string_view(sd_bus_message_get_member(call)) == "Configure";
}

zelkor::MessagePointer configuration(sd_bus_message* call) {
  auto reply = returnOf(call);
  sd_bus_message_append(reply.get(), "s", "unix:path=/nowhere");
  return reply;
}

zelkor::MessagePointer answerWith(std::string_view body, std::int64_t queryId,
                                  sd_bus_message* call) {
  auto owned = returnOf(call);
  auto* reply = owned.get();
  if (body.empty()) {
    sd_bus_message_append(reply, "xa{sv}a{sv}", queryId, 0, 0);
    return owned;
  }
  sd_bus_message_append(reply, "x", queryId);
  sd_bus_message_open_container(reply, 'a', "{sv}");
  sd_bus_message_append(reply, "{sv}", "scale", "d", 1.0);
  sd_bus_message_open_container(reply, 'e', "sv");
  sd_bus_message_append(reply, "s", "data");
  sd_bus_message_open_container(reply, 'v', "ay");
  sd_bus_message_append_array(reply, 'y', body.data(), body.size());
  for (int i = 0; i < 3; ++i) sd_bus_message_close_container(reply);
  sd_bus_message_append(reply, "a{sv}", 0);
  return owned;
}

zelkor::MessagePointer failure(sd_bus_message* call) {
  const sd_bus_error error{SD_BUS_ERROR_FAILED, "the service does not answer", 0};
  sd_bus_message* reply = nullptr;
  sd_bus_message_new_method_error(call, &reply, &error);
  return zelkor::MessagePointer(reply);
}

}  // namespace zelkord::bench
