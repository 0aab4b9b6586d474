#include "platform/named_lock.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstdint>
#include <cstdlib>
#include <thread>

#include "platform/text_encoding.h"

namespace qm::platform {

namespace {

constexpr const char* kDefaultLockFolder = "/dev/shm/morvil-locks/";
// Anyone may create lock files in the folder, no one may remove another's.
constexpr mode_t kFolderMode = 01777;
constexpr mode_t kLockFileMode = 0666;
// Names whose escaped form is too long for a file name keep a readable
// prefix of this length plus a hash of the whole name.
constexpr std::size_t kHashedPrefixLength = 200;
constexpr auto kFirstBackOff = std::chrono::milliseconds(1);
constexpr auto kMaxBackOff = std::chrono::milliseconds(20);

bool NeedsEscape(unsigned char c) { return c == '/' || c == '%' || c < 0x20 || c == 0x7F; }

void AppendEscaped(unsigned char c, std::string& out) {
  static constexpr char kHex[] = "0123456789ABCDEF";
  out += '%';
  out += kHex[c >> 4];
  out += kHex[c & 0x0F];
}

uint64_t Fnv1a64(std::string_view text) {
  uint64_t h = 14695981039346656037ULL;
  for (unsigned char c : text) {
    h ^= c;
    h *= 1099511628211ULL;
  }
  return h;
}

// Creates folder and any missing parents; the folder itself, when created
// here, is made world-writable with the sticky bit regardless of the umask.
int EnsureFolder(const std::string& folder) {
  const std::string leaf = folder.substr(0, folder.find_last_not_of('/') + 1);
  for (std::size_t slash = leaf.find('/', 1); slash != std::string::npos;
       slash = leaf.find('/', slash + 1)) {
    ::mkdir(leaf.substr(0, slash).c_str(), 0777);  // a real problem shows at the leaf
  }
  if (::mkdir(leaf.c_str(), kFolderMode) == 0) {
    return ::chmod(leaf.c_str(), kFolderMode) == 0 ? 0 : errno;
  }
  return errno == EEXIST ? 0 : errno;
}

}  // namespace

std::string NamedLock::LockFolder() {
  const char* env = std::getenv("MORVIL_LOCKDIR");
  std::string folder = env != nullptr && *env != '\0' ? env : kDefaultLockFolder;
  if (folder.back() != '/') folder += '/';
  return folder;
}

std::string NamedLock::LockFolder(std::string_view scope) {
  std::string folder = LockFolder();
  if (scope.empty()) return folder;
  std::string path = CanonicalPath(std::string(scope));
  if (path.empty()) {
    // Not there (yet): the path as written, without trailing slashes.
    path = scope;
    while (path.size() > 1 && path.back() == '/') path.pop_back();
  }
  static constexpr char kHex[] = "0123456789abcdef";
  const uint64_t h = Fnv1a64(path);
  folder += "dir-";
  for (int shift = 60; shift >= 0; shift -= 4) folder += kHex[(h >> shift) & 0x0F];
  folder += '/';
  return folder;
}

std::string NamedLock::LockFileName(std::string_view name) {
  // "%" is always followed by two hex digits in an escaped name, so "%%" marks
  // the forms below as ones no plain escaping can produce.
  if (name.empty()) return "%%";
  std::string out;
  if (name == "." || name == "..") {
    for (unsigned char c : name) AppendEscaped(c, out);
    return out;
  }
  for (unsigned char c : name) {
    if (NeedsEscape(c)) {
      AppendEscaped(c, out);
    } else {
      out += static_cast<char>(c);
    }
  }
  if (out.size() <= NAME_MAX) return out;
  std::size_t cut = Utf8CutLength(out, kHashedPrefixLength);
  // Never keep half an escape.
  const std::size_t percent = out.rfind('%', cut - 1);
  if (percent != std::string::npos && percent + 3 > cut) cut = percent;
  static constexpr char kHex[] = "0123456789ABCDEF";
  std::string hashed = out.substr(0, cut) + "%%";
  const uint64_t h = Fnv1a64(name);
  for (int shift = 60; shift >= 0; shift -= 4) hashed += kHex[(h >> shift) & 0x0F];
  return hashed;
}

std::unique_ptr<NamedLock> NamedLock::Open(std::string_view scope, std::string_view name,
                                           int& error) {
  const std::string root = LockFolder();
  const std::string folder = LockFolder(scope);
  const std::string path = folder + LockFileName(name);
  // Lock files are never removed (a removed file would let two holders lock
  // different files of one name), so the loop ends within a few rounds unless
  // something else deletes them.
  for (int attempt = 0; attempt < 4; ++attempt) {
    FileHandle file = OpenFile(path, O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW, kLockFileMode);
    if (file.IsOpen()) {
      // The umask must not keep other accounts out of the lock.
      if (::fchmod(file.Get(), kLockFileMode) != 0) {
        error = errno;
        return nullptr;
      }
      return std::unique_ptr<NamedLock>(new NamedLock(std::move(file)));
    }
    if (errno == EEXIST) {
      file = OpenFile(path, O_RDWR | O_NOFOLLOW);
      if (file.IsOpen()) {
        struct stat st {};
        if (::fstat(file.Get(), &st) != 0) {
          error = errno;
          return nullptr;
        }
        if (!S_ISREG(st.st_mode)) {
          error = EINVAL;
          return nullptr;
        }
        return std::unique_ptr<NamedLock>(new NamedLock(std::move(file)));
      }
      if (errno != ENOENT) {
        error = errno;
        return nullptr;
      }
    } else if (errno == ENOENT) {
      // The root first, so that it too is open to every account.
      int folder_error = EnsureFolder(root);
      if (folder_error == 0 && folder != root) folder_error = EnsureFolder(folder);
      if (folder_error != 0) {
        error = folder_error;
        return nullptr;
      }
    } else {
      error = errno;
      return nullptr;
    }
  }
  error = ENOENT;
  return nullptr;
}

NamedLock::~NamedLock() {
  // An explicit release: closing alone keeps the locks while any duplicate of
  // the descriptor (a forked child) lives on.
  if (writer_ || units_.any()) SetLock(F_UNLCK, 0, kWriterByte + 1);
}

int NamedLock::SetLock(short type, off_t start, off_t length) {
  struct flock fl {};
  fl.l_type = type;
  fl.l_whence = SEEK_SET;
  fl.l_start = start;
  fl.l_len = length;
  fl.l_pid = 0;  // required for open-file-description locks
  for (;;) {
    if (::fcntl(file_.Get(), F_OFD_SETLK, &fl) == 0) return 0;
    if (errno != EINTR) return errno;
  }
}

namespace {

// Calls attempt until it returns something other than EAGAIN/EACCES or the
// time-out has passed, sleeping a little longer after each busy round.
template <class Attempt>
NamedLock::WaitResult Poll(std::chrono::milliseconds timeout, Attempt attempt) {
  using Clock = std::chrono::steady_clock;
  const auto deadline = Clock::now() + timeout;
  auto back_off = std::chrono::duration_cast<Clock::duration>(kFirstBackOff);
  for (;;) {
    const int rc = attempt();
    if (rc == 0) return NamedLock::WaitResult::kTaken;
    if (rc != EAGAIN && rc != EACCES) return NamedLock::WaitResult::kFailed;
    const auto now = Clock::now();
    if (now >= deadline) return NamedLock::WaitResult::kTimedOut;
    std::this_thread::sleep_for(std::min(back_off, deadline - now));
    back_off = std::min(back_off * 2, std::chrono::duration_cast<Clock::duration>(kMaxBackOff));
  }
}

}  // namespace

NamedLock::WaitResult NamedLock::LockWriter(std::chrono::milliseconds timeout) {
  const WaitResult result = Poll(timeout, [this] { return SetLock(F_WRLCK, kWriterByte, 1); });
  if (result == WaitResult::kTaken) writer_ = true;
  return result;
}

void NamedLock::UnlockWriter() {
  if (!writer_) return;
  SetLock(F_UNLCK, kWriterByte, 1);
  writer_ = false;
}

int NamedLock::TryTakeUnit() {
  // Any free unit will do, as with a counting semaphore. Units this
  // description holds must be skipped: relocking them would succeed.
  for (int unit = 0; unit < kUnitCount; ++unit) {
    if (units_.test(unit)) continue;
    const int rc = SetLock(F_WRLCK, unit, 1);
    if (rc == 0) {
      units_.set(unit);
      return 0;
    }
    if (rc != EAGAIN && rc != EACCES) return rc;
  }
  return EAGAIN;
}

NamedLock::WaitResult NamedLock::LockUnit(std::chrono::milliseconds timeout) {
  if (units_.all()) return WaitResult::kFailed;
  return Poll(timeout, [this] { return TryTakeUnit(); });
}

void NamedLock::UnlockUnits() {
  if (units_.none()) return;
  SetLock(F_UNLCK, 0, kUnitCount);
  units_.reset();
}

}  // namespace qm::platform
