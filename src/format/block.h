// CBlock: one fixed-size block of a block file held in memory, with its used
// count, cursor and the two 16-bit link words of its header.
//
// On disk a block starts with the used count (bytes in use, header included)
// as a 32-bit integer; readers take it from the first 16-bit word and the link
// words from the words at offsets 2 and 4. Items follow from offset 6, back to
// back, without type tags: int 4 bytes, short 2 (unsigned), double 8, date 16,
// narrow string 16-bit length + bytes, wide string 16-bit length + UTF-16LE
// units. A leaf row is a value and an int id; a node holds a leading int and
// then pairs of value and int. Rows stand in ascending value order.
//
// Every item write checks that it ends before the block size and every read
// that it ends within the used bytes, so no content can make a block touch
// memory outside its buffer. A failed insert leaves the block as it was.
#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "format/block_value.h"
#include "format/row_key.h"
#include "base/value.h"

namespace qm {

class CStr;
class CWStr;

class CBlock {
 public:
  static constexpr int32_t kUnitBytes = 64;
  static constexpr int32_t kHeaderBytes = 6;
  // Blocks stay below 32,768 bytes, so the used count fits the first word.
  static constexpr int32_t kMaxUnits = 511;

  // Results of the row searches besides an id.
  static constexpr int32_t kNoRows = 1;           // the block holds no rows
  static constexpr int32_t kReachedEnd = -1;      // every row read, none chosen
  static constexpr int32_t kNotFound = -2;        // stopped before the end, none chosen
  static constexpr int32_t kInNextBlock = -3;     // the range starts in the next block
  static constexpr int32_t kInPreviousBlock = -4; // the range ends in the previous block

  // Comparison flags of GetRowStartId.
  static constexpr int32_t kFlagEqual = 1;
  static constexpr int32_t kFlagGreater = 64;
  static constexpr int32_t kFlagLess = 128;

  // A new block: used = cursor = 6, the buffer (size + 6 bytes) zero-filled
  // but for the used count. Raises "Could not allocate memory size: %i".
  explicit CBlock(int32_t units);

  int32_t Size() const { return size_; }
  bool IsOpen() const { return open_; }
  // Frees the buffer; every later operation raises until the block is made anew.
  void Release();

  // Empties the block (all bytes zero but the header 6, 0, 0); used = cursor = 6.
  void Reset();
  // i >= 0: cursor at the i-th int after the header (6 + 4i); -1: cursor at 0.
  void SetPosition(int32_t i);
  bool AtEnd() const { return cursor_ >= used_; }

  int32_t GetUsed() const { return used_; }
  void SetUsed(int32_t used) { used_ = used; }
  int32_t GetCursor() const { return cursor_; }
  void SetCursor(int32_t cursor) { cursor_ = cursor; }
  uint16_t GetLinkWord1() const { return link1_; }
  uint16_t GetLinkWord2() const { return link2_; }

  // The buffer: Size() + 6 bytes.
  uint8_t* Data() { return buffer_.data(); }
  const uint8_t* Data() const { return buffer_.data(); }

  // Header access for the block file. LoadHeader takes used and the link
  // words from the buffer and puts the cursor at 6; StoreUsed writes used as
  // a 32-bit integer at offset 0.
  void LoadHeader();
  void StoreUsed();
  // Where the block was read from, named in the messages about damage.
  void SetOrigin(int64_t block_number, const std::string& path);
  // "block 5 of /x/Books.sdx", or "a block in memory".
  std::string Describe() const;

  // Raises a general "Block" error naming method, after an always-written
  // trace line "Block not open", when the block has been released.
  void RequireOpen(const char* method) const;

  // --- items at the cursor; each advances it and raises used past it ---
  void InsertInt(int32_t v);
  void InsertShort(uint16_t v);
  void InsertDouble(double v);
  void InsertDate(const DateTimeValue& v);
  void InsertStr(std::string_view text);
  void InsertStrW(std::u16string_view text);
  void InsertValue(const CValue& value);
  // Inserts the key's value (a node separator; the caller adds the child).
  void InsertRow(const CValue& key);
  void InsertRow(const CRowKey& key) { InsertRow(key.Value); }
  // Sorted insert of a leaf row (value, id): in front of the first row whose
  // value is not smaller, so a new row goes before rows of equal value. The
  // cursor ends at 6.
  void InsertRowLeaf(const CValue& key, int32_t id);
  void InsertRowLeaf(const CRowKey& key, int32_t id) { InsertRowLeaf(key.Value, id); }

  int32_t ReadInt();
  uint16_t ReadShort();
  double ReadDouble();
  DateTimeValue ReadDate();
  // Into a buffer of capacity m, terminated: requires 0 <= n < m and the
  // text within the block, else "String length error". Returns n.
  std::size_t ReadStr(std::span<char> buffer);
  std::size_t ReadStrW(std::span<char16_t> buffer);
  // "Error reading string" / "Error reading unicode string" for a negative
  // length or a text past the used bytes.
  void ReadStr(std::string& text);
  void ReadStrW(std::u16string& text);
  void ReadStr(CStr& text);
  void ReadStrW(CWStr& text);
  // Reads by the type the value already has; its buffers grow as needed.
  void ReadValue(CValue& value);
  // Reads a value of the type without copying (see BlockValue).
  BlockValue ReadValueView(VALUE_TYPE type);

  // Bytes a value takes in a block: n + 2, 2n + 2, 4, 8 or 16; -1 for a type
  // without an encoding.
  static int64_t ValueBytes(const CValue& value);
  // used + value bytes + 6 < size. Another type writes "Unrecognized type %i"
  // and raises.
  bool IsFreeRowLeaf(const CValue& key);
  bool IsFreeRowNode(const CValue& key);
  bool IsFreeRowLeaf(const CRowKey& key) { return IsFreeRowLeaf(key.Value); }
  bool IsFreeRowNode(const CRowKey& key) { return IsFreeRowNode(key.Value); }

  // --- searches over leaf rows (value, id), rows of the key's type ---
  // The id of the first row not smaller than key that matches (mode 0:
  // CValue::Match and not above upper; mode 1: equal), else by the flags:
  // 64 greater (-3 when none here), 128 less (the last row below key; -4
  // when no row here is), else
  // -1 when every row was read, -2 when not. 1 for a block without rows.
  int32_t GetRowStartId(const CValue& key, const CValue& upper, int32_t match_mode,
                        int32_t flags);
  // The id of the first row greater than key, or of the last row when it
  // equals key; -1 when the last row is smaller. 1 for a block without rows.
  int32_t GetRowStopId(const CValue& key);
  // The id of the first row not smaller than key; -1 when the last is smaller.
  int32_t GetRowStopIdAtOrAfter(const CValue& key);
  // For rows in descending order: the id of the first row not greater than
  // key; -1 when the last is greater.
  int32_t GetRowStopIdDescending(const CValue& key);

 private:
  bool HasRoomForRow(const CValue& key, const char* method);
  // Raises the insert failure: always-written trace line under
  // "SHARELIB_ERROR.Block.<method>" with the message, then a "Block" error.
  [[noreturn]] void InsertFailure(const char* method, std::string_view message) const;
  // The same for a read at byte at; the chained cause names the block.
  [[noreturn]] void ReadFailure(const char* method, std::string_view message, int64_t at) const;
  // True when n bytes fit at pos under the insert rule (pos + n < size).
  bool Fits(int64_t pos, int64_t n) const { return pos >= 0 && pos + n < size_; }
  // The buffer position of an item of n bytes at the cursor when it lies
  // within the used bytes, else -1.
  int64_t Readable(int64_t n) const;
  // Encodes at pos (the caller has checked the room); returns the end.
  int32_t PutValue(int32_t pos, const CValue& value);
  void Advance(int32_t end);
  // Decodes a value at the cursor and moves past it; false (cursor kept)
  // when it does not lie within the used bytes.
  bool TryReadValue(VALUE_TYPE type, BlockValue& out);
  // The stop searches; rule_code picks which rows are read past.
  int32_t StopSearch(const CValue& key, int rule_code);
  // Reads one leaf row for a search; number is 1 for the first row, else 2.
  BlockValue ReadSearchRow(VALUE_TYPE type, const char* method, int number, int32_t& id);
  // Reads the string length and returns the text position, or raises message.
  int64_t TextAtCursor(int64_t unit_bytes, const char* method, std::string_view message,
                       int64_t& n);
  [[noreturn]] void UnrecognizedType(const char* method, const CValue& value) const;

  int32_t size_ = 0;
  bool open_ = false;
  std::vector<uint8_t> buffer_;
  int32_t used_ = 0;
  int32_t cursor_ = 0;
  uint16_t link1_ = 0;
  uint16_t link2_ = 0;
  int64_t origin_block_ = -1;
  std::string origin_path_;
};

}  // namespace qm
