#pragma once

#include <cstdint>
#include <string_view>

#include "corezelkor/client/internal/BusPointers.h"

namespace zelkord::bench {

// Answers in the daemon's form, not sent yet.

bool asksForConfiguration(sd_bus_message* call);
zelkor::MessagePointer configuration(sd_bus_message* call);
// An empty body is none: "nothing".
zelkor::MessagePointer answerWith(std::string_view body, std::int64_t queryId,
                                  sd_bus_message* call);
zelkor::MessagePointer failure(sd_bus_message* call);

}  // namespace zelkord::bench
