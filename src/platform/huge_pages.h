// Large buffers that are read in no particular order (a sort's run buffer)
// spend much of their time in page-table walks on 4 KB pages. Asking the
// kernel for huge pages there is advice only: it may decline.
#pragma once

#include <cstddef>

namespace qm::platform {

// Asks for huge pages under the whole pages of [data, data + bytes).
void AdviseHugePages(void* data, std::size_t bytes);

}  // namespace qm::platform
