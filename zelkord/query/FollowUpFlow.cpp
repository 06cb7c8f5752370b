#include "zelkord/query/FollowUpFlow.h"

#include "base/Text.h"
#include "zelkord/query/ErrorCodes.h"

namespace zelkord {
namespace {

constexpr int kOK = 200;
constexpr Private kNoText = {"(null)", true};

}  // namespace

std::optional<QueryFlow::Refusal> FollowUpFlow::_refusalOfAnswer(const URLResult& result) const {
  if (result.status() == kOK && !result.error) return std::nullopt;
  _log().error("{} fetch failed with HTTP status code {} error {}", kind_.logName, result.status(),
               result.error ? result.error->description() : "(null)");
  return Refusal{result.error};
}

// The line names cards for both kinds: whoever searches logs knows it so.
std::optional<QueryFlow::Refusal> FollowUpFlow::_refusalOfBody(const Body& body) const {
  if (body.parsed && body.parsed->is_array()) return std::nullopt;
  const auto text = body.data.view();
  _log().error(
      "Failed to deserialize card details for into a dictionary. Error: {}. Response data: \"{}\"",
      body.parsed ? "(null)" : body.problem, isValidUtf8(text) ? priv(text) : kNoText);
  return Refusal{zelkorError(kConnectionFault, "invalid response")};
}

}  // namespace zelkord
