// CLockManager: named cross-process locks on index files. One writer mutex and
// 100 reader units per lock name; a writer that needs the files to itself takes
// the mutex, then every unit. Every wait has a time-out and fails with a message.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

namespace qm {

// The objects that are locked, by kind.
enum LockKind : int32_t {
  kLockDeletedKeys = 1,  // a findex's deleted-key file
  kLockFindex = 2,       // the files of a findex
  kLockOrder = 3,        // the files of an order
  kLockGenerator = 8,    // the temporary-name counter file
};

namespace platform {
class NamedLock;
}

// Every lock lives in a scope: the data directory (or home) whose files it
// guards. Processes share a lock only when they name the same lock in the same
// directory, so builds in unrelated data directories never wait for each other.
class CLockManager {
 public:
  // "MORVIL_" + kind + "_" + group + "_" + object name, upper-cased.
  CLockManager(std::string_view scope, std::string_view group, std::string_view object_name,
               int32_t kind, int32_t caller_flag = 0);
  // The lock name is exactly whole_name (per-command locks).
  CLockManager(std::string_view scope, std::string_view whole_name);
  ~CLockManager();
  CLockManager(const CLockManager&) = delete;
  CLockManager& operator=(const CLockManager&) = delete;

  // Releases whatever is held, then names the lock anew.
  void SetName(std::string_view group, std::string_view object_name, int32_t kind,
               int32_t caller_flag = 0);

  void LockWriter();
  void UnlockWriter();
  void LockReader();
  void LockAllReaders();
  void UnlockReaders();
  // LockWriter, then LockAllReaders; a failure leaves nothing more held.
  void LockExclusive();
  void UnlockAll();

  const std::string& GetLockName() const { return lock_name_; }
  bool HoldsWriter() const { return writer_ != 0; }
  int32_t ReaderCount() const { return reader_count_; }

  // Test hook: multiplies every time-out (50,000 ms writer, 10,000 ms per
  // reader unit) by factor; 1.0 restores them.
  static void ScaleTimeoutsForTesting(double factor);

 private:
  // Open the lock's named object for this object's writer or readers.
  void CreateWriterMutex();
  void CreateReaderSemaphore();

  std::string scope_;
  std::string lock_name_;
  std::unique_ptr<platform::NamedLock> readers_;
  int32_t reader_count_ = 0;
  std::unique_ptr<platform::NamedLock> writer_lock_;
  int32_t writer_ = 0;
  int32_t caller_flag_ = 0;
};

// Holds a writer lock for a scope.
class ScopedWriterLock {
 public:
  explicit ScopedWriterLock(CLockManager& lock) : lock_(lock) { lock_.LockWriter(); }
  ~ScopedWriterLock() { lock_.UnlockWriter(); }
  ScopedWriterLock(const ScopedWriterLock&) = delete;
  ScopedWriterLock& operator=(const ScopedWriterLock&) = delete;

 private:
  CLockManager& lock_;
};

}  // namespace qm
