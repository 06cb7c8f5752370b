#pragma once

#include "zelkord/query/BagGatedFlow.h"

namespace zelkord {

// What is typed into a search field. Besides the gates of its base a text must be long enough, and
// an earlier answer that covers it spares the request. Answers are cached.
class SearchFlow final : public BagGatedFlow {
 public:
  using BagGatedFlow::BagGatedFlow;

 private:
  bool _passesGates() override;
  void _logStart() const override;
  void _logNoBag() const override;
  void _logDispatch() const override;
  void _logAnswer() const override;
  std::string _input() const override { return request_->queryString; }
  void _didSend() override;
  void _didParse(const json::value& rawResponse, const Data& data) override;
  void _willReply(const URLResponse& response) override;

  bool _isLongEnough();
  bool _answersFromCache();
  void _cacheResponse(const json::value& rawResponse, const Data& data);
  void _forceFetchBag(const URLResponse& response);
};

}  // namespace zelkord
