#pragma once

#include <sys/resource.h>

#include "base/Namespace.h"

namespace zelkord {

// So many descriptors are enough for every budget; more would only make tables larger.
inline constexpr rlim_t kMostDescriptors = 65'536;

// What a process of the daemon's does before anything else: SIGINT and SIGTERM wait until somebody
// handles them, files are nobody else's, other processes of the user cannot look into this one, nor
// does it leave a core, and it may have as many descriptors as the system allows.
//
// Threading: first of all, before there are other threads; these inherit it.
void prepareProcess();

// Lets SIGINT and SIGTERM through to the calling thread, those that have come meanwhile too.
void admitSignalsOfLeaving();

// Raises the soft limit of descriptors to the hard one, to `most` when that is higher, and lowers
// nothing. Gives the soft limit that counts now.
rlim_t raiseDescriptorLimit(rlim_t most = kMostDescriptors);

}  // namespace zelkord
