#include "config/win_file.h"

#include <cerrno>

#include "base/exception_family.h"
#include "config/retry_pause.h"

namespace qm {

namespace {

constexpr int kOpenAttempts = 3;
constexpr std::chrono::milliseconds kOpenPause{500};
constexpr int kRenameAttempts = 10;
constexpr std::chrono::milliseconds kRenamePause{1000};

}  // namespace

void WinFile::CreateWinFile(const std::string& path, platform::FileAccess access,
                            unsigned attributes) {
  Close();
  handle_ = platform::OpenFileAs(path, access, platform::FileDisposition::CreateAlways, attributes);
  if (!handle_.IsOpen()) {
    throw CWinFileException::Text("Error creating file: %s", "CreateWinFile", nullptr, path);
  }
}

void WinFile::OpenWinFile(const std::string& path, platform::FileAccess access,
                          unsigned attributes, platform::FileDisposition disposition) {
  Close();
  for (int attempt = 1;; ++attempt) {
    handle_ = platform::OpenFileAs(path, access, disposition, attributes);
    if (handle_.IsOpen()) return;
    // A missing file or folder will not appear by waiting.
    if (errno == ENOENT || errno == ENOTDIR || attempt == kOpenAttempts) break;
    PauseBeforeRetry(kOpenPause);
  }
  throw CWinFileException::Text("Error opening file: %s", "OpenWinFile", nullptr, path);
}

std::size_t WinFile::Read(void* data, std::size_t n) {
  const ssize_t r = platform::ReadFull(handle_.Get(), data, n);
  if (r < 0) throw CWinFileException::Text("Error reading from file", "ReadFromFile", nullptr);
  return static_cast<std::size_t>(r);
}

std::size_t WinFile::Write(const void* data, std::size_t n) {
  if (!platform::WriteAll(handle_.Get(), data, n)) {
    throw CWinFileException::Text("Error writing to file", "WriteToFile", nullptr);
  }
  return n;
}

void WinFile::WriteAt(const void* data, std::size_t n, int64_t offset) {
  if (!platform::WriteAllAt(handle_.Get(), data, n, offset)) {
    throw CWinFileException::Text("Error writing to file", "WriteToFile", nullptr);
  }
}

void WinFile::Seek(int64_t position) {
  if (platform::SeekFile(handle_.Get(), position, platform::SeekFrom::Begin) < 0) {
    throw CWinFileException::General("Seek");
  }
}

void WinFile::SeekToEnd() {
  if (platform::SeekFile(handle_.Get(), 0, platform::SeekFrom::End) < 0) {
    throw CWinFileException::General("SeekToEnd");
  }
}

int64_t WinFile::Position() const {
  const int64_t position = platform::SeekFile(handle_.Get(), 0, platform::SeekFrom::Current);
  if (position < 0) throw CWinFileException::General("Position");
  return position;
}

int64_t WinFile::Size() const {
  const int64_t size = platform::FileSize(handle_.Get());
  if (size < 0) throw CWinFileException::General("Size");
  return size;
}

void WinFile::Close() { handle_.Close(); }

void WinFile::RemoveFile(const std::string& source, const std::string& target) {
  auto failure = [&] {
    return CWinFileException::Text("Error renaming file: %s to %s", "RemoveFile", nullptr, source,
                                   target);
  };
  if (!platform::OpenFileAs(source, platform::FileAccess::Read,
                            platform::FileDisposition::OpenExisting)
           .IsOpen()) {
    throw failure();
  }
  for (int attempt = 1;; ++attempt) {
    if (platform::RenameFile(source, target) == 0) return;
    if (attempt == kRenameAttempts) break;
    PauseBeforeRetry(kRenamePause);
  }
  throw failure();
}

}  // namespace qm
