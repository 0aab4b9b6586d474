#include "index/findex_files.h"

#include "index/findex_file_set.h"
#include "index/findex_writer.h"
#include "locks/lock_manager.h"
#include "platform/file_io.h"
#include "config/global_defs.h"
#include "format/bfile.h"
#include "format/findex_tree.h"

namespace qm {

bool FindexFilesExist(const CGlobalDefs& defs, std::string_view name) {
  const findex::FilePaths paths = findex::PathsOf(defs, name);
  return platform::FileExists(paths.sdx) || platform::FileExists(paths.fst);
}

CIndexHeader ReadFindexHeader(CGlobalDefs& defs, std::string_view name) {
  CPiFIndex findex(defs);
  findex.Open(name, 3);
  CIndexHeader header = findex.Header();
  findex.Close();
  return header;
}

CIndexHeader ReadStoredDefinition(const CGlobalDefs& defs, std::string_view name) {
  findex::CheckFindexName(name, "Open");
  BFile sdx;
  sdx.OpenFile(findex::PathsOf(defs, name).sdx, BFile::kReadOnly, CFindexTreeWriter::kBlockUnits);
  CIndexHeader header;
  header.ReadInfo(sdx);
  return header;
}

CIndexHeader ReadFindexHeaderShared(CGlobalDefs& defs, std::string_view name) {
  CLockManager lock(defs.GetLockScope(), defs.GetGroup(), name, kLockFindex);
  lock.LockReader();
  return ReadFindexHeader(defs, name);
}

}  // namespace qm
