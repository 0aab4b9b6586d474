#include "platform/module_path.h"

#include <dlfcn.h>

#include "platform/file_io.h"

namespace qm::platform {

std::string ModulePathOf(const void* address) {
  Dl_info info{};
  if (dladdr(address, &info) == 0 || info.dli_fname == nullptr) return {};
  return CanonicalPath(info.dli_fname);
}

}  // namespace qm::platform
