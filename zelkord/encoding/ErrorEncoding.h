#pragma once

#include "base/Error.h"
#include "halvane/Results.h"

namespace zelkord {

// The error as feedback carries it: its code, its domain, and its reason when it has one.
HVError errorRecordOf(const Error& error);

}  // namespace zelkord
