#include "base/shipped_data.h"

#include <dlfcn.h>

#include <filesystem>

namespace qm {

namespace {

// share/quillmere/ beside the folder of the library this code was loaded from.
std::string LibraryDataFolder() {
  Dl_info info{};
  if (dladdr(reinterpret_cast<void*>(&ShippedDataFolder), &info) == 0 || !info.dli_fname) {
    return {};
  }
  std::error_code ec;
  auto lib = std::filesystem::canonical(info.dli_fname, ec);
  if (ec) return {};
  return (lib.parent_path().parent_path() / "share" / "quillmere").string() + "/";
}

}  // namespace

std::string ShippedDataFolder(std::string_view probe) {
  std::error_code ec;
  for (const std::string& root : {LibraryDataFolder(), std::string(QM_SOURCE_DATA_DIR),
                                  std::string(QM_INSTALL_DATA_DIR)}) {
    if (root.empty()) continue;
    if (std::filesystem::exists(root + std::string(probe), ec)) return root;
  }
  return QM_SOURCE_DATA_DIR;
}

}  // namespace qm
