#include "zelkord/query/ImageCall.h"

#include <algorithm>
#include <unordered_set>

#include "zelkord/assembly/Assembly.h"
#include "zelkord/network/exchange/RequestLogText.h"

namespace zelkord {
namespace {

constexpr std::size_t kAskedAtOnce = 32;
constexpr Duration kLongestWait = 24h * 365;  // far from the clock's end

}  // namespace

std::shared_ptr<ImageCall> ImageCall::make(Assembly& assembly, ImageOrder order,
                                           std::shared_ptr<const ZLKBag> bag, Budget& bytes,
                                           Completion completion) {
  const std::shared_ptr<ImageCall> call(
      new ImageCall(assembly, std::move(order), std::move(bag), bytes, std::move(completion)));
  call->_start();
  return call;
}

ImageCall::ImageCall(Assembly& assembly, ImageOrder order, std::shared_ptr<const ZLKBag> bag,
                     Budget& bytes, Completion completion)
    : assembly_(assembly),
      order_(std::move(order)),
      bag_(std::move(bag)),
      arrived_(_placesOf(order_, *bag_), bytes, order_.holder),
      completion_(std::move(completion)) {}

ArrivedImages::Order ImageCall::_placesOf(const ImageOrder& order, const ZLKBag& bag) {
  ArrivedImages::Order places;
  for (std::size_t place = 0; place < order.descriptors.size(); ++place) {
    const auto& [url, id, data] = order.descriptors[place];
    if (url) places.try_emplace(*url, place);
    if (const auto named = id ? bag.urlForIdentifier(*id) : std::nullopt) {
      places.try_emplace(*named, place);
    }
  }
  return places;
}

// A deadline that has passed gives what is at hand when all has been asked for.
void ImageCall::_start() {
  const auto left = order_.deadline - assembly_.platform().clock.realNow();
  if (left <= Duration::zero()) return;
  const MutexLock lock(mutex_);
  timer_ = assembly_.platform()
               .queues.global(QualityOfService::High)
               .after(
                   std::min<Duration>(left, kLongestWait),
                   [self = shared_from_this()] { self->_end(Answer::Given); }, TimeBase::Real);
}

void ImageCall::setImages(std::vector<std::string> urls,
                          ImageFetcher::RedirectRule acceptsRedirect) {
  urls_ = std::move(urls);
  acceptsRedirect_ = std::move(acceptsRedirect);
}

bool ImageCall::ask() {
  const auto self = shared_from_this();  // the end may let go of it
  if (_isGivenUp()) return false;
  const auto end = std::min(urls_.size(), next_ + kAskedAtOnce);
  while (next_ < end) _ask(next_++);
  if (end < urls_.size()) return true;
  _arrived();
  if (order_.deadline <= assembly_.platform().clock.realNow()) _end(Answer::Given);
  return false;
}

void ImageCall::_ask(std::size_t place) {
  auto* fetcher = assembly_.imageFetcher();
  const auto ticket = fetcher->fetchImageData(urls_[place], bag_->timeoutIntervalForRequest(),
                                              acceptsRedirect_, order_.holder);
  if (const auto* image = ticket.image.find()) {
    if (*image) arrived_.add(urls_[place], **image);
    return;
  }
  if (!_expect(ticket.waiter)) return fetcher->release({ticket.waiter});
  fetcher->await(ticket, [weak = weak_from_this(), place](const ImageFetcher::Image& image) {
    const auto self = weak.lock();
    if (!self) return;
    if (image) self->arrived_.add(self->urls_[place], *image);
    self->_arrived();
  });
}

bool ImageCall::_expect(ImageFetcher::Waiter waiter) {
  const MutexLock lock(mutex_);
  if (over_) return false;
  ++outstanding_;
  waiters_.push_back(waiter);
  return true;
}

void ImageCall::_arrived() {
  {
    const MutexLock lock(mutex_);
    if (--outstanding_ > 0) return;
  }
  _end(Answer::Given);
}

bool ImageCall::_isGivenUp() {
  const MutexLock lock(mutex_);
  return givenUp_;
}

void ImageCall::giveUp() {
  {
    const MutexLock lock(mutex_);
    givenUp_ = true;
  }
  _end(Answer::None);
}

void ImageCall::_end(Answer answer) {
  std::vector<ImageFetcher::Waiter> waiters;
  Completion completion;
  Subscription timer;  // holds this object
  {
    const MutexLock lock(mutex_);
    if (over_) return;
    over_ = true;
    timer = std::move(timer_);
    waiters = std::move(waiters_);
    completion = std::move(completion_);
  }
  assembly_.imageFetcher()->release(std::move(waiters));
  if (answer == Answer::Given) completion(_loaded());
}

LoadedImages ImageCall::_loaded() const {
  const auto& log = assembly_.log(Category::Images);
  LoadedImages images;
  std::unordered_set<std::string_view> filed;
  const auto bytesAt = [this](const std::optional<std::string>& url) {
    return url ? arrived_.find(*url) : std::nullopt;
  };
  for (const auto& [url, id, data] : order_.descriptors) {
    if (const auto bytes = bytesAt(url)) {
      log.debug("mapping image url {} to {} bytes of data", _shown(*url), bytes->size());
      if (filed.insert(*url).second) images.emplace_back(*url, *bytes);
    } else if (const auto named = id ? bytesAt(bag_->urlForIdentifier(*id)) : std::nullopt) {
      log.debug("mapping image id {} to {} bytes of data", *id, named->size());
      if (filed.insert(*id).second) images.emplace_back(*id, *named);
    }
  }
  return images;
}

std::string ImageCall::_shown(const std::string& url) const {
  return urlForLog(url, assembly_.platform().log.showsPrivateData());
}

}  // namespace zelkord
