// WinFile: a file handle with the engine's open rule (3 attempts, 500 ms
// apart, none more when the file or its folder is missing) and its messages.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

#include "platform/file_io.h"

namespace qm {

class WinFile {
 public:
  WinFile() = default;
  WinFile(WinFile&&) noexcept = default;
  WinFile& operator=(WinFile&&) noexcept = default;
  WinFile(const WinFile&) = delete;
  WinFile& operator=(const WinFile&) = delete;

  // Creates or truncates; raises "Error creating file: %s".
  void CreateWinFile(const std::string& path, platform::FileAccess access,
                     unsigned attributes = platform::kFileAttributeNormal);
  // Opens (creating a missing file with OpenAlways) under the open rule;
  // raises "Error opening file: %s".
  void OpenWinFile(const std::string& path, platform::FileAccess access,
                   unsigned attributes = platform::kFileAttributeNormal,
                   platform::FileDisposition disposition = platform::FileDisposition::OpenAlways);

  // Reads up to n bytes (fewer only at the end of the file).
  std::size_t Read(void* data, std::size_t n);
  std::size_t Write(const void* data, std::size_t n);
  // Writes in place at an absolute offset; the file position stays.
  void WriteAt(const void* data, std::size_t n, int64_t offset);
  void Seek(int64_t position);
  void SeekToEnd();
  int64_t Position() const;
  int64_t Size() const;
  void Close();

  bool IsOpen() const { return handle_.IsOpen(); }
  int Descriptor() const { return handle_.Get(); }

  // Moves source onto target, replacing it: up to 10 attempts, 1,000 ms
  // apart. A source that is missing or cannot be opened fails at once. Both
  // raise "Error renaming file: %s to %s".
  static void RemoveFile(const std::string& source, const std::string& target);

 private:
  platform::FileHandle handle_;
};

}  // namespace qm
