// CBlock: one fixed-size block of a block file held in memory, with its used
// count, cursor and the two 16-bit link words of its header.
//
// On disk a block starts with the used count (bytes in use, header included)
// as a 32-bit integer; readers take it from the first 16-bit word and the link
// words from the words at offsets 2 and 4. Items follow from offset 6.
#pragma once

#include <cstdint>
#include <vector>

namespace qm {

class CBlock {
 public:
  static constexpr int32_t kUnitBytes = 64;
  static constexpr int32_t kHeaderBytes = 6;
  // Blocks stay below 32,768 bytes, so the used count fits the first word.
  static constexpr int32_t kMaxUnits = 511;

  // A new block: used = cursor = 6, the buffer (size + 6 bytes) zero-filled
  // but for the used count. Raises "Could not allocate memory size: %i".
  explicit CBlock(int32_t units);

  int32_t Size() const { return size_; }
  bool IsOpen() const { return open_; }
  // Frees the buffer; every later operation raises until the block is made anew.
  void Release();

  // Empties the block: header 6, 0, 0; used = cursor = 6.
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

  // Raises a general "Block" error naming method, after an always-written
  // trace line "Block not open", when the block has been released.
  void RequireOpen(const char* method) const;

 private:
  int32_t size_ = 0;
  bool open_ = false;
  std::vector<uint8_t> buffer_;
  int32_t used_ = 0;
  int32_t cursor_ = 0;
  uint16_t link1_ = 0;
  uint16_t link2_ = 0;
};

}  // namespace qm
