#pragma once

#include "base/Namespace.h"

namespace zelkord {

// Has the heap give large blocks back as soon as they are free, whatever was freed before. By
// itself it would keep ever larger ones, and with them the size of the largest response. The
// threads share few arenas: what one leaves free serves the others.
//
// Threading: before there are others.
void keepHeapSmall();

// Gives back what the start alone needed: free memory of the heap, and the pages of program and
// libraries that loading and initialising them has touched. What is needed again comes back, from
// the page cache, at its next use.
//
// Threading: any thread, while others work.
void releaseStartMemory();

}  // namespace zelkord
