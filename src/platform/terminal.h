// Whether a standard stream is a terminal, for hosts that draw progress.
#pragma once

#include <cstdio>

namespace qm::platform {

bool IsTerminal(std::FILE* stream);

}  // namespace qm::platform
