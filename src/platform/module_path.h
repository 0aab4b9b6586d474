// Where the code of this process comes from, for finding data shipped beside it.
#pragma once

#include <string>

namespace qm::platform {

// The canonical path of the shared library or program that holds address;
// empty when the loader cannot tell.
std::string ModulePathOf(const void* address);

}  // namespace qm::platform
