#pragma once

#include "sandbox/http/Message.h"
#include "sandbox/search/AnswerCache.h"
#include "sandbox/service/Bag.h"
#include "sandbox/service/EmbeddedImages.h"
#include "sandbox/service/Misbehaviour.h"
#include "sandbox/service/RequestLog.h"
#include "sandbox/service/UploadStore.h"

namespace sandbox {

// The requests under /control/, by which tests and people steer this service and see what it
// received.
//
// Threading: any thread. Ownership: borrows what it steers. Errors: a 400 with {"error"} says what
// was wrong.
class Control final {
 public:
  struct Steered {
    Bag& bag;
    Misbehaviours& misbehaviours;
    EmbeddedImages& embeddedImages;
    RequestLog& log;
    UploadStore& uploads;
  };
  explicit Control(const Steered& steered) : it_(steered) {}

  // `request.path` begins with "/control/".
  Reply answer(const Request& request);

 private:
  Reply _requests(const Request& request);
  Reply _uploads(const Request& request);
  Reply _misbehave(const Request& request);
  Reply _behave();
  Reply _patchBag(const Request& request);
  Reply _embedImages(const Request& request);
  Reply _reset();

  const Steered it_;
};

}  // namespace sandbox
