#include "zelkord/network/ImageFetcher.h"

#include <strings.h>

#include "platform/api/RandomUUID.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/UserAgent.h"
#include "zelkord/feedback/SessionManager.h"
#include "zelkord/network/ErrorFeedback.h"
#include "zelkord/network/NetworkSearchRecords.h"
#include "zelkord/network/URLHost.h"
#include "zelkord/storage/mmapFileHandle.h"

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
  Fetch(URLRequest imageRequest, ZLKPromise<Image> imagePromise, Transaction imageTransaction,
        std::string identifier)
      : request(std::move(imageRequest)),
        promise(std::move(imagePromise)),
        transaction(std::move(imageTransaction)),
        uuid(std::move(identifier)) {}
  ~Fetch() { promise.fulfill(std::nullopt); }
  Fetch(const Fetch&) = delete;
  Fetch& operator=(const Fetch&) = delete;

  const URLRequest request;
  const ZLKPromise<Image> promise;
  const Transaction transaction;
  const std::string uuid;  // of its records
};

ImageFetcher::ImageFetcher(Assembly& assembly)
    : assembly_(assembly), queue_(assembly.platform().queues.makeSerialQueue("ImageFetcher")) {}

ZLKFuture<ImageFetcher::Image> ImageFetcher::fetchImageData(const std::string& url,
                                                            Duration timeoutInterval,
                                                            RedirectRule acceptsRedirect) {
  if (!schemeBeginsWithHTTP(url)) return ZLKFuture<Image>(std::nullopt);
  auto transaction = assembly_.platform().transactions.open("imageFetch");
  auto request = _requestFor(url, timeoutInterval, std::move(acceptsRedirect));
  if (auto cached = _cachedImage(request)) return ZLKFuture<Image>(std::move(cached));
  const ZLKPromise<Image> promise;
  if (const auto pending = _join(url, promise)) {
    assembly_.log(Category::Images).debug("pending {}", _shown(url));
    return pending->future();
  }
  _enqueue(std::make_shared<Fetch>(std::move(request), promise, std::move(transaction),
                                   randomUUID(assembly_.platform().random).string()));
  return promise.future();
}

bool ImageFetcher::_isRouted() const {
  return assembly_.useMorvane() && assembly_.platform().networkProxy.isEnabled();
}

URLRequest ImageFetcher::_requestFor(const std::string& url, Duration timeout,
                                     RedirectRule accepts) const {
  URLRequest request{.url = url, .timeout = timeout, .acceptsRedirect = std::move(accepts)};
  const auto userAgent = zelkordUserAgent(assembly_.platform().device);
  if (userAgent) request.headers.emplace_back("User-Agent", *userAgent);
  return _isRouted() ? routedForm(std::move(request)) : request;
}

ImageFetcher::Image ImageFetcher::_cachedImage(const URLRequest& request) {
  auto* cache = assembly_.urlSession().cache();
  auto cached = cache ? cache->lookup(request) : std::nullopt;
  // Ordinary tasks keep other answers there too.
  if (!cached || cached->response.status != kOK) return std::nullopt;
  return std::move(cached->data);
}

std::optional<ZLKPromise<ImageFetcher::Image>> ImageFetcher::_join(
    const std::string& url, const ZLKPromise<Image>& promise) {
  std::optional<ZLKPromise<Image>> pending;
  queue_->sync([&] {
    queue_->assertCurrent();
    const auto [place, isNew] = pendingRequests_.try_emplace(url, promise);
    if (!isNew) pending = place->second;
  });
  return pending;
}

void ImageFetcher::_enqueue(const std::shared_ptr<Fetch>& fetch) {
  const auto& url = fetch->request.url;
  bool isTaken = false;
  std::vector<DownloadLine::Begin> due;
  queue_->sync([&] {
    queue_->assertCurrent();
    isTaken = line_.add(hostOf(url), [this, fetch] { _begin(fetch); });
    if (!isTaken) pendingRequests_.erase(url);
    due = line_.takeDue();
  });
  if (!isTaken) {
    assembly_.log(Category::Images).error("too many images wait: {}", _shown(url));
  }
  for (const auto& begin : due) begin();
}

void ImageFetcher::_begin(std::shared_ptr<Fetch> fetch) {
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
  task->resume();
}

void ImageFetcher::_finish(Fetch& fetch, const URLTask& task, const URLResult& result) {
  auto image = _imageOf(fetch, result);
  _record(endNetworkSearch(fetch.uuid, result, task.timingData()));
  fetch.promise.fulfill(std::move(image));
  const auto connections = task.timingData().protocol == kSharedProtocol
                               ? DownloadLine::Connections::Shared
                               : DownloadLine::Connections::OneEach;
  queue_->async([weak = weak_from_this(), url = fetch.request.url, connections] {
    if (const auto self = weak.lock()) self->_leave(url, connections);
  });
}

void ImageFetcher::_leave(const std::string& url, DownloadLine::Connections connections) {
  queue_->assertCurrent();
  pendingRequests_.erase(url);
  line_.ended(hostOf(url), connections);
  for (const auto& begin : line_.takeDue()) begin();
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
