#pragma once

#include <sys/types.h>

#include <string>
#include <string_view>

namespace zelkord::ipc {

// The server's side of SASL EXTERNAL, the only way in: the client claims a user, who must be the
// one that the kernel or the bus driver has named.
//
// States: NeedsNul (the first byte), NeedsAuth, NeedsData (AUTH without a claim), NeedsBegin
// (accepted), Done, Failed. Threading: one thread at a time. Errors: what no honest client sends
// ends in Failed.
class Authenticator {
 public:
  enum class State { NeedsNul, NeedsAuth, NeedsData, NeedsBegin, Done, Failed };

  Authenticator(uid_t uid, std::string serverId) : uid_(uid), serverId_(std::move(serverId)) {}

  // How many of these bytes belong to the next step: the nul byte, or a line with its end. Zero:
  // more are needed. Looks at nothing beyond, where the first message may begin.
  std::size_t stepLength(std::string_view bytes);
  // Takes exactly one step and gives what the client is told.
  std::string step(std::string_view bytes);

  State state() const { return state_; }
  bool passesDescriptors() const { return passesDescriptors_; }

 private:
  std::string _line(std::string_view line);
  std::string _auth(std::string_view mechanism);
  std::string _claim(std::string_view hexadecimal);
  std::string _reject();
  std::string _fail();

  const uid_t uid_;
  const std::string serverId_;
  State state_ = State::NeedsNul;
  int rejections_ = 0;
  int lines_ = 0;
  bool passesDescriptors_ = false;
};

}  // namespace zelkord::ipc
