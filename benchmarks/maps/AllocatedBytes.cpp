#include "benchmarks/maps/AllocatedBytes.h"

#include <malloc.h>

#include <cstdlib>
#include <new>

namespace {

constexpr std::size_t kHeader = sizeof(std::size_t);

std::size_t taken = 0;  // the program has one thread

void* counted(void* block) {
  if (block) taken += malloc_usable_size(block) + kHeader;
  return block;
}

void release(void* block) {
  if (block) taken -= malloc_usable_size(block) + kHeader;
  std::free(block);
}

}  // namespace

void* operator new(std::size_t size) {
  void* block = counted(std::malloc(size));
  if (!block) std::abort();
  return block;
}
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
  return counted(std::malloc(size));
}
void operator delete(void* block) noexcept { release(block); }
void operator delete(void* block, std::size_t) noexcept { release(block); }
void operator delete(void* block, const std::nothrow_t&) noexcept { release(block); }

namespace zelkord::bench {

std::size_t allocatedBytes() { return taken; }

}  // namespace zelkord::bench
