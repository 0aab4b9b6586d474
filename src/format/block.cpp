#include "format/block.h"

#include <algorithm>
#include <cstring>
#include <new>
#include <string>

#include "base/byte_layout.h"
#include "base/cstr.h"
#include "base/cwstr.h"
#include "base/exception_family.h"
#include "base/trace.h"

namespace qm {

namespace {

std::string ErrorTag(const char* method) { return std::string("SHARELIB_ERROR.Block.") + method; }

// The insert message of InsertValue for a value's type.
const char* InsertValueMessage(VALUE_TYPE type) {
  switch (type) {
    case VALUE_TYPE::AsciiString: return "Error inserting string value";
    case VALUE_TYPE::UnicodeString: return "Error inserting unicode string value";
    case VALUE_TYPE::Integer: return "Error inserting int value";
    case VALUE_TYPE::Double: return "Error inserting double value";
    case VALUE_TYPE::DateTime: return "Error inserting date value";
  }
  return "Error inserting value";
}

const char* ReadValueMessage(VALUE_TYPE type) {
  switch (type) {
    case VALUE_TYPE::AsciiString: return "Error reading string";
    case VALUE_TYPE::UnicodeString: return "Error reading unicode string";
    case VALUE_TYPE::Integer: return "Error reading int";
    case VALUE_TYPE::Double: return "Error reading double";
    case VALUE_TYPE::DateTime: return "Error reading date";
  }
  return "Error reading value";
}

}  // namespace

CBlock::CBlock(int32_t units) {
  const int64_t size = static_cast<int64_t>(units) * kUnitBytes;
  auto failure = [size] {
    // "Blobk" (the method) is kept as written: callers match on it. Do not correct.
    return CBlockException::Text("Could not allocate memory size: %i", "Blobk", nullptr, size + 4);
  };
  if (units < 1 || units > kMaxUnits) throw failure();
  try {
    buffer_.assign(static_cast<std::size_t>(size + kHeaderBytes), 0);
  } catch (const std::bad_alloc&) {
    throw failure();
  }
  size_ = static_cast<int32_t>(size);
  open_ = true;
  used_ = cursor_ = kHeaderBytes;
  bytes::StoreI32(buffer_.data(), kHeaderBytes);
}

void CBlock::Release() {
  std::vector<uint8_t>().swap(buffer_);
  open_ = false;
  origin_block_ = -1;
}

void CBlock::RequireOpen(const char* method) const {
  if (open_) return;
  Trace(true, ErrorTag(method), "Block not open");
  throw CBlockException::General(method);
}

void CBlock::Reset() {
  RequireOpen("Reset");
  std::fill(buffer_.begin(), buffer_.end(), uint8_t{0});
  used_ = cursor_ = 0;
  InsertShort(kHeaderBytes);
  InsertShort(0);
  InsertShort(0);
  link1_ = link2_ = 0;
  origin_block_ = -1;
}

void CBlock::SetPosition(int32_t i) {
  RequireOpen("SetPosition");
  // Far positions stay far (every item there fails) instead of wrapping round.
  cursor_ = i < 0 ? 0 : static_cast<int32_t>(std::min<int64_t>(kHeaderBytes + 4 * int64_t{i}, INT32_MAX));
}

void CBlock::LoadHeader() {
  RequireOpen("LoadHeader");
  used_ = bytes::LoadU16(buffer_.data());
  link1_ = bytes::LoadU16(buffer_.data() + 2);
  link2_ = bytes::LoadU16(buffer_.data() + 4);
  cursor_ = kHeaderBytes;
}

void CBlock::StoreUsed() {
  RequireOpen("StoreUsed");
  bytes::StoreI32(buffer_.data(), used_);
}

void CBlock::SetOrigin(int64_t block_number, const std::string& path) {
  origin_block_ = block_number;
  origin_path_ = path;
}

std::string CBlock::Describe() const {
  if (origin_block_ < 0) return "a block in memory";
  return "block " + std::to_string(origin_block_) + " of " + origin_path_;
}

// --- failures ---

void CBlock::InsertFailure(const char* method, std::string_view message) const {
  Trace(true, ErrorTag(method), "%s", message);
  throw CBlockException::General(method);
}

void CBlock::ReadFailure(const char* method, std::string_view message, int64_t at) const {
  Trace(true, ErrorTag(method), "%s at byte %i of %s, used %i", message, at, Describe(), used_);
  const auto cause = CBlockException::Text("%s at byte %i of %s, used %i", method, nullptr, message,
                                           at, Describe(), used_);
  throw CBlockException::General(method, &cause);
}

void CBlock::UnrecognizedType(const char* method, const CValue& value) const {
  Trace(true, ErrorTag(method), "Unrecognized type %i", static_cast<int32_t>(value.GetType()));
  throw CBlockException::General(method);
}

// --- inserts ---

void CBlock::Advance(int32_t end) {
  cursor_ = end;
  if (cursor_ > used_) used_ = cursor_;
}

int64_t CBlock::ValueBytes(const CValue& value) {
  switch (value.GetType()) {
    case VALUE_TYPE::AsciiString: return static_cast<int64_t>(value.Narrow().size()) + 2;
    case VALUE_TYPE::UnicodeString: return 2 * static_cast<int64_t>(value.Wide().size()) + 2;
    case VALUE_TYPE::Integer: return 4;
    case VALUE_TYPE::Double: return 8;
    case VALUE_TYPE::DateTime: return static_cast<int64_t>(bytes::kDateBytes);
  }
  return -1;
}

int32_t CBlock::PutValue(int32_t pos, const CValue& value) {
  uint8_t* p = buffer_.data() + pos;
  switch (value.GetType()) {
    case VALUE_TYPE::AsciiString: {
      const std::string_view text = value.Narrow();
      bytes::StoreU16(p, static_cast<uint16_t>(text.size()));
      if (!text.empty()) std::memcpy(p + 2, text.data(), text.size());
      return pos + 2 + static_cast<int32_t>(text.size());
    }
    case VALUE_TYPE::UnicodeString: {
      const std::u16string_view text = value.Wide();
      bytes::StoreU16(p, static_cast<uint16_t>(text.size()));
      for (std::size_t i = 0; i < text.size(); ++i) bytes::StoreU16(p + 2 + 2 * i, text[i]);
      return pos + 2 + 2 * static_cast<int32_t>(text.size());
    }
    case VALUE_TYPE::Integer:
      bytes::StoreI32(p, value.GetInteger());
      return pos + 4;
    case VALUE_TYPE::Double:
      bytes::StoreDouble(p, value.GetDouble());
      return pos + 8;
    case VALUE_TYPE::DateTime:
      bytes::StoreDate(p, value.GetDateTime());
      return pos + static_cast<int32_t>(bytes::kDateBytes);
  }
  return pos;
}

void CBlock::InsertInt(int32_t v) {
  RequireOpen("InsertInt");
  if (!Fits(cursor_, 4)) InsertFailure("InsertInt", "Error inserting int");
  bytes::StoreI32(buffer_.data() + cursor_, v);
  Advance(cursor_ + 4);
}

void CBlock::InsertShort(uint16_t v) {
  RequireOpen("InsertShort");
  if (!Fits(cursor_, 2)) InsertFailure("InsertShort", "Error inserting short");
  bytes::StoreU16(buffer_.data() + cursor_, v);
  Advance(cursor_ + 2);
}

void CBlock::InsertDouble(double v) {
  RequireOpen("InsertDouble");
  if (!Fits(cursor_, 8)) InsertFailure("InsertDouble", "Error inserting double");
  bytes::StoreDouble(buffer_.data() + cursor_, v);
  Advance(cursor_ + 8);
}

void CBlock::InsertDate(const DateTimeValue& v) {
  RequireOpen("InsertDate");
  if (!Fits(cursor_, bytes::kDateBytes)) InsertFailure("InsertDate", "Error inserting date");
  bytes::StoreDate(buffer_.data() + cursor_, v);
  Advance(cursor_ + static_cast<int32_t>(bytes::kDateBytes));
}

void CBlock::InsertStr(std::string_view text) {
  RequireOpen("InsertStr");
  if (!Fits(cursor_, 2 + static_cast<int64_t>(text.size()))) {
    InsertFailure("InsertStr", "Error inserting string");
  }
  uint8_t* p = buffer_.data() + cursor_;
  bytes::StoreU16(p, static_cast<uint16_t>(text.size()));
  if (!text.empty()) std::memcpy(p + 2, text.data(), text.size());
  Advance(cursor_ + 2 + static_cast<int32_t>(text.size()));
}

void CBlock::InsertStrW(std::u16string_view text) {
  RequireOpen("InsertStrW");
  if (!Fits(cursor_, 2 + 2 * static_cast<int64_t>(text.size()))) {
    InsertFailure("InsertStrW", "Error inserting unicode string");
  }
  uint8_t* p = buffer_.data() + cursor_;
  bytes::StoreU16(p, static_cast<uint16_t>(text.size()));
  for (std::size_t i = 0; i < text.size(); ++i) bytes::StoreU16(p + 2 + 2 * i, text[i]);
  Advance(cursor_ + 2 + 2 * static_cast<int32_t>(text.size()));
}

void CBlock::InsertValue(const CValue& value) {
  RequireOpen("InsertValue");
  const int64_t n = ValueBytes(value);
  if (n < 0) UnrecognizedType("InsertValue", value);
  if (value.GetType() == VALUE_TYPE::AsciiString) {
    Trace(TraceLevel3.load(std::memory_order_relaxed), "PILIB.(ShareLib)CBlock.InsertValue",
          "Inserting VALUE_TYPE::AsciiString value: %s", value.Narrow());
  }
  if (!Fits(cursor_, n)) InsertFailure("InsertValue", InsertValueMessage(value.GetType()));
  Advance(PutValue(cursor_, value));
}

void CBlock::InsertRow(const CValue& key) {
  RequireOpen("InsertRow");
  const int64_t n = ValueBytes(key);
  if (n < 0) UnrecognizedType("InsertRow", key);
  if (!Fits(cursor_, n)) InsertFailure("InsertRow", "Error inserting row");
  InsertValue(key);
}

void CBlock::InsertRowLeaf(const CValue& key, int32_t id) {
  constexpr const char* kMethod = "InsertRowLeaf";
  RequireOpen(kMethod);
  const int64_t value_bytes = ValueBytes(key);
  if (value_bytes < 0) UnrecognizedType(kMethod, key);
  const int64_t row_bytes = value_bytes + 4;

  if (used_ == kHeaderBytes) {
    // Everything is checked before the first byte changes.
    if (!Fits(cursor_, value_bytes)) InsertFailure("InsertValue", InsertValueMessage(key.GetType()));
    if (!Fits(cursor_ + value_bytes, 4)) InsertFailure("InsertInt", "Error inserting int");
    const int32_t end = PutValue(cursor_, key);
    bytes::StoreI32(buffer_.data() + end, id);
    Advance(end + 4);
    cursor_ = kHeaderBytes;
    return;
  }

  const int32_t saved_cursor = cursor_;
  cursor_ = kHeaderBytes;
  int32_t row_start = cursor_;
  int c = -1;
  do {
    row_start = cursor_;
    int32_t ignored_id = 0;
    try {
      c = ReadSearchRow(key.GetType(), kMethod, row_start == kHeaderBytes ? 1 : 2, ignored_id)
              .Compare(key);
    } catch (...) {
      cursor_ = saved_cursor;
      throw;
    }
  } while (c == -1 && !AtEnd());

  if (c != -1) {
    // In front of the first row that is not smaller: the rows from there on
    // move up by the new row's length.
    if (!Fits(row_start, value_bytes)) {
      cursor_ = saved_cursor;
      InsertFailure(kMethod, "error inserting row (3)");
    }
    if (!Fits(used_, row_bytes)) {
      cursor_ = saved_cursor;
      InsertFailure(kMethod, "Error inserting id (3)");
    }
    uint8_t* start = buffer_.data() + row_start;
    std::memmove(start + row_bytes, start, static_cast<std::size_t>(used_ - row_start));
    const int32_t end = PutValue(row_start, key);
    bytes::StoreI32(buffer_.data() + end, id);
    used_ += static_cast<int32_t>(row_bytes);
  } else {
    const int32_t pos = used_;
    if (!Fits(pos, value_bytes)) {
      cursor_ = saved_cursor;
      InsertFailure(kMethod, "Error inserting row (2)");
    }
    if (!Fits(pos + value_bytes, 4)) {
      cursor_ = saved_cursor;
      InsertFailure(kMethod, "Error inserting id (2)");
    }
    const int32_t end = PutValue(pos, key);
    bytes::StoreI32(buffer_.data() + end, id);
    used_ = end + 4;
  }
  cursor_ = kHeaderBytes;
}

// --- reads ---

int64_t CBlock::Readable(int64_t n) const {
  const int64_t limit = std::min(used_, size_);
  if (cursor_ < 0 || n < 0 || cursor_ + n > limit) return -1;
  return cursor_;
}

int32_t CBlock::ReadInt() {
  RequireOpen("ReadInt");
  const int64_t p = Readable(4);
  if (p < 0) ReadFailure("ReadInt", "Error reading int", cursor_);
  cursor_ += 4;
  return bytes::LoadI32(buffer_.data() + p);
}

uint16_t CBlock::ReadShort() {
  RequireOpen("ReadShort");
  const int64_t p = Readable(2);
  if (p < 0) ReadFailure("ReadShort", "Error reading short", cursor_);
  cursor_ += 2;
  return bytes::LoadU16(buffer_.data() + p);
}

double CBlock::ReadDouble() {
  RequireOpen("ReadDouble");
  const int64_t p = Readable(8);
  if (p < 0) ReadFailure("ReadDouble", "Error reading double", cursor_);
  cursor_ += 8;
  return bytes::LoadDouble(buffer_.data() + p);
}

DateTimeValue CBlock::ReadDate() {
  RequireOpen("ReadDate");
  const int64_t p = Readable(bytes::kDateBytes);
  if (p < 0) ReadFailure("ReadDate", "Error reading date", cursor_);
  cursor_ += static_cast<int32_t>(bytes::kDateBytes);
  return bytes::LoadDate(buffer_.data() + p);
}

int64_t CBlock::TextAtCursor(int64_t unit_bytes, const char* method, std::string_view message,
                             int64_t& n) {
  const int32_t at = cursor_;
  const int64_t p = Readable(2);
  if (p < 0) ReadFailure(method, message, at);
  n = bytes::LoadI16(buffer_.data() + p);
  if (n < 0) ReadFailure(method, message, at);
  cursor_ += 2;
  if (Readable(n * unit_bytes) < 0) {
    cursor_ = at;
    ReadFailure(method, message, at);
  }
  return p + 2;
}

std::size_t CBlock::ReadStr(std::span<char> buffer) {
  RequireOpen("ReadStr");
  const int32_t at = cursor_;
  int64_t n = 0;
  const int64_t p = TextAtCursor(1, "ReadStr", "String length error", n);
  if (p + n >= size_ || static_cast<uint64_t>(n) >= buffer.size()) {
    cursor_ = at;
    ReadFailure("ReadStr", "String length error", at);
  }
  std::memcpy(buffer.data(), buffer_.data() + p, static_cast<std::size_t>(n));
  buffer[static_cast<std::size_t>(n)] = '\0';
  cursor_ = static_cast<int32_t>(p + n);
  return static_cast<std::size_t>(n);
}

std::size_t CBlock::ReadStrW(std::span<char16_t> buffer) {
  RequireOpen("ReadStrW");
  const int32_t at = cursor_;
  int64_t n = 0;
  const int64_t p = TextAtCursor(2, "ReadStrW", "String length error", n);
  if (p + 2 * n >= size_ || static_cast<uint64_t>(n) >= buffer.size()) {
    cursor_ = at;
    ReadFailure("ReadStrW", "String length error", at);
  }
  for (int64_t i = 0; i < n; ++i) {
    buffer[static_cast<std::size_t>(i)] =
        static_cast<char16_t>(bytes::LoadU16(buffer_.data() + p + 2 * i));
  }
  buffer[static_cast<std::size_t>(n)] = u'\0';
  cursor_ = static_cast<int32_t>(p + 2 * n);
  return static_cast<std::size_t>(n);
}

void CBlock::ReadStr(std::string& text) {
  RequireOpen("ReadStr");
  int64_t n = 0;
  const int64_t p = TextAtCursor(1, "ReadStr", "Error reading string", n);
  text.assign(reinterpret_cast<const char*>(buffer_.data() + p), static_cast<std::size_t>(n));
  cursor_ = static_cast<int32_t>(p + n);
}

void CBlock::ReadStrW(std::u16string& text) {
  RequireOpen("ReadStrW");
  int64_t n = 0;
  const int64_t p = TextAtCursor(2, "ReadStrW", "Error reading unicode string", n);
  text.resize(static_cast<std::size_t>(n));
  for (int64_t i = 0; i < n; ++i) {
    text[static_cast<std::size_t>(i)] =
        static_cast<char16_t>(bytes::LoadU16(buffer_.data() + p + 2 * i));
  }
  cursor_ = static_cast<int32_t>(p + 2 * n);
}

void CBlock::ReadStr(CStr& text) {
  std::string s;
  ReadStr(s);
  text.SCopy(s);
}

void CBlock::ReadStrW(CWStr& text) {
  std::u16string s;
  ReadStrW(s);
  text.SCopy(s);
}

bool CBlock::TryReadValue(VALUE_TYPE type, BlockValue& out) {
  out.type = type;
  const uint8_t* base = buffer_.data();
  int64_t n = 0;
  switch (type) {
    case VALUE_TYPE::AsciiString:
    case VALUE_TYPE::UnicodeString: {
      const int64_t p = Readable(2);
      if (p < 0) return false;
      n = bytes::LoadI16(base + p);
      const int64_t unit = type == VALUE_TYPE::AsciiString ? 1 : 2;
      if (n < 0 || p + 2 + n * unit > std::min(used_, size_)) return false;
      if (type == VALUE_TYPE::AsciiString) {
        out.narrow = std::string_view(reinterpret_cast<const char*>(base + p + 2),
                                      static_cast<std::size_t>(n));
      } else {
        out.wide = base + p + 2;
        out.wide_length = static_cast<std::size_t>(n);
      }
      cursor_ = static_cast<int32_t>(p + 2 + n * unit);
      return true;
    }
    case VALUE_TYPE::Integer: {
      const int64_t p = Readable(4);
      if (p < 0) return false;
      out.integer = bytes::LoadI32(base + p);
      cursor_ += 4;
      return true;
    }
    case VALUE_TYPE::Double: {
      const int64_t p = Readable(8);
      if (p < 0) return false;
      out.real = bytes::LoadDouble(base + p);
      cursor_ += 8;
      return true;
    }
    case VALUE_TYPE::DateTime: {
      const int64_t p = Readable(bytes::kDateBytes);
      if (p < 0) return false;
      out.date = bytes::LoadDate(base + p);
      cursor_ += static_cast<int32_t>(bytes::kDateBytes);
      return true;
    }
  }
  return false;
}

BlockValue CBlock::ReadValueView(VALUE_TYPE type) {
  RequireOpen("ReadValue");
  BlockValue view;
  const int32_t at = cursor_;
  if (!TryReadValue(type, view)) {
    if (ValueBytes(CValue(type)) < 0) UnrecognizedType("ReadValue", CValue(type));
    ReadFailure("ReadValue", ReadValueMessage(type), at);
  }
  return view;
}

void CBlock::ReadValue(CValue& value) { ReadValueView(value.GetType()).CopyTo(value); }

// --- free space ---

// Leaf rows (value, item position) and node rows (value, child block) need
// the same room, so one rule answers for both.
bool CBlock::HasRoomForRow(const CValue& key, const char* method) {
  RequireOpen(method);
  const int64_t n = ValueBytes(key);
  if (n < 0) UnrecognizedType(method, key);
  return used_ + n + 6 < size_;
}

bool CBlock::IsFreeRowLeaf(const CValue& key) { return HasRoomForRow(key, "IsFreeRowLeaf"); }

bool CBlock::IsFreeRowNode(const CValue& key) { return HasRoomForRow(key, "IsFreeRowNode"); }

// --- searches ---

BlockValue CBlock::ReadSearchRow(VALUE_TYPE type, const char* method, int number, int32_t& id) {
  BlockValue row;
  const int32_t at = cursor_;
  if (!TryReadValue(type, row)) {
    if (ValueBytes(CValue(type)) < 0) UnrecognizedType(method, CValue(type));
    ReadFailure(method, number == 1 ? "Error reading row (1)" : "Error reading row (2)", at);
  }
  const int64_t p = Readable(4);
  if (p < 0) ReadFailure(method, number == 1 ? "Error reading id (1)" : "Error reading id (2)", cursor_);
  id = bytes::LoadI32(buffer_.data() + p);
  cursor_ += 4;
  return row;
}

int32_t CBlock::GetRowStartId(const CValue& key, const CValue& upper, int32_t match_mode,
                              int32_t flags) {
  constexpr const char* kMethod = "GetRowStartId";
  RequireOpen(kMethod);
  if (used_ == kHeaderBytes) return kNoRows;
  cursor_ = kHeaderBytes;
  const VALUE_TYPE type = key.GetType();
  int32_t id = 0;
  BlockValue row = ReadSearchRow(type, kMethod, 1, id);
  int c = row.Compare(key);
  bool has_previous = false;
  int32_t previous = 0;
  while (c == -1 && !AtEnd()) {
    previous = id;
    has_previous = true;
    row = ReadSearchRow(type, kMethod, 2, id);
    c = row.Compare(key);
  }
  const bool at_end = AtEnd();
  const bool not_smaller = c != -1;

  if (match_mode == 0) {
    if (not_smaller && row.Match(key) == 1 && row.Compare(upper) != 1) return id;
  } else if (match_mode == 1) {
    if (c == 0) return id;
  }
  if ((flags & kFlagGreater) != 0) {
    if (((flags & kFlagEqual) != 0 && not_smaller) || c == 1) return id;
    return kInNextBlock;
  }
  if ((flags & kFlagLess) != 0) {
    if ((flags & kFlagEqual) != 0 && c == 0) return id;
    // Every row of the block is below the key: the last one is the answer,
    // not the one before it.
    if (c == -1) return id;
    return has_previous ? previous : kInPreviousBlock;
  }
  return at_end ? kReachedEnd : kNotFound;
}

namespace {

// The stop searches differ only in which rows they read past.
enum class StopRule { NotGreater, Smaller, Greater };

bool ReadsPast(StopRule rule, int c) {
  switch (rule) {
    case StopRule::NotGreater: return c != 1;
    case StopRule::Smaller: return c == -1;
    case StopRule::Greater: return c == 1;
  }
  return false;
}

}  // namespace

int32_t CBlock::StopSearch(const CValue& key, int rule_code) {
  constexpr const char* kMethod = "GetRowStopId";
  const auto rule = static_cast<StopRule>(rule_code);
  RequireOpen(kMethod);
  if (used_ == kHeaderBytes) return kNoRows;
  cursor_ = kHeaderBytes;
  const VALUE_TYPE type = key.GetType();
  int32_t id = 0;
  int c = ReadSearchRow(type, kMethod, 1, id).Compare(key);
  while (ReadsPast(rule, c) && !AtEnd()) c = ReadSearchRow(type, kMethod, 2, id).Compare(key);
  const bool rejected = rule == StopRule::Greater ? c == 1 : c == -1;
  return rejected ? kReachedEnd : id;
}

int32_t CBlock::GetRowStopId(const CValue& key) {
  return StopSearch(key, static_cast<int>(StopRule::NotGreater));
}

int32_t CBlock::GetRowStopIdAtOrAfter(const CValue& key) {
  return StopSearch(key, static_cast<int>(StopRule::Smaller));
}

int32_t CBlock::GetRowStopIdDescending(const CValue& key) {
  return StopSearch(key, static_cast<int>(StopRule::Greater));
}

}  // namespace qm
