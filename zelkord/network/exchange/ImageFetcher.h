#pragma once

#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "base/Data.h"
#include "corezelkor/ZLKFuture.h"
#include "corezelkor/ZLKPromise.h"
#include "halvane/Feedback.h"
#include "platform/api/Budget.h"
#include "platform/api/URLSession.h"
#include "platform/api/WorkQueues.h"
#include "zelkord/network/exchange/DownloadLine.h"

namespace zelkord {

class Assembly;

// Downloads images, each once: what was fetched is kept in the URL cache of the assembly's
// `urlSession`, and requests for a URL that is on its way share one download. Downloads begin in
// the order of a DownloadLine, so that no number of images takes all connections, or delays a
// query.
//
// A download waits in the line, is under way, or has ended. Who wanted it and does so no more says
// so (`release`). What nobody wants gives way to all others while it waits, and once under way has
// the request's time-out to end, from when that was first so; a host that fails it gets no more of
// them.
//
// Threading: any thread; a fetch may block for the URL cache's files, never for the network.
// Ownership: owned by the assembly. A download holds it weakly.
// Errors: an image that cannot be had is none; logged, transport and file errors are also recorded
// as feedback. One for which there is no place in the line, for its host or for who asks, is none
// at once; the budgets tell.
class ImageFetcher final : public std::enable_shared_from_this<ImageFetcher> {
 public:
  // The bytes, mapped; none when the fetch failed.
  using Image = std::optional<Data>;
  using RedirectRule = std::function<bool(const std::string& url)>;
  using Reaction = std::function<void(const Image&)>;
  using DownloadId = DownloadLine::Id;
  using WaiterId = std::uint64_t;
  // One who wants a download.
  struct Waiter {
    DownloadId download = 0;  // 0: there is nothing to wait for, nor to release
    WaiterId id = 0;
  };
  struct Ticket {
    ZLKFuture<Image> image;
    Waiter waiter;
  };

  static constexpr std::uint64_t kMostWaiting = 10'000;

  explicit ImageFetcher(Assembly& assembly);

  // None at once for a URL whose scheme does not begin with "http". The future is always fulfilled;
  // the time-out is that of a URLRequest, from the download's beginning. `acceptsRedirect` is asked
  // as there; of those who share a download the first one's counts. `holder` has the place in the
  // line.
  Ticket fetchImageData(const std::string& url, Duration timeoutInterval,
                        RedirectRule acceptsRedirect = {}, const std::string& holder = {});
  // Calls back once on a global queue, now or when the download has ended; not, and `reaction` is
  // let go of, when the waiter is released before. Once a ticket.
  void await(const Ticket& ticket, Reaction reaction);
  // None of these waits any more.
  void release(std::vector<Waiter> waiters);

 private:
  struct Fetch;
  // Of a download that has not ended.
  struct Pending {
    std::shared_ptr<Fetch> fetch;
    std::map<WaiterId, Reaction> waiters;
    // Of one that is under way and that nobody wants, and when that is; it stays the same for those
    // who want it once more and again do not.
    Subscription end;
    std::optional<SteadyTime> endsAt;
  };
  using Begun = std::vector<std::shared_ptr<Fetch>>;

  bool _isRouted() const;
  URLRequest _requestFor(const std::string& url, Duration timeout, RedirectRule accepts) const;
  Image _cachedImage(const URLRequest& request);
  // The download that is on its way, if there is one, is wanted once more.
  std::optional<Ticket> _join(const std::string& url);
  Ticket _admit(DownloadId download);
  Ticket _enqueue(const std::shared_ptr<Fetch>& fetch, const std::string& holder);
  Begun _takeDue();
  void _begin(const std::shared_ptr<Fetch>& fetch);
  void _finish(Fetch& fetch, const URLTask& task, const URLResult& result);
  void _leave(DownloadId download, DownloadLine::Connections connections, bool hasFailed);
  void _release(const Waiter& waiter);
  // Of one that is under way and that nobody wants.
  void _limit(Pending& pending);
  // Of the same. Who asks for its URL from here on begins a new download.
  void _cancel(DownloadId download);
  void _unlist(DownloadId download);
  void _react(std::vector<Reaction> reactions, const ZLKFuture<Image>& image);
  void _drop(DownloadId download);
  void _forget(DownloadId download);
  Image _imageOf(const Fetch& fetch, const URLResult& result);
  Image _mappedImage(const Fetch& fetch, const URLResult& result);
  void _keep(const Fetch& fetch, const URLResult& result, const Data& bytes);
  void _record(std::shared_ptr<const HVFeedback> feedback) const;
  std::string _shown(const std::string& url) const;

  // Fixed after construction.
  Assembly& assembly_;
  const std::unique_ptr<SerialQueue> queue_;

  // Own synchronisation. Places in the line, by who asks and by the images' host.
  Budget places_;
  Budget hostPlaces_;

  // Queue state.
  std::map<DownloadId, Pending> pendingRequests_ ZK_ON(queue_);
  std::map<std::string, DownloadId> byURL_ ZK_ON(queue_);  // without what is cancelled
  DownloadId lastDownload_ ZK_ON(queue_) = 0;
  WaiterId lastWaiter_ ZK_ON(queue_) = 0;
  DownloadLine line_ ZK_ON(queue_);
};

}  // namespace zelkord
