#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "base/Json.h"
#include "halvane/Feedback.h"
#include "zelkord/ZelkorLogging/ZelkorLogging.h"
#include "zelkord/encoding/IdentifierProcessor.h"

namespace zelkord {

// What every kind of feedback answers. Both families of a kind share all of it.
//
// Threading: any thread. Requires records whose enumerations are in their tables, as the readers of
// messages see to.

// The feedback type: the row of the record in the table of event types.
std::uint32_t typeOf(const HVFeedback& feedback);

// Whether what is sent carries the query identifiers.
bool requiresQueryId(const HVFeedback& feedback);

// Appends the members of what is sent, `"key":value` joined by commas, without braces. False, with
// `text` as it was, when JSON cannot express them: a number that is not finite, or custom feedback
// that is not a JSON object. A kind without an encoder has no members and logs an error.
bool appendMembers(const HVFeedback& feedback, const Logger& errors, std::string& text);

// What is sent as a value; empty when JSON cannot express it.
json::object dictionaryOf(const HVFeedback& feedback, const Logger& errors);

// The record with its identifiers prepared for sending: each result's and suggestion's replaced,
// references and descriptions reported. The same record when it has none.
std::shared_ptr<const HVFeedback> processed(std::shared_ptr<const HVFeedback> feedback,
                                            IdentifierProcessor& processor);

}  // namespace zelkord
