#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

#include "benchmarks/process/Samples.h"
#include "benchmarks/process/SearchCall.h"
#include "benchmarks/process/Waiting.h"

namespace zelkord::bench {

// Many clients at the private door, all served by the caller's thread, none of which waits.
//
// Threading: one thread. Errors: throws std::runtime_error when a connection fails; errors in
// answers are counted.
class Crowd {
 public:
  // Connects them and asks for their configuration, but does not wait for it.
  Crowd(const std::string& address, std::size_t clients);
  ~Crowd();
  Crowd(const Crowd&) = delete;
  Crowd& operator=(const Crowd&) = delete;

  // The query gets the client's next number.
  void search(std::size_t client, Search query);
  // Handles what comes in until then.
  void serveUntil(Clock::time_point end);
  // The same until everything is answered.
  void serveUntilAnswered(Clock::time_point end);

  std::size_t pending() const { return pending_; }
  std::size_t errors() const { return errors_; }
  // From question to answer, in milliseconds.
  const Samples& answers() const { return answers_; }

 private:
  struct Member;
  struct Question;

  void _send(Member& member, zelkor::MessagePointer call, bool isSearch);
  void _answered(const Question& question, sd_bus_message* reply);
  void _process(Member& member) const;
  void _serveOnce(Clock::time_point end);

  const int epoll_;
  std::vector<std::unique_ptr<Member>> members_;
  std::size_t pending_ = 0;
  std::size_t errors_ = 0;
  Samples answers_;
};

}  // namespace zelkord::bench
