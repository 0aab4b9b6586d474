#include "config/temp_file_sweep.h"

#include <fcntl.h>

#include "platform/file_io.h"

namespace qm {

namespace {

constexpr std::string_view kGeneratedPrefix = "tmpxxxx_";
constexpr std::size_t kRandomNameLength = 9;  // "tmp" + 6

bool IsLetterOrDigit(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9');
}

}  // namespace

bool IsTempFileName(std::string_view name) {
  if (name.substr(0, kGeneratedPrefix.size()) == kGeneratedPrefix) return true;
  if (name.size() != kRandomNameLength || name.substr(0, 3) != "tmp") return false;
  for (char c : name.substr(3)) {
    if (!IsLetterOrDigit(c)) return false;
  }
  return true;
}

std::vector<std::string> SweepOrphanedTempFiles(const std::string& folder) {
  std::vector<std::string> removed;
  std::vector<std::string> names;
  if (platform::ListFolder(folder, names) != 0) return removed;
  for (const std::string& name : names) {
    if (!IsTempFileName(name)) continue;
    const std::string path = folder + name;
    platform::FileHandle file = platform::OpenFile(path, O_RDWR | O_NOFOLLOW);
    if (!file.IsOpen() || platform::FileSize(file.Get()) < 0) continue;
    // Locked: a live build's. Unlockable: nothing can be told, so it stays.
    if (platform::TryLockWholeFile(file.Get()) != 0) continue;
    // The name may have moved on (renamed into place) since it was opened.
    if (!platform::IsSameFile(file.Get(), path)) continue;
    if (platform::UnlinkFile(path) == 0) removed.push_back(path);
  }
  return removed;
}

}  // namespace qm
