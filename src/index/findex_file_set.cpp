#include "index/findex_file_set.h"

#include <optional>

#include "index/deleted_keys.h"
#include "index/file_swap.h"
#include "locks/lock_manager.h"
#include "platform/file_io.h"
#include "platform/text_encoding.h"
#include "base/exception_family.h"
#include "config/file_operations.h"
#include "config/global_defs.h"
#include "config/temp_file_sweep.h"
#include "base/trace.h"
#include "base/plain_name.h"

namespace qm::findex {

namespace {

constexpr const char* kRenameMethod = "RenameIndex";
constexpr const char* kErrorTag = "PILIB_ERROR.PiFindex.RenameIndex";

// The add-on pairs of name, n = 1, 2, ... while one of the pair exists.
std::vector<std::string> AddOnFiles(const CGlobalDefs& defs, std::string_view name) {
  std::vector<std::string> files;
  for (int32_t n = 1;; ++n) {
    const FilePaths add_on = PathsOf(defs, AddOnName(name, n));
    const bool fst = platform::FileExists(add_on.fst);
    const bool sdx = platform::FileExists(add_on.sdx);
    if (!fst && !sdx) return files;
    if (fst) files.push_back(add_on.fst);
    if (sdx) files.push_back(add_on.sdx);
  }
}

void DropAddOns(const CGlobalDefs& defs, std::string_view name) {
  for (const std::string& path : AddOnFiles(defs, name)) DropFile(path);
}

}  // namespace

FilePaths PathsOf(const CGlobalDefs& defs, std::string_view name) {
  const std::string base = defs.GetFullDataPath(FolderKind::Indexes) + ToUpper(name);
  return FilePaths{base + ".sdx", base + ".fst", base + ".del"};
}

std::string AddOnName(std::string_view name, int32_t n) {
  return ToUpper(name) + std::string(kAddOnMark) + std::to_string(n);
}

bool IsAddOnName(std::string_view name) {
  return ToUpper(name).find(kAddOnMark) != std::string::npos;
}

std::string OwnerName(std::string_view name) {
  std::string upper = ToUpper(name);
  const auto mark = upper.find(kAddOnMark);
  if (mark != std::string::npos) upper.resize(mark);
  return upper;
}

void CheckFindexName(std::string_view name, const char* method) {
  RequirePlainName<CPiFIndexException>("findex", name, method);
}

void MoveIntoPlace(const CGlobalDefs& defs, std::string_view name, const std::string& temp_sdx,
                   const std::string& temp_fst, bool rebuild) {
  const FilePaths target = PathsOf(defs, name);
  const std::string group = defs.GetGroup();
  // Searches lock the findex they open, and read its add-ons under that lock.
  CLockManager owner_lock(defs.GetLockScope(), group, OwnerName(name), kLockFindex);
  file_swap::LockExclusively<CPiFIndexException>(owner_lock, "findex", OwnerName(name),
                                                 kRenameMethod, kErrorTag);
  std::optional<CLockManager> add_on_lock;
  if (IsAddOnName(name)) {
    add_on_lock.emplace(defs.GetLockScope(), group, ToUpper(name), kLockFindex);
    file_swap::LockExclusively<CPiFIndexException>(*add_on_lock, "findex", ToUpper(name),
                                                   kRenameMethod, kErrorTag);
  }

  // Both old files go aside before either new one comes in.
  file_swap::Renames renames(kErrorTag);
  std::string failing = target.sdx;
  try {
    renames.SetAside(target.sdx, temp_sdx + ".old");
    failing = target.fst;
    renames.SetAside(target.fst, temp_fst + ".old");
    failing = target.sdx;
    renames.Move(temp_sdx, target.sdx);
    failing = target.fst;
    renames.Move(temp_fst, target.fst);
  } catch (const CException& e) {
    renames.Undo();
    throw CPiFIndexException::Text("Error renaming index file %S", kRenameMethod, &e, failing);
  }
  renames.DropBackups();
  if (rebuild) {
    // The new findex holds every row: add-ons and deleted keys of the old
    // one no longer apply.
    Guard<CPiFIndexException>(kRenameMethod, [&] {
      DropAddOns(defs, name);
      DropDeletedKeys(defs, name);
    });
  }
}

std::vector<std::string> ExistingFiles(const CGlobalDefs& defs, std::string_view name) {
  const FilePaths paths = PathsOf(defs, name);
  std::vector<std::string> files;
  if (platform::FileExists(paths.del)) files.push_back(paths.del);
  for (std::string& path : AddOnFiles(defs, name)) files.push_back(std::move(path));
  for (const std::string* path : {&paths.fst, &paths.sdx}) {
    if (platform::FileExists(*path)) files.push_back(*path);
  }
  return files;
}

std::vector<std::string> DropFiles(const CGlobalDefs& defs, std::string_view name) {
  const std::vector<std::string> files = ExistingFiles(defs, name);
  for (const std::string& path : files) DropFile(path);
  return files;
}

std::vector<std::string> RemoveOrphanedTempFiles(const CGlobalDefs& defs) {
  const std::vector<std::string> removed =
      SweepOrphanedTempFiles(defs.GetFullDataPath(FolderKind::Indexes));
  for (const std::string& path : removed) {
    Trace(true, "PILIB.PiFindex.RemoveTempFiles", "Removed temporary file of a killed build: %s",
          path);
  }
  return removed;
}

}  // namespace qm::findex
