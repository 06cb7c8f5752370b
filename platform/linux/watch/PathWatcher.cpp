#include "platform/linux/watch/PathWatcher.h"

#include <sys/inotify.h>

#include <cerrno>
#include <cstring>
#include <map>
#include <set>
#include <utility>
#include <vector>

#include "base/Mutex.h"
#include "platform/linux/loop/Loop.h"
#include "platform/linux/system/Descriptor.h"
#include "platform/linux/watch/WatchPlan.h"

namespace zelkord {

// What the loop and the subscriptions share.
//
// Each watched path has places: inotify watches on itself, on its directory, and on what stands
// above it. An event in one of them makes the plan anew, since directories may have come or gone,
// and runs the handler.
class PathWatcher::Inotify final : public std::enable_shared_from_this<Inotify> {
 public:
  Inotify(Loop& loop, LogSink& log)
      : loop_(loop), log_(log, ""), inotify_(::inotify_init1(IN_NONBLOCK | IN_CLOEXEC)) {
    if (!inotify_) log_.error("files are not watched: {}", std::strerror(errno));
  }

  void end() {
    {
      const MutexLock lock(mutex_);
      if (!isWatched_) return;
    }
    loop_.sync([this] {
      loop_.assertCurrent();
      watch_.reset();
    });
  }

  int add(const std::string& path, std::function<void()> handler) {
    const MutexLock lock(mutex_);
    const int id = nextId_++;
    auto& entry = entries_[id];
    entry.path = path;
    entry.handler = std::make_shared<const std::function<void()>>(std::move(handler));
    _place(id, entry);
    if (inotify_ && !std::exchange(isWatched_, true)) {
      loop_.post([self = shared_from_this()] { self->_begin(); }, LoopInbox::Runner::OwnThread);
    }
    return id;
  }

  void remove(int id) {
    _forget(id);
    // Whoever cancels may go now: a handler that was already taken has ended.
    if (loop_.isCurrent()) return;
    const MutexLock turn(handling_);
  }

 private:
  void _begin() {
    loop_.assertCurrent();
    watch_ = loop_.watch(inotify_.get(), EPOLLIN, [this](std::uint32_t) { _tellChanged(); });
  }

  void _forget(int id) {
    const MutexLock lock(mutex_);
    entries_.erase(id);
    for (auto place = places_.begin(); place != places_.end();) {
      place->second.forget(id);
      if (!place->second.names.empty()) {
        ++place;
        continue;
      }
      ::inotify_rm_watch(inotify_.get(), place->first);
      place = places_.erase(place);
    }
  }

  using Handler = std::shared_ptr<const std::function<void()>>;
  struct Entry {
    std::string path;
    Handler handler;
  };
  // Who is interested in a watch, and in which name there; "" is every name.
  struct Place {
    std::set<std::pair<int, std::string>> names;
    void forget(int id) {
      std::erase_if(names, [id](const auto& name) { return name.first == id; });
    }
  };

  // Until the plan holds with its watches in place: what came between the look and the watches
  // has no event.
  void _place(int id, const Entry& entry) ZK_REQUIRES(mutex_) {
    std::vector<WatchSpot> placed;
    for (auto plan = watchPlan(entry.path); plan != placed; plan = watchPlan(entry.path)) {
      for (const auto& spot : plan) _place(id, spot);
      placed = std::move(plan);
    }
  }

  void _place(int id, const WatchSpot& spot) ZK_REQUIRES(mutex_) {
    const int watch = ::inotify_add_watch(inotify_.get(), spot.path.c_str(), kWatchedEvents);
    if (watch >= 0) places_[watch].names.emplace(id, spot.name);
  }

  void _tellChanged() {
    const MutexLock turn(handling_);
    for (const auto& handler : _takeChanged()) (*handler)();
  }

  std::vector<Handler> _takeChanged() {
    alignas(inotify_event) char buffer[16 * 1024];
    std::vector<Handler> handlers;
    const MutexLock lock(mutex_);
    std::set<int> changed;
    for (ssize_t size; (size = ::read(inotify_.get(), buffer, sizeof buffer)) > 0;) {
      for (const char* at = buffer; at < buffer + size;) {
        inotify_event event;
        std::memcpy(&event, at, sizeof event);
        _note(event, event.len > 0 ? at + sizeof event : "", changed);
        at += sizeof event + event.len;
      }
    }
    for (const int id : changed) {
      _place(id, entries_.at(id));
      handlers.push_back(entries_.at(id).handler);
    }
    return handlers;
  }

  void _note(const inotify_event& event, std::string_view name, std::set<int>& changed)
      ZK_REQUIRES(mutex_) {
    if (event.mask & IN_Q_OVERFLOW) {
      for (const auto& entry : entries_) changed.insert(entry.first);
    }
    const auto place = places_.find(event.wd);
    if (place == places_.end()) return;
    for (const auto& [id, wanted] : place->second.names) {
      if (wanted.empty() || name.empty() || wanted == name) changed.insert(id);
    }
    if (event.mask & IN_IGNORED)
      places_.erase(place);  // the kernel dropped it; its number is not used again
  }

  // Fixed after construction.
  Loop& loop_;
  const Logger log_;
  const Descriptor inotify_;

  // The loop's.
  Subscription watch_ ZK_ON(loop_);

  Mutex handling_;  // held while handlers run; before mutex_
  Mutex mutex_;
  bool isWatched_ ZK_GUARDED_BY(mutex_) = false;
  int nextId_ ZK_GUARDED_BY(mutex_) = 1;
  std::map<int, Entry> entries_ ZK_GUARDED_BY(mutex_);
  std::map<int, Place> places_ ZK_GUARDED_BY(mutex_);  // by inotify watch
};

PathWatcher::PathWatcher(Loop& loop, LogSink& log)
    : inotify_(std::make_shared<Inotify>(loop, log)) {}

PathWatcher::~PathWatcher() { inotify_->end(); }

Subscription PathWatcher::watch(const std::string& path, std::function<void()> handler) {
  const int id = inotify_->add(path, std::move(handler));
  return Subscription([weak = std::weak_ptr(inotify_), id] {
    if (const auto inotify = weak.lock()) inotify->remove(id);
  });
}

}  // namespace zelkord
