#include "zelkord/encoding/ErrorEncoding.h"

namespace zelkord {

HVError errorRecordOf(const Error& error) { return {error.code, error.domain, error.reason()}; }

}  // namespace zelkord
