#pragma once

#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>

#include "base/Data.h"
#include "corezelkor/ZLKFuture.h"
#include "corezelkor/ZLKPromise.h"
#include "halvane/Feedback.h"
#include "platform/api/URLSession.h"
#include "platform/api/WorkQueues.h"
#include "zelkord/network/DownloadLine.h"

namespace zelkord {

class Assembly;

// Downloads images, each once: what was fetched is kept in the URL cache of the assembly's
// `urlSession`, and requests for a URL that is on its way share one download. Downloads begin in
// the order of a DownloadLine, so that no number of images takes all connections, or delays a
// query.
//
// Threading: any thread; a fetch may block for the URL cache's files, never for the network.
// Ownership: owned by the assembly. A download holds it weakly.
// Errors: an image that cannot be had is none; logged, transport and file errors are also recorded
// as feedback. One for which the line is too long is none at once.
class ImageFetcher final : public std::enable_shared_from_this<ImageFetcher> {
 public:
  // The bytes, mapped; none when the fetch failed.
  using Image = std::optional<Data>;
  using RedirectRule = std::function<bool(const std::string& url)>;

  explicit ImageFetcher(Assembly& assembly);

  // None at once for a URL whose scheme does not begin with "http". The future is always fulfilled;
  // the time-out is that of a URLRequest, from the download's beginning. `acceptsRedirect` is asked
  // as there; of those who share a download the first one's counts.
  ZLKFuture<Image> fetchImageData(const std::string& url, Duration timeoutInterval,
                                  RedirectRule acceptsRedirect = {});

 private:
  struct Fetch;

  bool _isRouted() const;
  URLRequest _requestFor(const std::string& url, Duration timeout, RedirectRule accepts) const;
  Image _cachedImage(const URLRequest& request);
  // The promise of the download that is on its way, else none, and `promise` is it from now on.
  std::optional<ZLKPromise<Image>> _join(const std::string& url, const ZLKPromise<Image>& promise);
  void _enqueue(const std::shared_ptr<Fetch>& fetch);
  void _begin(std::shared_ptr<Fetch> fetch);
  void _finish(Fetch& fetch, const URLTask& task, const URLResult& result);
  void _leave(const std::string& url, DownloadLine::Connections connections);
  Image _imageOf(const Fetch& fetch, const URLResult& result);
  Image _mappedImage(const Fetch& fetch, const URLResult& result);
  void _keep(const Fetch& fetch, const URLResult& result, const Data& bytes);
  void _record(std::shared_ptr<const HVFeedback> feedback) const;
  std::string _shown(const std::string& url) const;

  // Fixed after construction.
  Assembly& assembly_;
  const std::unique_ptr<SerialQueue> queue_;

  // Queue state.
  std::map<std::string, ZLKPromise<Image>> pendingRequests_ ZK_ON(queue_);
  DownloadLine line_ ZK_ON(queue_);
};

}  // namespace zelkord
