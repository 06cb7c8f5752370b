#include "platform/linux/process/StartMemory.h"

#include <link.h>
#include <malloc.h>
#include <sys/auxv.h>
#include <sys/mman.h>
#include <unistd.h>

#include <cstdint>

namespace zelkord {
namespace {

// Only what the file has all the same: pages that nobody may write to.
void releasePagesOf(const ElfW(Phdr) & segment, std::uintptr_t base) {
  if (segment.p_type != PT_LOAD || (segment.p_flags & PF_W) != 0) return;
  const auto page = static_cast<std::uintptr_t>(::sysconf(_SC_PAGESIZE));
  const std::uintptr_t begin = (base + segment.p_vaddr) / page * page;
  const std::uintptr_t end = (base + segment.p_vaddr + segment.p_memsz) / page * page;
  // The last page may have a neighbour.
  if (begin < end) ::madvise(reinterpret_cast<void*>(begin), end - begin, MADV_DONTNEED);
}

int releaseObject(dl_phdr_info* object, std::size_t, void*) {
  const auto* headers = object->dlpi_phdr;
  const auto kernelObject = ::getauxval(AT_SYSINFO_EHDR);  // no file behind it
  if (kernelObject != 0 && object->dlpi_addr == kernelObject) return 0;
  for (int i = 0; i < object->dlpi_phnum; ++i) releasePagesOf(headers[i], object->dlpi_addr);
  return 0;
}

}  // namespace

void keepHeapSmall() {
  constexpr int kLargeBlock = 1024 * 1024;
  constexpr int kKeptAtMost = 4 * 1024 * 1024;  // less costs system calls with every message
  constexpr int kArenas = 2;  // each keeps free memory of its own; by default 8 a processor
  ::mallopt(M_MMAP_THRESHOLD, kLargeBlock);
  ::mallopt(M_TRIM_THRESHOLD, kKeptAtMost);
  ::mallopt(M_ARENA_MAX, kArenas);
}

void releaseStartMemory() {
  ::malloc_trim(0);
  ::dl_iterate_phdr(&releaseObject, nullptr);
}

}  // namespace zelkord
