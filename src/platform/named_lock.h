// Named cross-process locks on Linux: one lock file per name in the lock
// folder, with open-file-description record locks on its bytes. Byte 100 is
// the writer; bytes 0-99 are the 100 reader units. The kernel drops such locks
// when the description closes, so a process that dies never leaves a lock held.
#pragma once

#include <bitset>
#include <chrono>
#include <memory>
#include <string>
#include <string_view>

#include "platform/file_io.h"

namespace qm::platform {

// One open file description on the lock file of a name. Locks held through one
// description never conflict with each other, but do conflict with every other
// description, in this process or another.
class NamedLock {
 public:
  static constexpr int kUnitCount = 100;
  static constexpr int kWriterByte = 100;

  enum class WaitResult { kTaken, kTimedOut, kFailed };

  // Opens the lock file of name in the lock folder of scope, creating it (mode
  // 0666) and the folders when missing. Returns nullptr with error set to the
  // errno on failure.
  static std::unique_ptr<NamedLock> Open(std::string_view scope, std::string_view name,
                                         int& error);

  // Root lock folder: $MORVIL_LOCKDIR, else /dev/shm/morvil-locks/; ends in "/".
  static std::string LockFolder();
  // The lock folder of a scope (a data directory or home path): a subfolder of
  // the root named by a hash of the canonical path (symlinks resolved), so that
  // every path naming one directory shares its locks and unrelated
  // directories never do. An empty scope is the root itself.
  static std::string LockFolder(std::string_view scope);
  // The file name of a name's lock file: bytes that cannot stand in a file name
  // are escaped as "%XX", so distinct names never share a file.
  static std::string LockFileName(std::string_view name);

  ~NamedLock();  // releases whatever is held, then closes
  NamedLock(const NamedLock&) = delete;
  NamedLock& operator=(const NamedLock&) = delete;

  // Takes the writer byte, polling until timeout.
  WaitResult LockWriter(std::chrono::milliseconds timeout);
  void UnlockWriter();

  // Takes one more reader unit (any unit this description does not hold yet),
  // polling until timeout.
  WaitResult LockUnit(std::chrono::milliseconds timeout);
  int UnitsHeld() const { return static_cast<int>(units_.count()); }
  // Gives back every unit held, in one release.
  void UnlockUnits();

 private:
  explicit NamedLock(FileHandle file) : file_(std::move(file)) {}

  // 0, or the errno of F_OFD_SETLK (EAGAIN/EACCES: held by another description).
  int SetLock(short type, off_t start, off_t length);
  // Tries once to take a unit not yet held: 0, EAGAIN when all are busy, or an errno.
  int TryTakeUnit();

  FileHandle file_;
  std::bitset<kUnitCount> units_;
  bool writer_ = false;
};

}  // namespace qm::platform
