// The engine's one doorway to the file system: every open, read, write, rename
// and delete of the engine goes through here. Descriptors are close-on-exec.
#pragma once

#include <sys/types.h>

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace qm::platform {

// An owned file descriptor.
class FileHandle {
 public:
  FileHandle() = default;
  explicit FileHandle(int fd) : fd_(fd) {}
  FileHandle(FileHandle&& other) noexcept : fd_(other.Release()) {}
  FileHandle& operator=(FileHandle&& other) noexcept;
  FileHandle(const FileHandle&) = delete;
  FileHandle& operator=(const FileHandle&) = delete;
  ~FileHandle() { Close(); }

  bool IsOpen() const { return fd_ >= 0; }
  int Get() const { return fd_; }
  int Release() {
    const int fd = fd_;
    fd_ = -1;
    return fd;
  }
  // Returns 0 or the errno of a failed close.
  int Close();

 private:
  int fd_ = -1;
};

// open(2) with O_CLOEXEC added; on failure the handle is closed and errno set.
FileHandle OpenFile(const std::string& path, int flags, mode_t mode = 0666);

// Reads a whole file; false when it cannot be opened or read.
bool ReadWholeFile(const std::string& path, std::string& out);

// Writes all bytes, retrying short writes; false on failure (errno set).
bool WriteAll(int fd, const void* data, std::size_t n);

// Reads up to n bytes, retrying on EINTR; returns the count or -1.
ssize_t ReadSome(int fd, void* data, std::size_t n);

// Size of an open file, or -1.
int64_t FileSize(int fd);

bool FileExists(const std::string& path);
// The canonical form of path (symbolic links resolved); empty when it does
// not exist.
std::string CanonicalPath(const std::string& path);
// The path with the symbolic links of its existing part resolved and "." and
// ".." folded; nullopt when the file system cannot tell.
std::optional<std::string> WeaklyCanonicalPath(const std::string& path);

// --- opening with the engine's dispositions ---

enum class FileAccess { Read, Write, ReadWrite };

enum class FileDisposition {
  CreateAlways,  // create, or truncate an existing file
  OpenAlways,    // open, creating the file when missing
  OpenExisting,  // open; fails when missing
  CreateNew,     // create; fails when the name exists (O_EXCL)
};

// Attribute bits. Hidden has no effect here; sequential scan is a read-ahead
// hint; delete-on-close unlinks the name as soon as the file is open.
enum FileAttribute : unsigned {
  kFileAttributeNormal = 0,
  kFileAttributeHidden = 1u << 0,
  kFileAttributeSequentialScan = 1u << 1,
  kFileAttributeDeleteOnClose = 1u << 2,
};

// Files are created mode 0666 (less the umask). On failure the handle is
// closed and errno set.
FileHandle OpenFileAs(const std::string& path, FileAccess access, FileDisposition disposition,
                      unsigned attributes = kFileAttributeNormal);

// Reads until n bytes or the end of the file; returns the count or -1.
ssize_t ReadFull(int fd, void* data, std::size_t n);

// Writes all bytes at an absolute offset, leaving the file position alone.
bool WriteAllAt(int fd, const void* data, std::size_t n, int64_t offset);

enum class SeekFrom { Begin, Current, End };
// Returns the new position, or -1.
int64_t SeekFile(int fd, int64_t offset, SeekFrom from);

// Pushes written data to the device; false on failure.
bool SyncFileData(int fd);

// Cuts (or extends with zeros) an open file to size bytes; 0 or the errno.
int TruncateFile(int fd, int64_t size);

// Each returns 0 or the errno of the failure.
int RenameFile(const std::string& from, const std::string& to);
int UnlinkFile(const std::string& path);
// Creates the folder and any missing parents; an existing folder is fine.
int MakeDirectories(const std::string& path);

bool IsDirectory(const std::string& path);

// The names of the entries of a folder ("." and ".." left out), sorted; 0 or
// the errno of a folder that cannot be read.
int ListFolder(const std::string& folder, std::vector<std::string>& names);

// Size of the file at path, or -1 when it cannot be looked at.
int64_t PathFileSize(const std::string& path);

// A write lock on the whole file through the open file description of fd
// (F_OFD_SETLK), never waiting: 0, EAGAIN while another description holds a
// lock on it, or another errno. The kernel drops it when the description
// closes, also when the process dies. fd must be open for writing.
int TryLockWholeFile(int fd);

// True when path names the file open as fd (same device and inode).
bool IsSameFile(int fd, const std::string& path);

}  // namespace qm::platform
