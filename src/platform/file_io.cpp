#include "platform/file_io.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <dirent.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <algorithm>
#include <system_error>

namespace qm::platform {

FileHandle& FileHandle::operator=(FileHandle&& other) noexcept {
  if (this != &other) {
    Close();
    fd_ = other.Release();
  }
  return *this;
}

int FileHandle::Close() {
  if (fd_ < 0) return 0;
  const int rc = ::close(fd_);
  fd_ = -1;
  return rc == 0 ? 0 : errno;
}

FileHandle OpenFile(const std::string& path, int flags, mode_t mode) {
  int fd;
  do {
    fd = ::open(path.c_str(), flags | O_CLOEXEC, mode);
  } while (fd < 0 && errno == EINTR);
  return FileHandle(fd);
}

bool ReadWholeFile(const std::string& path, std::string& out) {
  out.clear();
  FileHandle file = OpenFile(path, O_RDONLY);
  if (!file.IsOpen()) return false;
  char buffer[4000];
  for (;;) {
    const ssize_t n = ReadSome(file.Get(), buffer, sizeof buffer);
    if (n < 0) return false;
    if (n == 0) return true;
    out.append(buffer, static_cast<std::size_t>(n));
  }
}

bool WriteAll(int fd, const void* data, std::size_t n) {
  const char* p = static_cast<const char*>(data);
  while (n > 0) {
    const ssize_t w = ::write(fd, p, n);
    if (w < 0) {
      if (errno == EINTR) continue;
      return false;
    }
    p += w;
    n -= static_cast<std::size_t>(w);
  }
  return true;
}

ssize_t ReadSome(int fd, void* data, std::size_t n) {
  for (;;) {
    const ssize_t r = ::read(fd, data, n);
    if (r >= 0 || errno != EINTR) return r;
  }
}

int64_t FileSize(int fd) {
  struct stat st {};
  if (::fstat(fd, &st) != 0) return -1;
  return static_cast<int64_t>(st.st_size);
}

bool FileExists(const std::string& path) {
  struct stat st {};
  return ::stat(path.c_str(), &st) == 0;
}

std::string CanonicalPath(const std::string& path) {
  char* resolved = ::realpath(path.c_str(), nullptr);
  if (resolved == nullptr) return {};
  std::string out(resolved);
  std::free(resolved);
  return out;
}

std::optional<std::string> WeaklyCanonicalPath(const std::string& path) {
  std::error_code ec;
  std::filesystem::path resolved = std::filesystem::weakly_canonical(path, ec);
  if (ec) return std::nullopt;
  return resolved.lexically_normal().string();
}

FileHandle OpenFileAs(const std::string& path, FileAccess access, FileDisposition disposition,
                      unsigned attributes) {
  int flags = access == FileAccess::Read ? O_RDONLY : access == FileAccess::Write ? O_WRONLY : O_RDWR;
  switch (disposition) {
    case FileDisposition::CreateAlways:
      flags |= O_CREAT | O_TRUNC;
      break;
    case FileDisposition::OpenAlways:
      flags |= O_CREAT;
      break;
    case FileDisposition::OpenExisting:
      break;
    case FileDisposition::CreateNew:
      flags |= O_CREAT | O_EXCL;
      break;
  }
  // O_TRUNC needs write access; a read-only create-always still empties the file.
  if ((flags & O_TRUNC) != 0 && access == FileAccess::Read) flags = (flags & ~O_RDONLY) | O_RDWR;
  FileHandle file = OpenFile(path, flags, 0666);
  if (!file.IsOpen()) return file;
  if ((attributes & kFileAttributeSequentialScan) != 0) {
    ::posix_fadvise(file.Get(), 0, 0, POSIX_FADV_SEQUENTIAL);
  }
  if ((attributes & kFileAttributeDeleteOnClose) != 0) ::unlink(path.c_str());
  return file;
}

ssize_t ReadFull(int fd, void* data, std::size_t n) {
  char* p = static_cast<char*>(data);
  std::size_t done = 0;
  while (done < n) {
    const ssize_t r = ReadSome(fd, p + done, n - done);
    if (r < 0) return -1;
    if (r == 0) break;
    done += static_cast<std::size_t>(r);
  }
  return static_cast<ssize_t>(done);
}

bool WriteAllAt(int fd, const void* data, std::size_t n, int64_t offset) {
  const char* p = static_cast<const char*>(data);
  while (n > 0) {
    const ssize_t w = ::pwrite(fd, p, n, static_cast<off_t>(offset));
    if (w < 0) {
      if (errno == EINTR) continue;
      return false;
    }
    p += w;
    n -= static_cast<std::size_t>(w);
    offset += w;
  }
  return true;
}

int64_t SeekFile(int fd, int64_t offset, SeekFrom from) {
  const int whence = from == SeekFrom::Begin ? SEEK_SET : from == SeekFrom::Current ? SEEK_CUR : SEEK_END;
  return static_cast<int64_t>(::lseek(fd, static_cast<off_t>(offset), whence));
}

bool SyncFileData(int fd) { return ::fdatasync(fd) == 0; }

int TruncateFile(int fd, int64_t size) {
  while (::ftruncate(fd, static_cast<off_t>(size)) != 0) {
    if (errno != EINTR) return errno;
  }
  return 0;
}

int RenameFile(const std::string& from, const std::string& to) {
  return ::rename(from.c_str(), to.c_str()) == 0 ? 0 : errno;
}

int UnlinkFile(const std::string& path) { return ::unlink(path.c_str()) == 0 ? 0 : errno; }

int MakeDirectories(const std::string& path) {
  std::error_code ec;
  std::filesystem::create_directories(path, ec);
  if (ec) return ec.value();
  return IsDirectory(path) ? 0 : ENOTDIR;
}

bool IsDirectory(const std::string& path) {
  struct stat st {};
  return ::stat(path.c_str(), &st) == 0 && S_ISDIR(st.st_mode);
}

int ListFolder(const std::string& folder, std::vector<std::string>& names) {
  names.clear();
  DIR* dir = ::opendir(folder.c_str());
  if (dir == nullptr) return errno;
  errno = 0;
  while (const dirent* entry = ::readdir(dir)) {
    const std::string name = entry->d_name;
    if (name != "." && name != "..") names.push_back(name);
  }
  const int error = errno;
  ::closedir(dir);
  std::sort(names.begin(), names.end());
  return error;
}

int64_t PathFileSize(const std::string& path) {
  struct stat st {};
  return ::stat(path.c_str(), &st) == 0 ? static_cast<int64_t>(st.st_size) : -1;
}

int TryLockWholeFile(int fd) {
  struct flock fl {};
  fl.l_type = F_WRLCK;
  fl.l_whence = SEEK_SET;
  fl.l_start = 0;
  fl.l_len = 0;  // to the end, however far the file grows
  fl.l_pid = 0;  // required for open-file-description locks
  for (;;) {
    if (::fcntl(fd, F_OFD_SETLK, &fl) == 0) return 0;
    if (errno == EACCES) return EAGAIN;
    if (errno != EINTR) return errno;
  }
}

bool IsSameFile(int fd, const std::string& path) {
  struct stat open_file {};
  struct stat named {};
  return ::fstat(fd, &open_file) == 0 && ::stat(path.c_str(), &named) == 0 &&
         open_file.st_dev == named.st_dev && open_file.st_ino == named.st_ino;
}

}  // namespace qm::platform
