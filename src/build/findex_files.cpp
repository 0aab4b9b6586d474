#include "build/findex_files.h"

#include "build/findex_writer.h"
#include "locks/lock_manager.h"
#include "platform/file_io.h"
#include "platform/text_encoding.h"
#include "shared/global_defs.h"

namespace qm {

std::string AddOnName(std::string_view name, int32_t n) {
  return ToUpper(name) + std::string(kAddOnInfix) + std::to_string(n);
}

std::string FindexFilePath(const CGlobalDefs& defs, std::string_view name,
                           std::string_view extension) {
  return defs.GetFullDataPath(FolderKind::Indexes) + ToUpper(name) + std::string(extension);
}

bool FindexFilesExist(const CGlobalDefs& defs, std::string_view name) {
  return platform::FileExists(FindexFilePath(defs, name, ".sdx")) ||
         platform::FileExists(FindexFilePath(defs, name, ".fst"));
}

CIndexHeader ReadFindexHeader(CGlobalDefs& defs, std::string_view name) {
  CPiFIndex findex(defs);
  findex.Open(name, 3);
  CIndexHeader header = findex.Header();
  findex.Close();
  return header;
}

CIndexHeader ReadFindexHeaderShared(CGlobalDefs& defs, std::string_view name) {
  CLockManager lock(defs.GetGroup(), name, kLockFindex);
  lock.LockReader();
  return ReadFindexHeader(defs, name);
}

}  // namespace qm
