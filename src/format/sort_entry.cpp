#include "format/sort_entry.h"

#include <algorithm>
#include <cstring>

#include "platform/text_encoding.h"
#include "base/byte_layout.h"
#include "base/exception_family.h"
#include "format/mfile.h"

namespace qm {

namespace {

constexpr std::size_t kTextLengthBytes = 2;

std::size_t ValueBytes(VALUE_TYPE type) {
  switch (type) {
    case VALUE_TYPE::Integer:
      return 4;
    case VALUE_TYPE::Double:
      return 8;
    case VALUE_TYPE::DateTime:
      return bytes::kDateBytes;
    case VALUE_TYPE::AsciiString:
    case VALUE_TYPE::UnicodeString:
      return kTextLengthBytes;
  }
  return 0;
}

[[noreturn]] void TextTooLong(const char* method) {
  // Text kept as written: callers match on it. Do not correct.
  throw CMFileException::Text("Fatal error writting len to file", method, nullptr);
}

uint8_t* Grow(std::vector<uint8_t>& out, std::size_t n) {
  const std::size_t at = out.size();
  out.resize(at + n);
  return out.data() + at;
}

}  // namespace

SortEntryLayout::SortEntryLayout(int32_t row_width, VALUE_TYPE type)
    : row_width_(row_width),
      type_(type),
      row_bytes_(4 * static_cast<std::size_t>(row_width)),
      fixed_size_(row_bytes_ + ValueBytes(type)),
      text_unit_(type == VALUE_TYPE::AsciiString ? 1 : type == VALUE_TYPE::UnicodeString ? 2 : 0) {}

std::size_t SortEntryLayout::Read(MFile& file, std::vector<uint8_t>& buffer,
                                  std::size_t at) const {
  auto room = [&](std::size_t n) {
    if (buffer.size() < at + n) buffer.resize(std::max(at + n, 2 * buffer.size()));
    return buffer.data() + at;
  };
  if (file.mread(room(fixed_size_), fixed_size_) == 0) return 0;
  if (text_unit_ == 0) return fixed_size_;
  const int16_t length = bytes::LoadI16(buffer.data() + at + row_bytes_);
  if (length < 0) throw CMFileException::General("ReadValue");
  const std::size_t size = fixed_size_ + static_cast<std::size_t>(length) * text_unit_;
  if (size > fixed_size_ && file.mread(room(size) + fixed_size_, size - fixed_size_) == 0) {
    throw CMFileException::Text("EOF error reading from disk", "mread", nullptr);
  }
  return size;
}

void SortEntryLayout::AppendRow(std::vector<uint8_t>& out, std::span<const int32_t> row) {
  uint8_t* p = Grow(out, 4 * row.size());
  for (const int32_t item : row) {
    bytes::StoreI32(p, item);
    p += 4;
  }
}

void SortEntryLayout::AppendText(std::vector<uint8_t>& out, std::u16string_view text) const {
  if (type_ != VALUE_TYPE::UnicodeString) {
    const bool ascii = std::all_of(text.begin(), text.end(), [](char16_t u) { return u < 0x80; });
    if (!ascii) {
      // Kept between calls: converting allocates only while words grow.
      thread_local std::string utf8;
      utf8.clear();
      AppendUtf16AsUtf8(text, utf8);
      AppendText(out, std::string_view(utf8));
      return;
    }
  }
  if (text.size() > kMaxTextLength) TextTooLong("AppendText");
  uint8_t* p = Grow(out, kTextLengthBytes + text.size() * (text_unit_ == 2 ? 2 : 1));
  bytes::StoreU16(p, static_cast<uint16_t>(text.size()));
  p += kTextLengthBytes;
  if (type_ == VALUE_TYPE::UnicodeString) {
    for (const char16_t unit : text) {
      bytes::StoreU16(p, unit);
      p += 2;
    }
  } else {
    for (const char16_t unit : text) *p++ = static_cast<uint8_t>(unit);
  }
}

void SortEntryLayout::AppendText(std::vector<uint8_t>& out, std::string_view utf8) const {
  if (type_ == VALUE_TYPE::UnicodeString) {
    thread_local std::u16string wide;
    wide.clear();
    AppendUtf8AsUtf16(utf8, wide);
    AppendText(out, std::u16string_view(wide));
    return;
  }
  if (utf8.size() > kMaxTextLength) TextTooLong("AppendText");
  uint8_t* p = Grow(out, kTextLengthBytes + utf8.size());
  bytes::StoreU16(p, static_cast<uint16_t>(utf8.size()));
  if (!utf8.empty()) std::memcpy(p + kTextLengthBytes, utf8.data(), utf8.size());
}

void SortEntryLayout::AppendInteger(std::vector<uint8_t>& out, int32_t value) {
  bytes::StoreI32(Grow(out, 4), value);
}

void SortEntryLayout::AppendDouble(std::vector<uint8_t>& out, double value) {
  bytes::StoreDouble(Grow(out, 8), value);
}

void SortEntryLayout::AppendDate(std::vector<uint8_t>& out, const DateTimeValue& value) {
  bytes::StoreDate(Grow(out, bytes::kDateBytes), value);
}

int32_t SortEntryLayout::RowItem(const uint8_t* p, int32_t i) {
  return bytes::LoadI32(p + 4 * static_cast<std::size_t>(i));
}

void SortEntryLayout::DecodeValue(const uint8_t* p, CValue& value) const {
  const uint8_t* v = p + row_bytes_;
  switch (type_) {
    case VALUE_TYPE::AsciiString:
      value.SetText(std::string_view(reinterpret_cast<const char*>(v + kTextLengthBytes),
                                     TextLength(p)));
      return;
    case VALUE_TYPE::UnicodeString: {
      std::u16string text(TextLength(p), u'\0');
      for (std::size_t i = 0; i < text.size(); ++i) {
        text[i] = static_cast<char16_t>(bytes::LoadU16(v + kTextLengthBytes + 2 * i));
      }
      value.SetTextW(text);
      return;
    }
    case VALUE_TYPE::Integer:
      value.SetInteger(bytes::LoadI32(v));
      return;
    case VALUE_TYPE::Double:
      value.SetDouble(bytes::LoadDouble(v));
      return;
    case VALUE_TYPE::DateTime:
      value.SetDateTime(bytes::LoadDate(v));
      return;
  }
}

}  // namespace qm
