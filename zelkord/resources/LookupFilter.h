#pragma once

#include "base/Json.h"
#include "corezelkor/Messages.h"

namespace zelkord {

// Takes the results of a lookup away that do not fit the text around what was looked up.
//
// Threading: any thread.
class LookupFilter {
 public:
  virtual ~LookupFilter() = default;
  // `response` is the service's answer as it was parsed, whatever it is. Whether anything of it was
  // dropped; otherwise it is as it was.
  virtual bool filterLookupResultsWithRequest(const ZLKLookupRequest& request,
                                              json::value& response) const = 0;
};

}  // namespace zelkord
