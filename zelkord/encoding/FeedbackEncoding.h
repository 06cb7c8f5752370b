#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "base/Json.h"
#include "halvane/Feedback.h"
#include "zelkord/ZelkorLogging/ZelkorLogging.h"
#include "zelkord/encoding/IdentifierProcessor.h"
#include "zelkord/encoding/ObjectMembers.h"

namespace zelkord {

// How every kind of feedback is sent. Both families of a kind share all of it.
//
// Threading: any thread. Requires records whose enumerations are in their tables, as the readers of
// messages see to.

// Appends the members of what is sent, `"key":value` joined by commas, without braces, to a text
// in which the object's first member would stand at `begin`. False, with `text` as it was, when
// JSON cannot express them: a number that is not finite, a text that is not UTF-8, or custom
// feedback that is not a JSON object. A kind without an encoder has no members; a message of one
// logs an error.
//
// Custom feedback is the client's own object, its text as it came. A caller that sets members of
// its own leaves those names out of it.
bool appendMembers(const HVFeedback& feedback, const Logger& errors, std::size_t begin,
                   std::string& text, LeftOut leftOut = {});

// What is sent as a value; empty when JSON cannot express it.
json::object dictionaryOf(const HVFeedback& feedback, const Logger& errors);

// The value of a JSON text that was written here: nested as deep as what clients may send, and a
// little more. Null when it does not parse.
json::value valueOfOwnJson(std::string_view text);

// The record with its identifiers prepared for sending: each result's and suggestion's is replaced;
// those that the record describes are reported as expanded, those that it only names as
// referenced. The same record when it has none.
std::shared_ptr<const HVFeedback> processed(std::shared_ptr<const HVFeedback> feedback,
                                            IdentifierProcessor& processor);

}  // namespace zelkord
