#pragma once

#include <functional>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "base/Mutex.h"
#include "base/Subscription.h"
#include "base/Time.h"
#include "corezelkor/ZLKBag.h"
#include "zelkord/network/exchange/ImageFetcher.h"
#include "zelkord/query/ArrivedImages.h"
#include "zelkord/query/ImageWalk.h"

namespace zelkord {

class Assembly;

// Bytes by URL or identifier, each once, in the order in which they were asked for.
using LoadedImages = std::vector<std::pair<std::string, Data>>;

// What a call for images asks for, and on whose behalf.
struct ImageOrder {
  std::vector<ImageDescriptor> descriptors;
  SteadyTime deadline;  // on the clock's real time
  std::string holder;   // of the places in the download line and of the bytes
};

// One call for images. It asks for them a few at a time, as often as `ask` is called, and completes
// once: when all have come or failed, at the latest at its deadline, with what is there then. What
// comes later is in the URL cache for the next time.
//
// An image is filed under its identifier when only the identifier's URL gave it.
//
// States: asking, waiting, over. Threading: `ask` on one thread at a time, it may block for the URL
// cache's files; the rest on any. The completion runs on a global queue, or within `ask`.
// Ownership: keeps itself until the deadline, unless it is over before. Errors: an image that
// cannot be had is left out.
class ImageCall final : public std::enable_shared_from_this<ImageCall> {
 public:
  using Completion = std::function<void(LoadedImages)>;

  static std::shared_ptr<ImageCall> make(Assembly& assembly, ImageOrder order,
                                         std::shared_ptr<const ZLKBag> bag, Budget& bytes,
                                         Completion completion);

  // The images to fetch, once, before the first `ask`.
  void setImages(std::vector<std::string> urls, ImageFetcher::RedirectRule acceptsRedirect);
  // Asks for the next ones; false when there are no more.
  bool ask();
  // Nobody wants the answer: there is none.
  void giveUp();

 private:
  enum class Answer { Given, None };

  ImageCall(Assembly& assembly, ImageOrder order, std::shared_ptr<const ZLKBag> bag, Budget& bytes,
            Completion completion);
  static ArrivedImages::Order _placesOf(const ImageOrder& order, const ZLKBag& bag);
  void _start();
  void _ask(std::size_t place);
  // Whether the call still counts on what it asks for.
  bool _expect(ImageFetcher::Waiter waiter);
  void _arrived();
  bool _isGivenUp();
  void _end(Answer answer);
  LoadedImages _loaded() const;
  std::string _shown(const std::string& url) const;

  // Fixed after construction.
  Assembly& assembly_;
  const ImageOrder order_;
  const std::shared_ptr<const ZLKBag> bag_;
  ArrivedImages arrived_;

  // Of who asks; the URLs are fixed before the first `ask`.
  std::vector<std::string> urls_;
  std::size_t next_ = 0;
  ImageFetcher::RedirectRule acceptsRedirect_;

  Mutex mutex_;
  std::size_t outstanding_ ZK_GUARDED_BY(mutex_) = 1;  // the asking itself counts as one
  bool over_ ZK_GUARDED_BY(mutex_) = false;
  bool givenUp_ ZK_GUARDED_BY(mutex_) = false;
  std::vector<ImageFetcher::Waiter> waiters_ ZK_GUARDED_BY(mutex_);
  Completion completion_ ZK_GUARDED_BY(mutex_);
  Subscription timer_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
