#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <string_view>

#include "corezelkor/Messages.h"
#include "corezelkor/client/internal/BusPointers.h"
#include "corezelkor/client/internal/MessageWriter.h"

namespace zelkord::soak {

// How the attackers configure themselves.
inline constexpr const char* kHostileIdentifier = "com.quenta.hostile";
inline constexpr const char* kHostileAgent = "Hostile/1.0";

// A client at a private door that calls what it likes.
//
// Threading: one thread. Errors: refused calls and closed connections end quietly; `isOpen` tells.
class Caller {
 public:
  // `address`: a D-Bus address.
  explicit Caller(const std::string& address);

  bool isOpen() const { return bus_ != nullptr; }
  // Waits for the answer, two seconds at most. The address of the endpoint, empty when refused.
  std::string configure(const std::string& identifier, const std::string& userAgent);
  // Sends a call and does not wait; `answered` runs in `process`. False when it cannot be sent.
  using Encode = std::function<void(zelkor::MessageWriter&)>;
  bool call(std::string_view interface, const char* member, const Encode& encode);
  bool request(const zelkor::ZLKRequest& request);
  bool report(std::string_view feedbackClass, std::string_view message);
  // Reads what comes, for that long or until `answers` calls have ended.
  void process(std::chrono::milliseconds time, std::uint64_t answers);
  std::uint64_t answered() const { return *answered_; }

 private:
  static int _onAnswer(sd_bus_message* message, void* answered, sd_bus_error* error);

  const std::shared_ptr<std::uint64_t> answered_ = std::make_shared<std::uint64_t>(0);
  zelkor::BusPointer bus_;
};

// "unix:path=..."
std::string addressOfSocket(const std::string& path);

}  // namespace zelkord::soak
