#pragma once

#include <memory>
#include <string>

#include "sandbox/data/DataSources.h"
#include "sandbox/http/Message.h"
#include "sandbox/search/SuggestionIndex.h"
#include "sandbox/service/Bag.h"
#include "sandbox/service/Control.h"
#include "sandbox/service/EmbeddedImages.h"
#include "sandbox/service/Images.h"
#include "sandbox/service/Misbehaviour.h"
#include "sandbox/service/Queries.h"
#include "sandbox/service/RequestLog.h"
#include "sandbox/service/Resources.h"
#include "sandbox/service/UploadStore.h"

namespace sandbox {

// The suggestion service itself: what to answer, whatever carries requests and answers.
//
// Each request is checked for its key, handled by the part that has its path, perhaps spoilt by a
// misbehaviour, packed if the client takes gzip, and logged. Control requests are none of these.
// Threading: any thread. Ownership: borrows the stores, which outlive it.
class Service final {
 public:
  struct Stores {
    SuggestionIndexPool& index;
    RequestLog& log;
    UploadStore& uploads;
  };

  // `baseUrl` is where clients reach this service, without a slash at the end.
  Service(const Stores& stores, const DataSources& sources, const std::string& baseUrl);

  Reply handle(Request request);

 private:
  Reply _respond(const Request& request);
  Reply _route(const Request& request);
  Reply _routeRead(const Request& request);
  Reply _results(const Request& request);
  Reply _search(const Request& request);
  void _log(Request request, const Reply& reply, double arrival, std::int64_t microseconds);

  RequestLog& log_;
  UploadStore& uploads_;
  Bag bag_;
  Misbehaviours misbehaviours_;
  EmbeddedImages embeddedImages_;
  Control control_;
  Queries queries_;
  const Images images_;
  const Resources resources_;
};

}  // namespace sandbox
