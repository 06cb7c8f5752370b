#pragma once

#include <array>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/Budget.h"
#include "platform/api/FileManager.h"
#include "platform/api/Log.h"
#include "zelkord/feedback/SessionStorage.h"

namespace zelkord {

// What all containers take of the disk, kept within bounds.
//
// A container is open until it has ended; it is then kept until it is deleted. Where another file
// or another record does not fit, those that ended first go; when none is left to go, it is
// refused. Of sessions for one occasion a process has a quarter, and beyond that its own go; where
// those of all are too many, they go of whoever has most. What an earlier process left counts in
// all, but nobody knows of what kind it was.
//
// Threading: any thread; files are removed on the caller's.
// Ownership: the references outlive it. Errors: what goes or is refused is counted and named.
class ContainerRoom final {
 public:
  using Id = std::uint64_t;
  struct Amount {
    std::uint64_t files = 0;
    std::uint64_t bytes = 0;
  };
  static constexpr std::uint64_t kMiB = 1024 * 1024;
  static constexpr Amount kInAll{1024, 256 * kMiB};
  static constexpr Amount kOfOneOff{512, 64 * kMiB};
  static constexpr Amount kOfOneOffOfAHolder{128, 16 * kMiB};

  ContainerRoom(FileManager& files, LimitReports& limits, const Logger& log);

  // A place for an empty file; none when there is none.
  std::optional<Id> open(SessionKind kind, const std::string& holder);
  // Whether the file may become so much larger.
  bool grow(Id container, std::uint64_t bytes);
  // The file did not become so much larger.
  void giveBack(Id container, std::uint64_t bytes);
  // Nothing is added any more.
  void end(Id container, const std::string& path);
  // There is no such file, or no more.
  void forget(Id container);
  void forget(const std::string& path);
  // Files of an earlier process, oldest first.
  void adopt(const std::vector<std::pair<std::string, std::uint64_t>>& pathsAndSizes);

  // Of those that have ended, in that order.
  std::vector<std::string> endedPaths() const;
  Amount used() const;

 private:
  struct Container {
    SessionKind kind = SessionKind::Managed;
    std::string holder = {};  // of budgets, for one occasion
    std::uint64_t bytes = 0;
    std::optional<std::uint64_t> ended = std::nullopt;  // its number among those that ended
    std::string path = {};                              // once it has
  };
  using Containers = std::map<Id, Container>;

  Amount _heldBy(const std::string& holder) const ZK_REQUIRES(mutex_);
  bool _makeRoom(const Container& whose, Amount more, std::vector<std::string>& gone)
      ZK_REQUIRES(mutex_);
  std::optional<Id> _next(const Container& whose, Amount more) const ZK_REQUIRES(mutex_);
  std::optional<Id> _oldest() const ZK_REQUIRES(mutex_);
  std::optional<Id> _oldestOneOffOf(const std::string& holder) const ZK_REQUIRES(mutex_);
  std::optional<Id> _oldestOfWhoHasMost(bool ofBytes) const ZK_REQUIRES(mutex_);
  Id _add(Container container) ZK_REQUIRES(mutex_);
  void _count(const Container& container, std::uint64_t bytes, bool isMore) ZK_REQUIRES(mutex_);
  void _countOneOffFile(const Container& container, bool isMore) ZK_REQUIRES(mutex_);
  void _drop(Containers::iterator place) ZK_REQUIRES(mutex_);
  // Removes what had to go, and tells.
  void _finish(const Container& whose, const std::vector<std::string>& gone, bool fits);

  // Fixed after construction.
  FileManager& files_;
  LimitReports& limits_;
  const Logger& log_;

  // Own synchronisation.
  mutable Mutex mutex_;
  Containers containers_ ZK_GUARDED_BY(mutex_);
  std::map<std::uint64_t, Id> ended_ ZK_GUARDED_BY(mutex_);
  Id lastId_ ZK_GUARDED_BY(mutex_) = 0;
  std::uint64_t lastEnded_ ZK_GUARDED_BY(mutex_) = 0;
  Amount inAll_ ZK_GUARDED_BY(mutex_);
  Amount ofOneOff_ ZK_GUARDED_BY(mutex_);
  std::map<std::string, Amount> ofHolders_ ZK_GUARDED_BY(mutex_);  // of one-off ones
};

}  // namespace zelkord
