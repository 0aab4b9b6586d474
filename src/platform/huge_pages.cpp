#include "platform/huge_pages.h"

#include <sys/mman.h>
#include <unistd.h>

#include <cstdint>

namespace qm::platform {

void AdviseHugePages(void* data, std::size_t bytes) {
  const auto page = static_cast<uintptr_t>(sysconf(_SC_PAGESIZE));
  const auto at = reinterpret_cast<uintptr_t>(data);
  const uintptr_t first = (at + page - 1) / page * page;
  const uintptr_t end = (at + bytes) / page * page;
  // Refused advice (no transparent huge pages here) changes nothing.
  if (end > first) madvise(reinterpret_cast<void*>(first), end - first, MADV_HUGEPAGE);
}

}  // namespace qm::platform
