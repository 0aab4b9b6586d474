#include "locks/lock_manager.h"

#include <atomic>
#include <chrono>
#include <cmath>

#include "platform/named_lock.h"
#include "platform/text_encoding.h"
#include "base/exception_family.h"

namespace qm {

namespace {

using platform::NamedLock;

constexpr int64_t kWriterTimeoutMs = 50000;
constexpr int64_t kReaderUnitTimeoutMs = 10000;

std::atomic<double> g_timeout_scale{1.0};

std::chrono::milliseconds Timeout(int64_t ms) {
  const double scaled = static_cast<double>(ms) * g_timeout_scale.load();
  return std::chrono::milliseconds(scaled > 0 ? std::llround(scaled) : 0);
}

std::string KindLockName(std::string_view group, std::string_view object_name, int32_t kind) {
  std::string name = "MORVIL_" + std::to_string(kind) + "_";
  name += group;
  name += '_';
  name += object_name;
  return ToUpper(name);
}

}  // namespace

CLockManager::CLockManager(std::string_view scope, std::string_view group,
                           std::string_view object_name, int32_t kind, int32_t caller_flag)
    : scope_(scope), lock_name_(KindLockName(group, object_name, kind)), caller_flag_(caller_flag) {}

CLockManager::CLockManager(std::string_view scope, std::string_view whole_name)
    : scope_(scope), lock_name_(whole_name) {}

CLockManager::~CLockManager() { UnlockAll(); }

void CLockManager::SetName(std::string_view group, std::string_view object_name, int32_t kind,
                           int32_t caller_flag) {
  UnlockAll();
  lock_name_ = KindLockName(group, object_name, kind);
  caller_flag_ = caller_flag;
}

void CLockManager::ScaleTimeoutsForTesting(double factor) { g_timeout_scale.store(factor); }

void CLockManager::LockWriter() {
  if (writer_ != 0) {
    throw CLockManagerException::Text("Writer lock manager already in use", "LockWriter", nullptr);
  }
  CreateWriterMutex();
  if (writer_lock_->LockWriter(Timeout(kWriterTimeoutMs)) != NamedLock::WaitResult::kTaken) {
    writer_lock_.reset();
    throw CLockManagerException::Text("Timeout waiting for write access to an index. Lock name: %S",
                                      "LockWriter", nullptr, lock_name_);
  }
  writer_ = 1;
}

void CLockManager::UnlockWriter() {
  if (writer_ == 0) return;
  writer_lock_->UnlockWriter();
  writer_lock_.reset();
  writer_ = 0;
}

void CLockManager::CreateWriterMutex() {
  // The writer has a description of its own, so releasing the readers (which
  // closes theirs) never drops the writer.
  int error = 0;
  writer_lock_ = NamedLock::Open(scope_, lock_name_, error);
  if (!writer_lock_) {
    throw CLockManagerException::Text("Error creating mutex: %S", "CreateWriterMutex", nullptr,
                                      lock_name_);
  }
}

void CLockManager::CreateReaderSemaphore() {
  int error = 0;
  readers_ = NamedLock::Open(scope_, lock_name_, error);
  if (!readers_) {
    throw CLockManagerException::Text("Error creating semaphore: %S, Error Code: %i",
                                      "CreateReaderSemaphore", nullptr, lock_name_, error);
  }
}

void CLockManager::LockReader() {
  if (reader_count_ != 0) {
    throw CLockManagerException::Text("Reader lock manager already in use", "LockReader", nullptr);
  }
  CreateReaderSemaphore();
  if (readers_->LockUnit(Timeout(kReaderUnitTimeoutMs)) != NamedLock::WaitResult::kTaken) {
    readers_.reset();
    throw CLockManagerException::Text(
        "Timeout waiting for single read access to an index. Lock name: %S", "LockReader", nullptr,
        lock_name_);
  }
  reader_count_ = 1;
}

void CLockManager::LockAllReaders() {
  if (reader_count_ != 0) {
    throw CLockManagerException::Text("Reader lock manager already in use", "LockAllReaders",
                                      nullptr);
  }
  CreateReaderSemaphore();
  while (reader_count_ < NamedLock::kUnitCount) {
    if (readers_->LockUnit(Timeout(kReaderUnitTimeoutMs)) != NamedLock::WaitResult::kTaken) {
      readers_->UnlockUnits();
      readers_.reset();
      reader_count_ = 0;
      throw CLockManagerException::Text(
          "Timeout waiting for all read access to an index. Lock name: %S", "LockAllReaders",
          nullptr, lock_name_);
    }
    ++reader_count_;
  }
}

void CLockManager::UnlockReaders() {
  if (reader_count_ == 0) return;
  readers_->UnlockUnits();
  readers_.reset();
  reader_count_ = 0;
}

void CLockManager::LockExclusive() {
  LockWriter();
  try {
    LockAllReaders();
  } catch (...) {
    UnlockWriter();
    throw;
  }
}

void CLockManager::UnlockAll() {
  UnlockReaders();
  UnlockWriter();
}

}  // namespace qm
