#include "format/mfile.h"

#include <cstring>

#include "base/byte_layout.h"
#include "base/connection_scramble.h"
#include "base/cstr.h"
#include "base/cwstr.h"
#include "base/exception_family.h"
#include "config/file_operations.h"

namespace qm {

namespace {

template <class Body>
decltype(auto) Guarded(const char* method, Body&& body) {
  return Guard<CMFileException, CMFileUnknownException>(method, std::forward<Body>(body));
}

std::u16string DecodeUtf16Le(const uint8_t* p, std::size_t n) {
  std::u16string out(n, u'\0');
  for (std::size_t i = 0; i < n; ++i) out[i] = static_cast<char16_t>(bytes::LoadU16(p + 2 * i));
  return out;
}

std::string EncodeUtf16Le(std::u16string_view text) {
  std::string out(text.size() * 2, '\0');
  auto* p = reinterpret_cast<uint8_t*>(out.data());
  for (std::size_t i = 0; i < text.size(); ++i) bytes::StoreU16(p + 2 * i, text[i]);
  return out;
}

}  // namespace

MFile::~MFile() { Close(); }

void MFile::OpenFile(const std::string& path, int32_t mode, unsigned attributes) {
  Guarded("OpenFile", [&] {
    platform::FileAccess access = platform::FileAccess::ReadWrite;
    platform::FileDisposition disposition;
    switch (mode) {
      case kCreate: disposition = platform::FileDisposition::CreateAlways; break;
      case kOpenOrCreate: disposition = platform::FileDisposition::OpenAlways; break;
      case kReadOnly:
        disposition = platform::FileDisposition::OpenExisting;
        access = platform::FileAccess::Read;
        break;
      default:
        throw CMFileException::Text("Error opening file %s", "OpenFile", nullptr, path);
    }
    Close();
    handle_ = OpenWindowsFile(path, access, disposition,
                              attributes | platform::kFileAttributeSequentialScan);
    buffer_ = std::make_unique<uint8_t[]>(kBufferSize);
    valid_ = position_ = 0;
    dirty_ = false;
    // Flushing a file nobody will open again (delete-on-close) buys nothing.
    sync_on_close_ = mode != kReadOnly && (attributes & platform::kFileAttributeDeleteOnClose) == 0;
    mode_ = mode;
    path_ = path;
  });
}

void MFile::Close() {
  if (handle_.IsOpen() && sync_on_close_) platform::SyncFileData(handle_.Get());
  handle_.Close();
  buffer_.reset();
  valid_ = position_ = 0;
  dirty_ = false;
  sync_on_close_ = false;
}

void MFile::RequireOpen(const char* method) const {
  if (!handle_.IsOpen() || !buffer_) throw CMFileException::General(method);
}

// --- raw buffered access ---

void MFile::DiscardReadBuffer() {
  if (dirty_) return;
  const std::size_t unread = valid_ - position_;
  valid_ = position_ = 0;
  if (unread > 0 &&
      platform::SeekFile(handle_.Get(), -static_cast<int64_t>(unread), platform::SeekFrom::Current) < 0) {
    throw CMFileException::General("Seek");
  }
}

void MFile::mwrite(const void* data, std::size_t n) {
  RequireOpen("mwrite");
  if (n == 0) return;
  DiscardReadBuffer();
  if (n > kBufferSize) {
    MCommit();
    if (!platform::WriteAll(handle_.Get(), data, n)) {
      throw CMFileException::Text("OS error writing %i bytes to disk", "mwrite", nullptr,
                                  static_cast<int64_t>(n));
    }
    return;
  }
  if (position_ + n > kBufferSize) MCommit();
  std::memcpy(buffer_.get() + position_, data, n);
  position_ += n;
  dirty_ = true;
}

void MFile::MCommit() {
  RequireOpen("MCommit");
  if (!dirty_) return;  // bytes that were only read are never written back
  const std::size_t n = position_;
  position_ = 0;
  dirty_ = false;
  if (!platform::WriteAll(handle_.Get(), buffer_.get(), n)) {
    throw CMFileException::Text("Error writing to disk", "MCommit", nullptr);
  }
}

bool MFile::mrefill(bool eof_allowed) {
  RequireOpen("mrefill");
  if (dirty_) MCommit();
  const ssize_t r = platform::ReadFull(handle_.Get(), buffer_.get(), kBufferSize);
  if (r < 0) throw CMFileException::Text("OS error reading from disk", "mread", nullptr);
  valid_ = static_cast<std::size_t>(r);
  position_ = 0;
  if (r == 0) {
    if (eof_allowed) return false;
    throw CMFileException::Text("EOF error reading from disk", "mread", nullptr);
  }
  return true;
}

std::size_t MFile::mread(void* data, std::size_t n) {
  RequireOpen("mread");
  if (dirty_) MCommit();
  auto* out = static_cast<uint8_t*>(data);
  std::size_t copied = 0;
  while (copied < n) {
    if (position_ >= valid_ && n - copied >= kBufferSize) {
      // A large read goes straight to the caller: one call instead of one per
      // buffer, and no copy through the buffer.
      const ssize_t r = platform::ReadFull(handle_.Get(), out + copied, n - copied);
      if (r < 0) throw CMFileException::Text("OS error reading from disk", "mread", nullptr);
      valid_ = position_ = 0;
      if (r == 0 && copied == 0) return 0;
      if (static_cast<std::size_t>(r) < n - copied) {
        throw CMFileException::Text("EOF error reading from disk", "mread", nullptr);
      }
      return n;
    }
    if (position_ >= valid_ && !mrefill(copied == 0)) return 0;
    const std::size_t take = std::min(n - copied, valid_ - position_);
    std::memcpy(out + copied, buffer_.get() + position_, take);
    position_ += take;
    copied += take;
  }
  return n;
}

bool MFile::IsEOF() {
  RequireOpen("IsEOF");
  if (dirty_) MCommit();
  if (position_ < valid_) return false;
  return !mrefill(true);
}

// --- typed reads ---

void MFile::ReadExactly(void* out, std::size_t n, const char* method) {
  if (n > 0 && mread(out, n) != n) throw CMFileException::General(method);
}

uint8_t MFile::ReadByte() {
  return Guarded("ReadByte", [&] {
    uint8_t b = 0;
    ReadExactly(&b, 1, "ReadByte");
    return b;
  });
}

int16_t MFile::ReadShort() {
  return Guarded("ReadShort", [&] {
    uint8_t b[2];
    const std::size_t got = mread(b, 2);
    if (got != 2) {
      throw CMFileException::Text("Error reading 2 bytes from file. Read: %i", "ReadShort", nullptr,
                                  static_cast<int64_t>(got));
    }
    return bytes::LoadI16(b);
  });
}

int32_t MFile::ReadInt() {
  return Guarded("ReadInt", [&] {
    uint8_t b[4];
    ReadExactly(b, 4, "ReadInt");
    return bytes::LoadI32(b);
  });
}

double MFile::ReadDouble() {
  return Guarded("ReadDouble", [&] {
    uint8_t b[8];
    ReadExactly(b, 8, "ReadDouble");
    return bytes::LoadDouble(b);
  });
}

DateTimeValue MFile::ReadDate() {
  return Guarded("ReadDate", [&] {
    uint8_t b[bytes::kDateBytes];
    ReadExactly(b, sizeof b, "ReadDate");
    return bytes::LoadDate(b);
  });
}

void MFile::ReadStr(std::string& out, std::size_t n) {
  Guarded("ReadStr", [&] {
    out.resize(n);
    ReadExactly(out.data(), n, "ReadStr");
  });
}

void MFile::ReadStrW(std::u16string& out, std::size_t n) {
  Guarded("ReadStrW", [&] {
    std::string raw(n * 2, '\0');
    ReadExactly(raw.data(), raw.size(), "ReadStrW");
    out = DecodeUtf16Le(reinterpret_cast<const uint8_t*>(raw.data()), n);
  });
}

void MFile::ReadData(void* out, std::size_t n) {
  Guarded("ReadData", [&] { ReadExactly(out, n, "ReadData"); });
}

void MFile::ReadStr(CWStr& out) {
  constexpr const char* kMethod = "ReadStr(CWStr)";
  Guarded(kMethod, [&] {
    uint8_t b[2];
    ReadExactly(b, 2, kMethod);
    const int16_t n = bytes::LoadI16(b);
    if (n < 0) throw CMFileException::General(kMethod);
    std::string raw(static_cast<std::size_t>(n) * 2, '\0');
    ReadExactly(raw.data(), raw.size(), kMethod);
    out.SCopy(DecodeUtf16Le(reinterpret_cast<const uint8_t*>(raw.data()), static_cast<std::size_t>(n)));
  });
}

void MFile::ReadValue(CValue& value) {
  constexpr const char* kMethod = "ReadValue";
  Guarded(kMethod, [&] {
    uint8_t b[bytes::kDateBytes];
    switch (value.GetType()) {
      case VALUE_TYPE::AsciiString:
      case VALUE_TYPE::UnicodeString: {
        ReadExactly(b, 2, kMethod);
        const int16_t n = bytes::LoadI16(b);
        if (n < 0) throw CMFileException::General(kMethod);
        const auto count = static_cast<std::size_t>(n);
        if (value.GetType() == VALUE_TYPE::AsciiString) {
          std::string text(count, '\0');
          ReadExactly(text.data(), count, kMethod);
          value.ReserveNarrow(count + 1);
          value.SetText(text);
        } else {
          std::string raw(count * 2, '\0');
          ReadExactly(raw.data(), raw.size(), kMethod);
          value.ReserveWide(count + 1);
          value.SetTextW(DecodeUtf16Le(reinterpret_cast<const uint8_t*>(raw.data()), count));
        }
        return;
      }
      case VALUE_TYPE::Integer:
        ReadExactly(b, 4, kMethod);
        value.SetInteger(bytes::LoadI32(b));
        return;
      case VALUE_TYPE::Double:
        ReadExactly(b, 8, kMethod);
        value.SetDouble(bytes::LoadDouble(b));
        return;
      case VALUE_TYPE::DateTime:
        ReadExactly(b, bytes::kDateBytes, kMethod);
        value.SetDateTime(bytes::LoadDate(b));
        return;
    }
    throw CMFileException::General(kMethod);
  });
}

int MFile::ReadRow(std::span<int32_t> row, CValue& value) {
  return Guarded("ReadRow", [&] {
    if (IsEOF()) return 1;
    std::string raw(row.size() * 4, '\0');
    ReadExactly(raw.data(), raw.size(), "ReadRow");
    for (std::size_t i = 0; i < row.size(); ++i) {
      row[i] = bytes::LoadI32(reinterpret_cast<const uint8_t*>(raw.data()) + 4 * i);
    }
    ReadValue(value);
    return 0;
  });
}

// --- typed writes ---

void MFile::WriteByte(uint8_t v) {
  Guarded("WriteByte", [&] { mwrite(&v, 1); });
}

void MFile::WriteShort(int16_t v) {
  Guarded("WriteShort", [&] {
    uint8_t b[2];
    bytes::StoreI16(b, v);
    mwrite(b, 2);
  });
}

void MFile::WriteInt(int32_t v) {
  Guarded("WriteInt", [&] {
    uint8_t b[4];
    bytes::StoreI32(b, v);
    mwrite(b, 4);
  });
}

void MFile::WriteDouble(double v) {
  Guarded("WriteDouble", [&] {
    uint8_t b[8];
    bytes::StoreDouble(b, v);
    mwrite(b, 8);
  });
}

void MFile::WriteDate(const DateTimeValue& v) {
  Guarded("WriteDate", [&] {
    uint8_t b[bytes::kDateBytes];
    bytes::StoreDate(b, v);
    mwrite(b, sizeof b);
  });
}

void MFile::WriteStr(std::string_view text) {
  Guarded("WriteStr", [&] { mwrite(text.data(), text.size()); });
}

void MFile::WriteStrW(std::u16string_view text) {
  Guarded("WriteStrW", [&] {
    const std::string raw = EncodeUtf16Le(text);
    mwrite(raw.data(), raw.size());
  });
}

void MFile::WriteData(const void* data, std::size_t n) {
  Guarded("WriteData", [&] { mwrite(data, n); });
}

void MFile::WriteVoid(const void* data, std::size_t n) {
  Guarded("WriteVoid", [&] { mwrite(data, n); });
}

void MFile::WriteLength(std::size_t n, const char* method) {
  if (n > kMaxStringLength) {
    // Text kept as written: callers match on it. Do not correct.
    throw CMFileException::Text("Fatal error writting len to file", method, nullptr);
  }
  uint8_t b[2];
  bytes::StoreI16(b, static_cast<int16_t>(n));
  mwrite(b, 2);
}

void MFile::WriteStr(const CWStr& text) {
  constexpr const char* kMethod = "WriteStr(CWStr)";
  Guarded(kMethod, [&] {
    WriteLength(text.Length(), kMethod);
    const std::string raw = EncodeUtf16Le(text.View());
    mwrite(raw.data(), raw.size());
  });
}

void MFile::WriteValue(const CValue& value) {
  constexpr const char* kMethod = "WriteValue";
  // Each step names what failed, with the cause chained below.
  auto step = [&](const char* text, auto&& body) {
    try {
      body();
    } catch (const CExceptionBase& e) {
      throw CMFileException::Text(text, kMethod, &e);
    }
  };
  auto write_text = [&](std::size_t length, const void* data, std::size_t n) {
    if (length > kMaxStringLength) {
      // Text kept as written: callers match on it. Do not correct.
      throw CMFileException::Text("Fatal error writting len to file", kMethod, nullptr);
    }
    step("Fatal error writting len to file", [&] { WriteLength(length, kMethod); });
    step("Fatal error writting string to file", [&] { mwrite(data, n); });
  };
  Guarded(kMethod, [&] {
    uint8_t b[bytes::kDateBytes];
    switch (value.GetType()) {
      case VALUE_TYPE::AsciiString:
        write_text(value.Narrow().size(), value.Narrow().data(), value.Narrow().size());
        return;
      case VALUE_TYPE::UnicodeString: {
        const std::string raw = EncodeUtf16Le(value.Wide());
        write_text(value.Wide().size(), raw.data(), raw.size());
        return;
      }
      case VALUE_TYPE::Integer:
        bytes::StoreI32(b, value.GetInteger());
        // Text kept as written: callers match on it. Do not correct.
        step("Fatal error writting int to file", [&] { mwrite(b, 4); });
        return;
      case VALUE_TYPE::Double:
        bytes::StoreDouble(b, value.GetDouble());
        step("Fatal error writting double to file", [&] { mwrite(b, 8); });
        return;
      case VALUE_TYPE::DateTime:
        bytes::StoreDate(b, value.GetDateTime());
        step("Fatal error writting date to file", [&] { mwrite(b, bytes::kDateBytes); });
        return;
    }
    throw CMFileException::General(kMethod);
  });
}

void MFile::WriteItemRow(std::span<const int32_t> row) {
  Guarded("WriteItemRow", [&] {
    std::string raw(row.size() * 4, '\0');
    for (std::size_t i = 0; i < row.size(); ++i) {
      bytes::StoreI32(reinterpret_cast<uint8_t*>(raw.data()) + 4 * i, row[i]);
    }
    mwrite(raw.data(), raw.size());
  });
}

// --- position ---

int64_t MFile::FileSize(bool commit) {
  return Guarded("FileSize", [&] {
    RequireOpen("FileSize");
    if (commit) MCommit();
    const int64_t size = platform::FileSize(handle_.Get());
    if (size < 0) throw CMFileException::General("FileSize");
    return size;
  });
}

void MFile::Seek(int64_t position) {
  Guarded("Seek", [&] {
    RequireOpen("Seek");
    MCommit();
    valid_ = position_ = 0;  // the read buffer belongs to the old position
    if (platform::SeekFile(handle_.Get(), position, platform::SeekFrom::Begin) < 0) {
      throw CMFileException::General("Seek");
    }
  });
}

void MFile::SeekToEnd() {
  Guarded("SeekToEnd", [&] {
    RequireOpen("SeekToEnd");
    MCommit();
    valid_ = position_ = 0;
    if (platform::SeekFile(handle_.Get(), 0, platform::SeekFrom::End) < 0) {
      throw CMFileException::General("SeekToEnd");
    }
  });
}

void MFile::Truncate(int64_t size) {
  Guarded("Truncate", [&] {
    RequireOpen("Truncate");
    MCommit();
    valid_ = position_ = 0;
    if (size < 0 || platform::TruncateFile(handle_.Get(), size) != 0 ||
        platform::SeekFile(handle_.Get(), size, platform::SeekFrom::Begin) < 0) {
      throw CMFileException::General("Truncate");
    }
  });
}

void MFile::TakeOver(MFile& other) {
  Guarded("TakeOver", [&] {
    if (&other == this) return;
    other.RequireOpen("TakeOver");
    // Nothing written is lost and nothing read ahead is skipped.
    other.MCommit();
    other.DiscardReadBuffer();
    Close();
    handle_ = std::move(other.handle_);
    path_ = std::move(other.path_);
    mode_ = other.mode_;
    sync_on_close_ = other.sync_on_close_;
    buffer_ = std::make_unique<uint8_t[]>(kBufferSize);
    valid_ = position_ = 0;
    dirty_ = false;
    other.Close();
  });
}

// --- text lines ---

bool MFile::ReadScrambledLine(CStr& line, char delimiter) {
  return Guarded("ReadScrambledLine", [&] {
    line.SCopy("");
    bool any = false;
    char previous = '\0';
    for (;;) {
      uint8_t raw = 0;
      if (mread(&raw, 1) == 0) return any;
      any = true;
      const char c = static_cast<char>(ScrambleConnectionByte(raw));
      if (c == delimiter && previous != '\\') return true;
      line.AddChar(c);
      previous = c;
    }
  });
}

bool MFile::ReadKeyValueLine(CStr& key, CStr& value) {
  return Guarded("ReadKeyValueLine", [&] {
    constexpr std::string_view kBlanks = " \t\r";
    CStr line;
    while (ReadScrambledLine(line)) {
      const std::string_view text = line.View();
      const auto first = text.find_first_not_of(kBlanks);
      if (first == std::string_view::npos || text[first] == '#') continue;
      std::string k;
      std::size_t i = first;
      for (; i < text.size(); ++i) {
        const char c = text[i];
        if (c == '\\') {
          if (i + 1 < text.size()) k.push_back(text[++i]);
          continue;
        }
        if (c == ' ' || c == '\t') break;
        k.push_back(c);
      }
      std::string_view rest = text.substr(i);
      const auto b = rest.find_first_not_of(kBlanks);
      rest = b == std::string_view::npos ? std::string_view() : rest.substr(b);
      rest = rest.substr(0, rest.find_last_not_of(kBlanks) + 1);
      key.SCopy(k);
      value.SCopy(rest);
      return true;
    }
    return false;
  });
}

}  // namespace qm
