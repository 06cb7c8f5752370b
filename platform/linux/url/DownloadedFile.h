#pragma once

#include "platform/api/URLRequest.h"
#include "platform/linux/system/Descriptor.h"

namespace zelkord {

// Turns the body of a result without an error into a file that exists as long as the descriptor,
// and that no crash leaves behind. On failure the result has an error and no body.
Descriptor moveBodyToFile(URLResult& result);

}  // namespace zelkord
