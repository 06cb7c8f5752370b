#pragma once

#include <memory>

#include "corezelkor/client/internal/ClientCore.h"

namespace zelkor {

// Request of either interface: the kind, the query, then what `encodeRest` appends.
ZLKFuture<ClientAnswer> callWithRequest(ClientCore& core, const ClientCore::Target& target,
                                        std::shared_ptr<const ZLKRequest> request,
                                        ClientCore::Encode encodeRest);

}  // namespace zelkor
