#include "index/file_swap.h"

#include <mutex>
#include <optional>

#include "platform/file_io.h"
#include "config/file_operations.h"
#include "base/trace.h"
#include "config/win_file.h"

namespace qm::file_swap {

namespace {

std::mutex g_hook_mutex;
std::function<bool(const std::string&)> g_rename_hook;

void Rename(const std::string& from, const std::string& to) {
  bool refuse = false;
  {
    std::lock_guard lock(g_hook_mutex);
    refuse = g_rename_hook && g_rename_hook(to);
  }
  if (refuse) {
    throw CWinFileException::Text("Error renaming file: %s to %s", "RemoveFile", nullptr, from, to);
  }
  WinFile::RemoveFile(from, to);
}

}  // namespace

void Renames::SetAside(const std::string& target, const std::string& backup) {
  if (!platform::FileExists(target)) return;
  std::optional<TempFileClaim> hold = TempFileClaim::Hold(target);
  Move(target, backup);
  if (hold) held_.push_back(std::move(*hold));
  backups_.push_back(backup);
}

void Renames::Move(const std::string& from, const std::string& to) {
  Rename(from, to);
  done_.emplace_back(from, to);
}

void Renames::Undo() {
  for (auto it = done_.rbegin(); it != done_.rend(); ++it) {
    try {
      Rename(it->second, it->first);
    } catch (const CException& undo) {
      Trace(true, error_tag_, "Could not move %s back to %s: %s", it->second, it->first,
            undo.GetFullTextUtf8(kLevelGeneral));
    }
  }
  done_.clear();
  backups_.clear();
  held_.clear();
}

void Renames::DropBackups() {
  for (const std::string& backup : backups_) DropQuietly(backup, error_tag_);
  backups_.clear();
  held_.clear();
}

void DropQuietly(const std::string& path, const char* error_tag) {
  try {
    DropFile(path);
  } catch (const CException& e) {
    Trace(true, error_tag, "Could not delete %s: %s", path, e.GetFullTextUtf8(kLevelGeneral));
  }
}

void TraceNoExclusiveAccess(const char* error_tag, std::string_view what, std::string_view name,
                            int attempt) {
  Trace(true, error_tag, "No exclusive access to %s %s (attempt %i of %i)", what, name, attempt,
        kExclusiveAttempts);
}

void SetRenameHookForTesting(std::function<bool(const std::string& target)> hook) {
  std::lock_guard lock(g_hook_mutex);
  g_rename_hook = std::move(hook);
}

}  // namespace qm::file_swap
