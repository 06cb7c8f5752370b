#pragma once

#include <cstdint>

#include "zelkord/query/QueryFlow.h"

namespace zelkord {

// A query that needs an enabled bag, for which it waits a second at most, and whose answer goes to
// the client as it came whatever its status and whether or not it is JSON: search, lookup, and, as
// it is, zero keyword.
class BagGatedFlow : public QueryFlow {
 public:
  using QueryFlow::QueryFlow;

 protected:
  // Why a query is not sent; the numbers are recorded.
  enum class SkipReason : std::int32_t { TooShort = 1, BagDisabled = 2, NoBag = 3 };

  bool _passesGates() override;
  void _logDispatch() const override;
  void _logAnswer() const override;
  std::optional<Refusal> _refusalOfAnswer(const URLResult& result) const override;

  virtual void _logStart() const;
  virtual void _logNoBag() const;
  // Records why the query is not sent and replies.
  void _skip(SkipReason reason, std::optional<Error> error = std::nullopt);
};

}  // namespace zelkord
