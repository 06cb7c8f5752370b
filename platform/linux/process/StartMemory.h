#pragma once

#include "base/Namespace.h"

namespace zelkord {

// Gives back what the start alone needed: free memory of the heap, and the pages of program and
// libraries that loading and initialising them has touched. What is needed again comes back, from
// the page cache, at its next use.
//
// Threading: any thread, while others work.
void releaseStartMemory();

}  // namespace zelkord
