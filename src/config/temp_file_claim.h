// TempFileClaim: a temporary file of a build, created under a generated name
// and write-locked (an open-file-description lock on the whole file) for as
// long as the claim lives. The kernel drops the lock when the claim closes or
// the process dies, so an unlocked temporary belongs to nobody and the sweep
// (temp_file_sweep.h) may remove it; a locked one is left alone.
//
// Renaming the file keeps the lock (it stays with the file, not the name), so
// a claim can follow its file into place and be released afterwards.
#pragma once

#include <optional>
#include <string>

#include "platform/file_io.h"

namespace qm {

class TempFileClaim {
 public:
  TempFileClaim() = default;
  TempFileClaim(TempFileClaim&&) noexcept = default;
  TempFileClaim& operator=(TempFileClaim&&) noexcept = default;
  TempFileClaim(const TempFileClaim&) = delete;
  TempFileClaim& operator=(const TempFileClaim&) = delete;
  ~TempFileClaim() = default;  // closing the descriptor releases the lock

  // Creates path exclusively and locks it. Nothing (errno EEXIST) when the
  // name is taken, also when a sweep removed the new file before it was
  // locked: the caller takes another name. Other failures: nothing, errno set.
  static std::optional<TempFileClaim> Create(const std::string& path);
  // Locks an existing file (a file set aside during a swap), waiting briefly
  // for a sweep that may be looking at it. Nothing when it is not there or
  // cannot be locked.
  static std::optional<TempFileClaim> Hold(const std::string& path);

  bool IsHeld() const { return file_.IsOpen(); }
  // The descriptor, open for reading and writing.
  int Get() const { return file_.Get(); }
  // Unlocks and closes; the file stays where it is.
  void Release() { file_.Close(); }

 private:
  explicit TempFileClaim(platform::FileHandle file) : file_(std::move(file)) {}

  platform::FileHandle file_;
};

}  // namespace qm
