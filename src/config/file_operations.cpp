#include "config/file_operations.h"

#include <cerrno>
#include <new>

#include "base/exception_family.h"
#include "config/retry_pause.h"

namespace qm {

namespace {

constexpr std::chrono::milliseconds kDeletePause{1000};
constexpr int kDropAttempts = 10;
constexpr int kDeleteAttempts = 5;
constexpr std::size_t kReadChunk = 4000;

}  // namespace

void DropFile(const std::string& path) {
  if (!platform::FileExists(path)) return;
  for (int attempt = 1;; ++attempt) {
    const int error = platform::UnlinkFile(path);
    if (error == 0 || error == ENOENT) return;
    if (attempt == kDropAttempts) break;
    PauseBeforeRetry(kDeletePause);
  }
  throw CSTDFUNException::Text("Error deleting file: %S", "DropFile", nullptr, path);
}

void DeleteFile(const std::string& path) {
  for (int attempt = 1;; ++attempt) {
    const int error = platform::UnlinkFile(path);
    if (error == 0) return;
    // Waiting cannot bring back a name that is not there.
    if (error == ENOENT || attempt == kDeleteAttempts) break;
    PauseBeforeRetry(kDeletePause);
  }
  throw CSTDFUNException::Text("Error deleting file %S", "DeleteFile", nullptr, path);
}

platform::FileHandle OpenWindowsFile(const std::string& path, platform::FileAccess access,
                                     platform::FileDisposition disposition, unsigned attributes) {
  platform::FileHandle file = platform::OpenFileAs(path, access, disposition, attributes);
  if (!file.IsOpen()) {
    throw CSTDFUNException::Text(kOpenFailureText, "OpenWindowsFile", nullptr, path);
  }
  return file;
}

std::string loadtext(const std::string& path) {
  return Guard<CSTDFUNException>("loadtext", [&] {
    platform::FileHandle file =
        OpenWindowsFile(path, platform::FileAccess::Read, platform::FileDisposition::OpenExisting);
    std::string text;
    try {
      char chunk[kReadChunk];
      for (;;) {
        const ssize_t n = platform::ReadSome(file.Get(), chunk, sizeof chunk);
        if (n < 0) throw CSTDFUNException::General("loadtext");
        if (n == 0) break;
        text.append(chunk, static_cast<std::size_t>(n));
      }
    } catch (const std::bad_alloc&) {
      throw CSTDFUNException::General("loadtext");
    }
    return text;
  });
}

void WriteTextFile(const std::string& path, std::string_view text) {
  platform::FileHandle file =
      OpenWindowsFile(path, platform::FileAccess::Write, platform::FileDisposition::CreateAlways,
                      platform::kFileAttributeHidden);
  if (!platform::WriteAll(file.Get(), text.data(), text.size())) {
    throw CSTDFUNException::Text("Error writing to file: %S", "WriteTextFile", nullptr, path);
  }
}

}  // namespace qm
