#include "base/shipped_data.h"

#include "platform/file_io.h"
#include "platform/module_path.h"

namespace qm {

namespace {

// share/quillmere/ beside the folder of the library (or program) this code
// was loaded from.
std::string LibraryDataFolder() {
  const std::string module =
      platform::ModulePathOf(reinterpret_cast<const void*>(&ShippedDataFolder));
  const std::size_t file = module.rfind('/');
  if (file == std::string::npos || file == 0) return {};
  const std::size_t folder = module.rfind('/', file - 1);
  if (folder == std::string::npos) return {};
  return module.substr(0, folder) + "/share/quillmere/";
}

}  // namespace

std::string ShippedDataFolder(std::string_view probe) {
  for (const std::string& root : {LibraryDataFolder(), std::string(QM_SOURCE_DATA_DIR),
                                  std::string(QM_INSTALL_DATA_DIR)}) {
    if (root.empty()) continue;
    if (platform::FileExists(root + std::string(probe))) return root;
  }
  return QM_SOURCE_DATA_DIR;
}

}  // namespace qm
