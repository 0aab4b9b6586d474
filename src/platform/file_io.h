// The engine's one doorway to the file system: every open, read, write, rename
// and delete of the engine goes through here. Descriptors are close-on-exec.
#pragma once

#include <sys/types.h>

#include <cstdint>
#include <string>
#include <string_view>

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

}  // namespace qm::platform
