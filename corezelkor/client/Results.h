#pragma once

#include <optional>
#include <string_view>

#include "base/Export.h"
#include "base/Json.h"
#include "corezelkor/client/ClientTypes.h"

namespace zelkor {

// The result sets of a search's answer that are for what is typed, in the service's order: what a
// search surface shows. Nothing without a reply, or when the reply is no list.
//
// An answer out of the daemon's query cache is the whole response to an earlier, shorter text, and
// holds sets for texts that have parted from this one since. Of it, those sets are given whose
// "query", the completed text that a set is for, equals the typed text or goes on from it; case
// does not matter. A response to this very text is given whole: it is one when the reply tells of
// it (ZLKReply::httpResponse), or when no set goes on from the text, as when the service corrected
// it.
//
// `typed` is the query string as it was sent. An empty one is gone on from by everything.
ZK_EXPORT std::optional<json::array> resultsFor(std::string_view typed, const ClientAnswer& answer);

}  // namespace zelkor
