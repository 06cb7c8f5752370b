#include "zelkord/network/exchange/ImageFetcher.h"

#include <strings.h>

#include <algorithm>

#include "base/Guarded.h"
#include "platform/api/RandomUUID.h"
#include "platform/api/mmapFileHandle.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/UserAgent.h"
#include "zelkord/feedback/SessionManager.h"
#include "zelkord/network/exchange/ErrorFeedback.h"
#include "zelkord/network/exchange/NetworkSearchRecords.h"
#include "zelkord/network/exchange/URLHost.h"

namespace zelkord {
namespace {

constexpr std::int64_t kImageFault = 500;  // in kZLKErrorDomain
constexpr std::int32_t kImageTrigger = 15;
constexpr std::int32_t kImageEndpoint = 7;
constexpr int kOK = 200;
constexpr std::string_view kSharedProtocol = "h2";

bool schemeBeginsWithHTTP(const std::string& url) {
  return url.find(':') != std::string::npos && strncasecmp(url.c_str(), "http", 4) == 0;
}

// Whose turn in the line it is.
std::string hostOf(const std::string& url) {
  auto place = URLHost::parse(url);
  return place ? std::move(place->host) : std::string();
}

}  // namespace

// One download. Whatever becomes of it, its promise is fulfilled at its end.
struct ImageFetcher::Fetch {
  Fetch(URLRequest imageRequest, Transaction imageTransaction, std::string identifier)
      : request(std::move(imageRequest)),
        host(hostOf(request.url)),
        transaction(std::move(imageTransaction)),
        uuid(std::move(identifier)) {}
  ~Fetch() { promise.fulfill(std::nullopt); }
  Fetch(const Fetch&) = delete;
  Fetch& operator=(const Fetch&) = delete;

  const URLRequest request;
  const std::string host;
  const ZLKPromise<Image> promise;
  const Transaction transaction;
  const std::string uuid;  // of its records

  // On the fetcher's queue.
  DownloadId id = 0;
  Budget::Share place;  // while it waits
  Budget::Share hostPlace;

  Guarded<std::weak_ptr<URLTask>> task;
};

ImageFetcher::ImageFetcher(Assembly& assembly)
    : assembly_(assembly),
      queue_(assembly.platform().queues.makeSerialQueue("ImageFetcher")),
      places_("image_places", Budget::quartered(kMostWaiting), assembly.limits()),
      hostPlaces_("image_places_of_host", Budget::quartered(kMostWaiting), assembly.limits()) {}

ImageFetcher::Ticket ImageFetcher::fetchImageData(const std::string& url, Duration timeoutInterval,
                                                  RedirectRule acceptsRedirect,
                                                  const std::string& holder) {
  if (!schemeBeginsWithHTTP(url)) return {ZLKFuture<Image>(std::nullopt)};
  auto transaction = assembly_.platform().transactions.open("imageFetch");
  auto request = _requestFor(url, timeoutInterval, std::move(acceptsRedirect));
  if (auto cached = _cachedImage(request)) return {ZLKFuture<Image>(std::move(cached))};
  if (auto pending = _join(url)) return *std::move(pending);
  return _enqueue(std::make_shared<Fetch>(std::move(request), std::move(transaction),
                                          randomUUID(assembly_.platform().random).string()),
                  holder);
}

bool ImageFetcher::_isRouted() const {
  return assembly_.useMorvane() && assembly_.platform().networkProxy.isEnabled();
}

URLRequest ImageFetcher::_requestFor(const std::string& url, Duration timeout,
                                     RedirectRule accepts) const {
  URLRequest request{.url = url,
                     .timeout = timeout,
                     .priority = TransferPriority::Low,
                     .acceptsRedirect = std::move(accepts)};
  const auto userAgent = zelkordUserAgent(assembly_.platform().device);
  if (userAgent) request.headers.emplace_back("User-Agent", *userAgent);
  return _isRouted() ? routedForm(std::move(request)) : request;
}

ImageFetcher::Image ImageFetcher::_cachedImage(const URLRequest& request) {
  auto* cache = assembly_.urlSession().cache();
  auto cached = cache ? cache->lookup(request) : std::nullopt;
  // Only images are kept by hand, and only a whole answer is one.
  if (!cached || cached->response.status != kOK) return std::nullopt;
  return std::move(cached->data);
}

std::optional<ImageFetcher::Ticket> ImageFetcher::_join(const std::string& url) {
  std::optional<Ticket> ticket;
  queue_->sync([&] {
    queue_->assertCurrent();
    const auto found = byURL_.find(url);
    if (found == byURL_.end()) return;
    pendingRequests_.at(found->second).end.reset();
    line_.want(found->second);
    ticket = _admit(found->second);
  });
  if (ticket) assembly_.log(Category::Images).debug("pending {}", _shown(url));
  return ticket;
}

ImageFetcher::Ticket ImageFetcher::_admit(DownloadId download) {
  queue_->assertCurrent();
  auto& pending = pendingRequests_.at(download);
  pending.waiters.emplace(++lastWaiter_, nullptr);
  return {pending.fetch->promise.future(), {download, lastWaiter_}};
}

ImageFetcher::Ticket ImageFetcher::_enqueue(const std::shared_ptr<Fetch>& fetch,
                                            const std::string& holder) {
  auto place = places_.take(holder);
  auto hostPlace = place ? hostPlaces_.take(fetch->host) : std::nullopt;
  if (!hostPlace) return {ZLKFuture<Image>(std::nullopt)};
  Begun due;
  std::optional<Ticket> ticket;
  queue_->sync([&] {
    queue_->assertCurrent();
    const bool isNew = byURL_.try_emplace(fetch->request.url, lastDownload_ + 1).second;
    if (!isNew) return;  // another thread was faster
    fetch->id = ++lastDownload_;
    fetch->place = *std::move(place);
    fetch->hostPlace = *std::move(hostPlace);
    pendingRequests_[fetch->id].fetch = fetch;
    line_.add(fetch->host, fetch->id);
    ticket = _admit(fetch->id);
    due = _takeDue();
  });
  if (!ticket) {
    auto joined = _join(fetch->request.url);
    return joined ? *std::move(joined) : _enqueue(fetch, holder);
  }
  for (const auto& begun : due) _begin(begun);
  return *std::move(ticket);
}

ImageFetcher::Begun ImageFetcher::_takeDue() {
  queue_->assertCurrent();
  Begun due;
  for (const auto id : line_.takeDue()) {
    auto& pending = pendingRequests_.at(id);
    const auto& fetch = due.emplace_back(pending.fetch);
    fetch->place.reset();
    fetch->hostPlace.reset();
    if (pending.waiters.empty()) _limit(pending);
  }
  return due;
}

void ImageFetcher::_begin(const std::shared_ptr<Fetch>& fetch) {
  _record(startNetworkSearch(
      fetch->request,
      {.triggerEvent = kImageTrigger, .endpointType = kImageEndpoint, .uuid = fetch->uuid}));
  const auto task = assembly_.urlSession().downloadTask(
      fetch->request,
      [weak = weak_from_this(), fetch](const auto& finished, const URLResult& result) {
        if (const auto self = weak.lock()) self->_finish(*fetch, *finished, result);
      });
  if (fetch->request.routed && !task->enableProxy(nullptr)) {
    assembly_.log(Category::Images).error("Enabling Morvane for #image request failed.");
  }
  fetch->task.set(task);
  task->resume();
}

void ImageFetcher::_finish(Fetch& fetch, const URLTask& task, const URLResult& result) {
  auto image = _imageOf(fetch, result);
  _record(endNetworkSearch(fetch.uuid, result, task.timingData()));
  fetch.promise.fulfill(std::move(image));
  const auto connections = task.timingData().protocol == kSharedProtocol
                               ? DownloadLine::Connections::Shared
                               : DownloadLine::Connections::OneEach;
  const bool hasFailed = result.error.has_value();
  queue_->async([weak = weak_from_this(), download = fetch.id, connections, hasFailed] {
    if (const auto self = weak.lock()) self->_leave(download, connections, hasFailed);
  });
}

void ImageFetcher::_leave(DownloadId download, DownloadLine::Connections connections,
                          bool hasFailed) {
  queue_->assertCurrent();
  auto& pending = pendingRequests_.at(download);
  const auto host = pending.fetch->host;
  std::vector<Reaction> reactions;
  for (auto& [id, reaction] : pending.waiters) {
    if (reaction) reactions.push_back(std::move(reaction));
  }
  _react(std::move(reactions), pending.fetch->promise.future());
  line_.ended(host, connections);
  _forget(download);
  if (hasFailed) {
    for (const auto dropped : line_.dropAbandoned(host)) _drop(dropped);
  }
  for (const auto& begun : _takeDue()) _begin(begun);
}

void ImageFetcher::await(const Ticket& ticket, Reaction reaction) {
  queue_->sync([&] {
    queue_->assertCurrent();
    const auto found = pendingRequests_.find(ticket.waiter.download);
    if (found == pendingRequests_.end()) return _react({std::move(reaction)}, ticket.image);
    const auto waiter = found->second.waiters.find(ticket.waiter.id);
    if (waiter != found->second.waiters.end()) waiter->second = std::move(reaction);
  });
}

// What was dropped meanwhile has no image yet, and nobody waits for it.
void ImageFetcher::_react(std::vector<Reaction> reactions, const ZLKFuture<Image>& image) {
  if (reactions.empty() || !image.isFulfilled()) return;
  assembly_.platform()
      .queues.global(QualityOfService::High)
      .async([reactions = std::move(reactions), image] {
        for (const auto& reaction : reactions) reaction(image.get());
      });
}

void ImageFetcher::release(std::vector<Waiter> waiters) {
  std::erase_if(waiters, [](const auto& waiter) { return waiter.download == 0; });
  if (waiters.empty()) return;
  queue_->async([weak = weak_from_this(), waiters = std::move(waiters)] {
    const auto self = weak.lock();
    if (!self) return;
    for (const auto& waiter : waiters) self->_release(waiter);
  });
}

void ImageFetcher::_release(const Waiter& waiter) {
  queue_->assertCurrent();
  const auto found = pendingRequests_.find(waiter.download);
  if (found == pendingRequests_.end()) return;
  auto& pending = found->second;
  if (pending.waiters.erase(waiter.id) == 0 || !pending.waiters.empty()) return;
  if (!line_.isWaiting(waiter.download)) return _limit(pending);
  for (const auto dropped : line_.abandon(waiter.download)) _drop(dropped);
}

void ImageFetcher::_limit(Pending& pending) {
  queue_->assertCurrent();
  const auto now = assembly_.platform().clock.realNow();
  if (!pending.endsAt) pending.endsAt = deadlineAfter(now, pending.fetch->request.timeout);
  pending.end = queue_->after(
      std::max<Duration>(*pending.endsAt - now, Duration::zero()),
      [weak = weak_from_this(), download = pending.fetch->id] {
        if (const auto self = weak.lock()) self->_cancel(download);
      },
      TimeBase::Real);
}

void ImageFetcher::_cancel(DownloadId download) {
  queue_->assertCurrent();
  const auto found = pendingRequests_.find(download);
  if (found == pendingRequests_.end() || !found->second.waiters.empty()) return;
  const auto task = found->second.fetch->task.get().lock();
  if (!task) return;
  _unlist(download);
  task->cancel();
}

// Who reacts to its end does so elsewhere, and may ask for the next image.
void ImageFetcher::_drop(DownloadId download) {
  queue_->assertCurrent();
  assembly_.platform()
      .queues.global(QualityOfService::Default)
      .async([dropped = pendingRequests_.at(download).fetch] {});
  _forget(download);
}

void ImageFetcher::_forget(DownloadId download) {
  queue_->assertCurrent();
  _unlist(download);
  pendingRequests_.erase(download);
}

void ImageFetcher::_unlist(DownloadId download) {
  queue_->assertCurrent();
  const auto listed = byURL_.find(pendingRequests_.at(download).fetch->request.url);
  if (listed != byURL_.end() && listed->second == download) byURL_.erase(listed);
}

ImageFetcher::Image ImageFetcher::_imageOf(const Fetch& fetch, const URLResult& result) {
  const auto& log = assembly_.log(Category::Images);
  const auto& url = fetch.request.url;
  if (result.error) {
    log.error("Error fetching image {}: {}", _shown(url), result.error->description());
    reportErrorAsZelkordFeedback(zelkorError(kImageFault, "image fetch error " + url), assembly_);
    return std::nullopt;
  }
  if (result.status() != kOK) {
    log.error("Bad status code {} for image {}", result.status(), _shown(url));
    return std::nullopt;
  }
  log.info("Fetched image {}", _shown(url));
  return _mappedImage(fetch, result);
}

ImageFetcher::Image ImageFetcher::_mappedImage(const Fetch& fetch, const URLResult& result) {
  const auto& log = assembly_.log(Category::Images);
  Error error;
  const auto path = result.file ? result.file->path : std::string();
  const auto handle = assembly_.fileManager().openForReading(path, &error);
  if (!handle) {
    log.error("opening file failed {}", error.description());
    reportErrorAsZelkordFeedback(zelkorError(kImageFault, "file open failed"), assembly_);
    return std::nullopt;
  }
  auto bytes = mmapFileHandle(*handle, &error);
  if (!bytes) {
    log.error("mmap failed {}", error.description());
    reportErrorAsZelkordFeedback(error, assembly_);
    return std::nullopt;
  }
  _keep(fetch, result, *bytes);
  return bytes;
}

void ImageFetcher::_keep(const Fetch& fetch, const URLResult& result, const Data& bytes) {
  auto* cache = assembly_.urlSession().cache();
  if (!cache) return;
  assembly_.log(Category::Images)
      .debug("caching {} bytes for {}", bytes.size(), _shown(fetch.request.url));
  cache->store(fetch.request, {*result.response, bytes});
}

void ImageFetcher::_record(std::shared_ptr<const HVFeedback> feedback) const {
  auto* manager = assembly_.clientSessionManager();
  if (!manager) return;
  manager->addZelkorFeedback(
      {std::move(feedback), 0, std::nullopt, zelkordUserAgent(assembly_.platform().device), 0});
}

std::string ImageFetcher::_shown(const std::string& url) const {
  return urlForLog(url, assembly_.platform().log.showsPrivateData());
}

}  // namespace zelkord
