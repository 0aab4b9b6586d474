#include "config/temp_file_claim.h"

#include <fcntl.h>

#include <cerrno>
#include <chrono>
#include <thread>

namespace qm {

namespace {

// A sweep holds a temporary's lock only while it removes the file.
constexpr int kLockAttempts = 200;
constexpr std::chrono::milliseconds kLockPause{5};

enum class Locked { Yes, Swept, Unsupported };

// Locks file, waiting out a sweep; then path must still name it. Where the
// file system has no such locks the file stays unlocked: a sweep cannot lock
// it either, and removes only what it has locked.
Locked LockNamed(const platform::FileHandle& file, const std::string& path) {
  for (int attempt = 1;; ++attempt) {
    const int error = platform::TryLockWholeFile(file.Get());
    if (error == 0) break;
    if (error != EAGAIN) return Locked::Unsupported;
    if (attempt == kLockAttempts) return Locked::Swept;
    std::this_thread::sleep_for(kLockPause);
  }
  return platform::IsSameFile(file.Get(), path) ? Locked::Yes : Locked::Swept;
}

}  // namespace

std::optional<TempFileClaim> TempFileClaim::Create(const std::string& path) {
  platform::FileHandle file = platform::OpenFile(path, O_RDWR | O_CREAT | O_EXCL, 0666);
  if (!file.IsOpen()) return std::nullopt;
  if (LockNamed(file, path) == Locked::Swept) {
    // A sweep took the new file for an orphan and removed it: the caller
    // takes another name.
    errno = EEXIST;
    return std::nullopt;
  }
  return TempFileClaim(std::move(file));
}

std::optional<TempFileClaim> TempFileClaim::Hold(const std::string& path) {
  platform::FileHandle file = platform::OpenFile(path, O_RDWR);
  if (!file.IsOpen() || LockNamed(file, path) == Locked::Swept) return std::nullopt;
  return TempFileClaim(std::move(file));
}

}  // namespace qm
