#pragma once

#include <atomic>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "base/Error.h"
#include "base/Guarded.h"
#include "base/Json.h"
#include "platform/api/URLSession.h"
#include "zelkord/assembly/InstalledBag.h"
#include "zelkord/network/bag/BagCacheURL.h"
#include "zelkord/network/bag/BagDiskCache.h"
#include "zelkord/network/bag/BagFetchStatus.h"

namespace zelkord {

class Assembly;
class BagFetchFeedback;
class BagRequests;

// Fetches the bag, keeps it on disk, and has it fetched anew when it nears its end, when
// its URL changes, when the device's context does, or when the service reports a newer version.
//
// No bag, a bag, or a bag that is due (the next read begins a fetch). At most one fetch is under
// way; further ones asked for meanwhile are dropped. The installed bag serves until another
// replaces it: a failed fetch changes nothing, and nothing but the next read repeats it. A fetch
// that ends when the bag's URL is no longer the one that it began with is followed by another one:
// whoever asked for it meanwhile was dropped, and its bag may be that of another country.
//
// What it installs and what fails is told by the assembly's InstalledBag. A bag from the network
// that changes whether news is available posts that system-wide.
//
// Threading: every operation on any thread but the request factory's queue; none by observers of
// the bag.
// Ownership: the assembly and the request factory outlive it. A fetch holds it weakly.
// Errors: logged; a fetch's also counted, posted and recorded as feedback.
class ZelkorBagController final : public std::enable_shared_from_this<ZelkorBagController> {
 public:
  ZelkorBagController(Assembly& assembly, BagRequests& requests);
  ~ZelkorBagController();

  // Loads the bag on disk and listens to the request factory; once, right after construction.
  void start();

  // `bagFetchURL` by the settings; a malformed one is logged.
  std::string bagFetchURLWithCountry(std::string_view country) const;

  // Null while there is none; a fetch is then under way.
  BagPointer currentBag();
  // The same without beginning the first fetch.
  BagPointer cachedBagState();
  // The same without looking whether it is due.
  BagPointer inMemoryBag() const;
  std::optional<std::string> warmURL();

  // Where bags come from, what went wrong last, when the next one is fetched.
  BagFetchStatus fetchStatus();

  // What the service says it serves: {"bag": version}. Fetches when that is newer.
  void forceFetchBag(const json::object& response);

  // Null is ignored. A bag from disk never replaces one that is installed.
  void cacheBagState(BagPointer bag, BagOrigin origin);
  // Adds the daemon's keys, writes the file, returns what it wrote. What was fetched under another
  // URL than the present one (`fetchedUnder`; null: the present one) is not written: the next start
  // would take it for this one's.
  std::shared_ptr<const json::object> cacheBagDictionary(json::object dictionary,
                                                         const std::string* fetchedUnder = nullptr);
  // The file's content, null when there is none; begins a fetch when it is due.
  std::shared_ptr<const json::object> diskCachedBagDictionary();

 private:
  using FetchCallback = std::function<void(const BagPointer&, const std::optional<Error>&)>;
  struct Fetch;

  bool _isRefreshRequiredForCachedBag(const json::object* dictionary);
  std::optional<WallTime> _nextAttempt();
  json::object _dictionaryToCacheBag(json::object dictionary, const std::string& url);
  void _handleRefreshNotification();
  void _fetchBagStateWithVersion(const std::optional<std::string>& version);
  void _fetchBagStateWithVersion(const std::optional<std::string>& version, FetchCallback callback);
  std::shared_ptr<URLTask> _taskOf(URLRequest request, std::shared_ptr<Fetch> fetch);
  void _finishFetch(Fetch& fetch, const URLTask& task, const URLResult& result);
  void _failFetch(Fetch& fetch, const Error& error);
  void _endFetch(const Fetch& fetch, bool succeeded);
  void _tellNewsAvailability(const BagPointer& before, const BagPointer& bag) const;
  void _logRequest(const URLRequest& request) const;
  void _logResponse(const URLResult& result) const;

  // Fixed after construction.
  Assembly& assembly_;
  BagRequests& requests_;
  const BagDiskCache disk_;
  const std::optional<std::string> userAgent_;
  Subscription refreshRequired_;  // set by `start`

  // Own synchronisation.
  std::atomic<bool> fetchInProgress_ = false;
  // The last fetch ended with another URL than it began with, and none has succeeded since.
  std::atomic<bool> urlChangedMeanwhile_ = false;
  BagCacheURL cacheURL_;
  Guarded<std::optional<BagFetchStatus::Failure>> lastFailure_;
};

}  // namespace zelkord
