#include "corezelkor/Messages.h"

#include "base/Json.h"

namespace zelkor {

std::string ZLKSessionConfiguration::description() const {
  return json::serialize(json::object{{"identifier", identifier}, {"userAgent", userAgent}});
}

}  // namespace zelkor
