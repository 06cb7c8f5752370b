#include "zelkord/query/BagGatedFlow.h"

#include "halvane/DaemonFeedback.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/feedback/UserGUIDSource.h"
#include "zelkord/query/ErrorCodes.h"

namespace zelkord {

bool BagGatedFlow::_passesGates() {
  _logStart();
  if (!state_->_ensureBag()) {
    _logNoBag();
    _skip(SkipReason::NoBag, zelkorError(kBagFault, "timeout"));
    return false;
  }
  if (!state_->currentBag()->isEnabled()) {
    assembly_.log(kind_.disabledCategory.value_or(kind_.category))
        .debug("no {}, bag disabled", kind_.logName);
    _skip(SkipReason::BagDisabled);
    return false;
  }
  return true;
}

void BagGatedFlow::_logStart() const {
  _log().notice("session {} performing {} query, reply {}", state_->identifier(), kind_.logName,
                kCallbackText);
}

void BagGatedFlow::_logNoBag() const {
  _log().error("Bag fetch failed, can't complete non-cached {} query.", kind_.logName);
}

void BagGatedFlow::_logDispatch() const {
  _log().debug("Dispatching network request for {} query", kind_.logName);
}

void BagGatedFlow::_logAnswer() const {
  _log().notice("Got network response for {} query", kind_.logName);
}

std::optional<QueryFlow::Refusal> BagGatedFlow::_refusalOfAnswer(const URLResult& result) const {
  if (result.error) {
    _log().error("error with request {}", result.error->description());
    return Refusal{result.error};
  }
  if (!result.response || !result.response->status) {
    _log().error("not http response? {}", _responseForLog(result));
    return Refusal{zelkorError(kConnectionFault, "invalid response class")};
  }
  return std::nullopt;
}

void BagGatedFlow::_skip(SkipReason reason, std::optional<Error> error) {
  state_->record(
      std::make_shared<ZLKSkipSearchFeedback>(static_cast<std::int32_t>(reason), _input()),
      *request_, state_->guidController().currentUserGUID());
  _reply(std::nullopt, std::move(error));
}

}  // namespace zelkord
