#include "build/findex_file_set.h"

#include <mutex>
#include <optional>
#include <utility>
#include <vector>

#include "build/deleted_keys.h"
#include "locks/lock_manager.h"
#include "platform/file_io.h"
#include "platform/text_encoding.h"
#include "shared/exception_family.h"
#include "shared/file_operations.h"
#include "shared/global_defs.h"
#include "shared/plain_name.h"
#include "shared/trace.h"
#include "shared/win_file.h"

namespace qm::findex {

namespace {

constexpr const char* kRenameMethod = "RenameIndex";
constexpr const char* kErrorTag = "PILIB_ERROR.PiFindex.RenameIndex";
constexpr int kExclusiveAttempts = 3;

std::mutex g_hook_mutex;
std::function<bool(const std::string&)> g_rename_hook;

void Rename(const std::string& from, const std::string& to) {
  {
    std::lock_guard lock(g_hook_mutex);
    if (g_rename_hook && g_rename_hook(to)) {
      throw CWinFileException::Text("Error renaming file: %s to %s", "RemoveFile", nullptr, from,
                                    to);
    }
  }
  WinFile::RemoveFile(from, to);
}

// The exclusive lock, tried again after a time-out: a search may hold its
// reader unit for a while, and the finished build is worth the wait.
void LockExclusively(CLockManager& lock, std::string_view name) {
  for (int attempt = 1;; ++attempt) {
    try {
      lock.LockExclusive();
      return;
    } catch (const CException& e) {
      Trace(true, kErrorTag, "No exclusive access to findex %s (attempt %i of %i)", name, attempt,
            kExclusiveAttempts);
      if (attempt == kExclusiveAttempts) {
        throw CPiFIndexException::Text(
            "Could not get exclusive access to findex %s to put the new build in place",
            kRenameMethod, &e, name);
      }
    }
  }
}

// Deletes what must go once the new pair is in place; a failure is traced,
// since the findex itself is already whole.
void DropLeftover(const std::string& path) {
  try {
    DropFile(path);
  } catch (const CException& e) {
    Trace(true, kErrorTag, "Could not delete %s: %s", path, e.GetFullTextUtf8(kLevelGeneral));
  }
}

void DropAddOns(const CGlobalDefs& defs, std::string_view name) {
  for (int32_t n = 1;; ++n) {
    const FilePaths add_on = PathsOf(defs, AddOnName(name, n));
    if (!platform::FileExists(add_on.fst) && !platform::FileExists(add_on.sdx)) return;
    DropFile(add_on.fst);
    DropFile(add_on.sdx);
  }
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
  CLockManager owner_lock(group, OwnerName(name), kLockFindex);
  LockExclusively(owner_lock, OwnerName(name));
  std::optional<CLockManager> add_on_lock;
  if (IsAddOnName(name)) {
    add_on_lock.emplace(group, ToUpper(name), kLockFindex);
    LockExclusively(*add_on_lock, ToUpper(name));
  }

  const std::string backup_sdx = temp_sdx + ".old";
  const std::string backup_fst = temp_fst + ".old";
  std::vector<std::pair<std::string, std::string>> done;  // renames to undo on failure
  std::string failing = target.sdx;
  try {
    if (platform::FileExists(target.sdx)) {
      Rename(target.sdx, backup_sdx);
      done.emplace_back(target.sdx, backup_sdx);
    }
    failing = target.fst;
    if (platform::FileExists(target.fst)) {
      Rename(target.fst, backup_fst);
      done.emplace_back(target.fst, backup_fst);
    }
    failing = target.sdx;
    Rename(temp_sdx, target.sdx);
    done.emplace_back(temp_sdx, target.sdx);
    failing = target.fst;
    Rename(temp_fst, target.fst);
    done.emplace_back(temp_fst, target.fst);
  } catch (const CException& e) {
    for (auto it = done.rbegin(); it != done.rend(); ++it) {
      try {
        Rename(it->second, it->first);
      } catch (const CException& undo) {
        Trace(true, kErrorTag, "Could not move %s back to %s: %s", it->second, it->first,
              undo.GetFullTextUtf8(kLevelGeneral));
      }
    }
    throw CPiFIndexException::Text("Error renaming index file %S", kRenameMethod, &e, failing);
  }

  DropLeftover(backup_sdx);
  DropLeftover(backup_fst);
  if (rebuild) {
    // The new findex holds every row: add-ons and deleted keys of the old
    // one no longer apply.
    Guard<CPiFIndexException>(kRenameMethod, [&] {
      DropAddOns(defs, name);
      DropDeletedKeys(defs, name);
    });
  }
}

void DropFiles(const CGlobalDefs& defs, std::string_view name) {
  const FilePaths paths = PathsOf(defs, name);
  DropFile(paths.del);
  DropAddOns(defs, name);
  DropFile(paths.fst);
  DropFile(paths.sdx);
}

void SetRenameHookForTesting(std::function<bool(const std::string& target)> hook) {
  std::lock_guard lock(g_hook_mutex);
  g_rename_hook = std::move(hook);
}

}  // namespace qm::findex
