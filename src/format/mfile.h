// MFile: a buffered sequential file with typed reads and writes. Its encodings
// (little-endian, no padding, no type tags) are the byte layout of the sort
// runs, row files and option files written through it.
//
// The 5,000-byte buffer serves either reading or writing. While writing it
// gathers small writes; a write that would overflow it commits it first, and
// a write larger than the buffer goes straight through. Only bytes written
// since the last commit are ever committed; switching between reading and
// writing, and seeking, keep the logical file position.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <string_view>

#include "platform/file_io.h"
#include "base/value.h"

namespace qm {

class CStr;
class CWStr;

class MFile {
 public:
  static constexpr std::size_t kBufferSize = 5000;
  // The largest string length the 16-bit length field holds.
  static constexpr std::size_t kMaxStringLength = 32767;

  // 1: create or truncate, read and write; 2: open or create, read and write;
  // 3: open an existing file for reading.
  enum Mode : int32_t { kCreate = 1, kOpenOrCreate = 2, kReadOnly = 3 };

  MFile() = default;
  ~MFile();
  MFile(const MFile&) = delete;
  MFile& operator=(const MFile&) = delete;

  // Any other mode raises "Error opening file %s"; the open itself raises the
  // message of OpenWindowsFile.
  void OpenFile(const std::string& path, int32_t mode,
                unsigned attributes = platform::kFileAttributeNormal);
  // Does not commit: writers call MCommit first.
  void Close();
  bool IsOpen() const { return handle_.IsOpen(); }
  const std::string& Path() const { return path_; }
  int32_t GetMode() const { return mode_; }

  // --- raw buffered access ---
  void mwrite(const void* data, std::size_t n);
  void MCommit();
  // Copies n bytes and returns n; returns 0 when nothing is left at the start;
  // raises "EOF error reading from disk" when the file ends part way.
  std::size_t mread(void* data, std::size_t n);
  // One platform read into the buffer. Returns false at the end of the file
  // when eof_allowed, else raises "EOF error reading from disk".
  bool mrefill(bool eof_allowed);
  bool IsEOF();

  // --- typed reads ---
  uint8_t ReadByte();
  int16_t ReadShort();
  int32_t ReadInt();
  double ReadDouble();
  DateTimeValue ReadDate();
  void ReadStr(std::string& out, std::size_t n);        // n bytes
  void ReadStrW(std::u16string& out, std::size_t n);    // n characters
  void ReadData(void* out, std::size_t n);
  void ReadStr(CWStr& out);                             // short length, characters
  // Reads by the type value already has.
  void ReadValue(CValue& value);
  // An item row of row.size() integers, then a value. Returns 1 at the end of
  // the file (nothing read), else 0.
  int ReadRow(std::span<int32_t> row, CValue& value);

  // --- typed writes ---
  void WriteByte(uint8_t v);
  void WriteShort(int16_t v);
  void WriteInt(int32_t v);
  void WriteDouble(double v);
  void WriteDate(const DateTimeValue& v);
  void WriteStr(std::string_view text);                 // bytes, no length
  void WriteStrW(std::u16string_view text);             // UTF-16LE, no length
  void WriteData(const void* data, std::size_t n);
  void WriteVoid(const void* data, std::size_t n);
  void WriteStr(const CWStr& text);                     // short length, characters
  void WriteValue(const CValue& value);
  void WriteItemRow(std::span<const int32_t> row);

  // --- position ---
  // The size on disk; with commit, after committing pending writes.
  int64_t FileSize(bool commit = true);
  void Seek(int64_t position);
  void SeekToEnd();
  // Commits pending writes, cuts the file to size bytes and positions there:
  // a file rewound for writing keeps no bytes of its earlier content.
  void Truncate(int64_t size);

  // Moves other's open file (handle, path, mode and logical position) into
  // this one with a fresh buffer; other is left closed.
  void TakeOver(MFile& other);

  // --- text lines ---
  // Reads up to delimiter (not preceded by a backslash), unscrambling each
  // byte with the connection-text substitution. False at the end of the file
  // with nothing read.
  bool ReadScrambledLine(CStr& line, char delimiter = '\n');
  // The next "key value" line: empty, blank-only and "#" lines are skipped;
  // the key is the first word (a backslash escapes a blank; backslashes are
  // removed), the value the rest, trimmed. False at the end of the file.
  bool ReadKeyValueLine(CStr& key, CStr& value);

 private:
  void ReadExactly(void* out, std::size_t n, const char* method);
  void WriteLength(std::size_t n, const char* method);
  // Drops unread bytes of the read buffer, moving the platform position back
  // to the logical one.
  void DiscardReadBuffer();
  void RequireOpen(const char* method) const;

  platform::FileHandle handle_;
  std::unique_ptr<uint8_t[]> buffer_;
  std::size_t valid_ = 0;     // bytes read into the buffer
  std::size_t position_ = 0;  // read position, or fill level while dirty
  bool dirty_ = false;        // the buffer holds bytes not yet written
  bool sync_on_close_ = false;
  int32_t mode_ = 0;
  std::string path_;
};

}  // namespace qm
