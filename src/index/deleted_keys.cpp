#include "index/deleted_keys.h"

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <mutex>
#include <optional>
#include <random>
#include <utility>

#include "locks/lock_manager.h"
#include "platform/file_io.h"
#include "platform/text_encoding.h"
#include "base/byte_layout.h"
#include "base/exception_family.h"
#include "config/file_operations.h"
#include "config/global_defs.h"
#include "base/plain_name.h"
#include "config/temp_file_claim.h"
#include "config/win_file.h"

namespace qm {

namespace {

constexpr std::size_t kCountBytes = 4;
constexpr std::size_t kKeyBytes = 4;
constexpr int kTempNameAttempts = 100;
constexpr const char* kDamagedText = "Deleted-key file is damaged: %S";

std::mutex g_hook_mutex;
std::function<void(const std::string&)> g_replace_hook;

// Names reach a file name and a lock name: nothing that could leave the
// Indexes folder or be no file name at all.
void RequireFileName(std::string_view name, const char* method) {
  RequirePlainName<CPiDeleteException>("findex", name, method);
}

// --- the byte layout: count, then count keys ascending, all signed 32-bit LE ---

std::string EncodeKeys(const std::vector<int32_t>& keys) {
  std::string bytes(kCountBytes + kKeyBytes * keys.size(), '\0');
  auto* p = reinterpret_cast<uint8_t*>(bytes.data());
  bytes::StoreI32(p, static_cast<int32_t>(keys.size()));
  for (std::size_t i = 0; i < keys.size(); ++i) {
    bytes::StoreI32(p + kCountBytes + kKeyBytes * i, keys[i]);
  }
  return bytes;
}

// The keys of a whole file's bytes; a size that disagrees with the count, or
// keys out of order or repeated, raise the damage text naming path.
std::vector<int32_t> DecodeKeys(const std::string& bytes, const std::string& path,
                                const char* method) {
  auto damaged = [&] { return CPiDeleteException::Text(kDamagedText, method, nullptr, path); };
  if (bytes.size() < kCountBytes) throw damaged();
  const auto* p = reinterpret_cast<const uint8_t*>(bytes.data());
  const int32_t count = bytes::LoadI32(p);
  if (count < 0 || bytes.size() != kCountBytes + kKeyBytes * static_cast<std::size_t>(count)) {
    throw damaged();
  }
  std::vector<int32_t> keys(static_cast<std::size_t>(count));
  for (std::size_t i = 0; i < keys.size(); ++i) {
    keys[i] = bytes::LoadI32(p + kCountBytes + kKeyBytes * i);
    if (i > 0 && keys[i] <= keys[i - 1]) throw damaged();
  }
  return keys;
}

// The keys of path, or nothing when the file is missing; any other failure
// to read raises. REQUIRES: a kind 1 lock of the findex is held.
std::optional<std::vector<int32_t>> ReadKeyFile(const std::string& path, const char* method) {
  platform::FileHandle file = platform::OpenFileAs(path, platform::FileAccess::Read,
                                                   platform::FileDisposition::OpenExisting);
  if (!file.IsOpen()) {
    // Only a missing file means "nothing deleted yet": an unreadable list must
    // not pass for an empty one, or deleted keys would come back.
    if (errno == ENOENT) return std::nullopt;
    throw CPiDeleteException::Text("Error opening file: %s", method, nullptr, path);
  }
  const int64_t size = platform::FileSize(file.Get());
  if (size < 0) throw CPiDeleteException::Text("Error reading from file: %s", method, nullptr, path);
  constexpr int64_t kLargest = kCountBytes + kKeyBytes * int64_t{INT32_MAX};
  if (size > kLargest) throw CPiDeleteException::Text(kDamagedText, method, nullptr, path);
  std::string bytes(static_cast<std::size_t>(size), '\0');
  if (platform::ReadFull(file.Get(), bytes.data(), bytes.size()) != size) {
    throw CPiDeleteException::Text("Error reading from file: %s", method, nullptr, path);
  }
  return DecodeKeys(bytes, path, method);
}

// A temporary file that is removed again unless it was moved into place.
class TempFile {
 public:
  TempFile() = default;
  ~TempFile() {
    if (!path_.empty()) platform::UnlinkFile(path_);
  }
  TempFile(const TempFile&) = delete;
  TempFile& operator=(const TempFile&) = delete;

  // Creates a new file "tmpXXXXXX" in folder (each X a random letter or
  // digit), exclusively, so no other writer can share it, and writes bytes.
  void Write(const std::string& folder, const std::string& bytes, const char* method) {
    static constexpr std::string_view kChars =
        "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789";
    thread_local std::mt19937 random{std::random_device{}()};
    std::uniform_int_distribution<std::size_t> pick(0, kChars.size() - 1);
    std::optional<TempFileClaim> claim;
    std::string path;
    for (int attempt = 0; attempt < kTempNameAttempts && !claim; ++attempt) {
      path = folder + "tmp";
      for (int i = 0; i < 6; ++i) path += kChars[pick(random)];
      // Locked while it exists: a sweep never takes it for a dead writer's.
      claim = TempFileClaim::Create(path);
      if (!claim && errno != EEXIST) break;
    }
    if (!claim) {
      throw CPiDeleteException::Text("Error creating file: %s", method, nullptr, path);
    }
    path_ = path;
    claim_ = std::move(*claim);
    // The data reaches the disk before the rename publishes it: after a crash
    // the list is the old one or the new one, never an empty file.
    if (!platform::WriteAll(claim_.Get(), bytes.data(), bytes.size()) ||
        !platform::SyncFileData(claim_.Get())) {
      throw CPiDeleteException::Text("Error writing to file: %s", method, nullptr, path_);
    }
  }

  const std::string& Path() const { return path_; }
  void Release() { path_.clear(); }

 private:
  std::string path_;
  TempFileClaim claim_;  // released after the file is renamed or removed
};

// Holds the exclusive kind 1 lock of a findex for a scope.
class ExclusiveDeletedKeysLock {
 public:
  ExclusiveDeletedKeysLock(const CGlobalDefs& defs, std::string_view findex_name)
      : lock_(defs.GetLockScope(), defs.GetGroup(), findex_name, kLockDeletedKeys) {
    lock_.LockExclusive();
  }
  ~ExclusiveDeletedKeysLock() { lock_.UnlockAll(); }
  ExclusiveDeletedKeysLock(const ExclusiveDeletedKeysLock&) = delete;
  ExclusiveDeletedKeysLock& operator=(const ExclusiveDeletedKeysLock&) = delete;

 private:
  CLockManager lock_;
};

void RunReplaceHook(const std::string& temp_path) {
  std::function<void(const std::string&)> hook;
  {
    std::lock_guard<std::mutex> hold(g_hook_mutex);
    hook = g_replace_hook;
  }
  if (hook) hook(temp_path);
}

}  // namespace

std::string DeletedKeysPath(const CGlobalDefs& defs, std::string_view findex_name) {
  return defs.GetFullDataPath(FolderKind::Indexes) + ToUpper(findex_name) + ".del";
}

void DeleteKey(const CGlobalDefs& defs, std::string_view findex_name, int32_t key,
               bool synchronise) {
  constexpr const char* kMethod = "DeleteKey";
  Guard<CPiDeleteException>(kMethod, [&] {
    RequireFileName(findex_name, kMethod);
    const std::string folder = defs.GetFullDataPath(FolderKind::Indexes);
    const std::string path = DeletedKeysPath(defs, findex_name);
    // Held from the read to the replace: a second deleter reads only the list
    // that already holds the first one's key.
    ExclusiveDeletedKeysLock lock(defs, findex_name);
    std::vector<int32_t> keys = ReadKeyFile(path, kMethod).value_or(std::vector<int32_t>{});
    const auto place = std::lower_bound(keys.begin(), keys.end(), key);
    if (place != keys.end() && *place == key) return;
    keys.insert(place, key);
    TempFile temp;
    temp.Write(folder, EncodeKeys(keys), kMethod);
    RunReplaceHook(temp.Path());
    WinFile::RemoveFile(temp.Path(), path);
    temp.Release();
    // The synchronisation hook: deleted keys are not pushed to the servers,
    // so there is nothing to send and nothing that can fail.
    static_cast<void>(synchronise);
  });
}

std::vector<int32_t> ReadDeletedKeys(const CGlobalDefs& defs, std::string_view findex_name) {
  constexpr const char* kMethod = "ReadDeletedKeys";
  return Guard<CPiDeleteException>(kMethod, [&] {
    RequireFileName(findex_name, kMethod);
    const std::string path = DeletedKeysPath(defs, findex_name);
    CLockManager lock(defs.GetLockScope(), defs.GetGroup(), findex_name, kLockDeletedKeys);
    lock.LockReader();
    std::optional<std::vector<int32_t>> keys = ReadKeyFile(path, kMethod);
    lock.UnlockReaders();
    return keys ? std::move(*keys) : std::vector<int32_t>{};
  });
}

void DropDeletedKeys(const CGlobalDefs& defs, std::string_view findex_name) {
  constexpr const char* kMethod = "DropDeletedKeys";
  Guard<CPiDeleteException>(kMethod, [&] {
    RequireFileName(findex_name, kMethod);
    const std::string path = DeletedKeysPath(defs, findex_name);
    ExclusiveDeletedKeysLock lock(defs, findex_name);
    DropFile(path);
  });
}

void SetDeletedKeysReplaceHookForTesting(std::function<void(const std::string&)> hook) {
  std::lock_guard<std::mutex> hold(g_hook_mutex);
  g_replace_hook = std::move(hook);
}

}  // namespace qm
