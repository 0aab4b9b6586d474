#include "build/order_files.h"

#include "locks/lock_manager.h"
#include "platform/text_encoding.h"
#include "shared/bfile.h"
#include "shared/global_defs.h"

namespace qm {

namespace {

// Order files are block files of 64 units (4,096 bytes).
constexpr int32_t kOrderBlockUnits = 64;

}  // namespace

std::string OrderFilePath(const CGlobalDefs& defs, std::string_view name,
                          std::string_view extension) {
  return defs.GetFullDataPath(FolderKind::Orders) + ToUpper(name) + std::string(extension);
}

COrderInfo ReadOrderInfoShared(const CGlobalDefs& defs, std::string_view name) {
  CLockManager lock(defs.GetGroup(), name, kLockOrder);
  lock.LockReader();
  BFile file;
  file.OpenFile(OrderFilePath(defs, name, ".sri"), BFile::kReadOnly, kOrderBlockUnits);
  COrderInfo info;
  info.ReadInfo(file);
  file.Close();
  return info;
}

}  // namespace qm
