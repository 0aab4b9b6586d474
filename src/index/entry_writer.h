// EntryWriter: the encoder of a findex build's sort entries. It keeps the
// item row of the current row and column (key; weight with score support;
// position with phrase support) and appends one value after it for each
// entry it hands to the sorting thread's queue.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>
#include <vector>

#include "base/byte_layout.h"
#include "format/column_set.h"
#include "format/sort_entry.h"
#include "index/entry_block_queue.h"

namespace qm {

// The row is kept encoded, so a word of an ANSI findex (the usual entry) is
// one copy into a fixed buffer.
class EntryWriter {
 public:
  // queue and layout must outlive the writer.
  EntryWriter(EntryBlockQueue& queue, const SortEntryLayout& layout, const CColumnSet& set)
      : queue_(queue), layout_(layout), row_(static_cast<std::size_t>(set.Width()), 0),
        score_column_(set.s != 0 ? set.ScoreColumn() : -1),
        position_column_(set.p != 0 ? set.PositionColumn() : -1),
        row_bytes_(4 * row_.size()),
        narrow_(layout.Type() == VALUE_TYPE::AsciiString),
        encoded_(row_bytes_ + 2 + kShortWordUnits, 0) {}

  void SetKey(int32_t key) { SetItem(0, key); }
  void SetWeight(int32_t weight) { SetItem(score_column_, weight); }
  void SetPosition(int32_t position) { SetItem(position_column_, position); }

  template <class Append>
  void Write(Append&& append_value) {
    entry_.clear();
    SortEntryLayout::AppendRow(entry_, row_);
    append_value(entry_);
    queue_.Put(entry_.data(), entry_.size());
    ++entries_;
  }
  void WriteText(std::u16string_view word) {
    if (narrow_ && word.size() <= kShortWordUnits) {
      uint8_t* text = encoded_.data() + row_bytes_ + 2;
      char16_t seen = 0;
      for (std::size_t i = 0; i < word.size(); ++i) {
        seen |= word[i];
        text[i] = static_cast<uint8_t>(word[i]);
      }
      if (seen < 0x80) {
        bytes::StoreU16(encoded_.data() + row_bytes_, static_cast<uint16_t>(word.size()));
        queue_.Put(encoded_.data(), row_bytes_ + 2 + word.size());
        ++entries_;
        return;
      }
    }
    Write([&](std::vector<uint8_t>& out) { layout_.AppendText(out, word); });
  }

  int64_t Entries() const { return entries_; }

 private:
  // Words are at most this long (next_word.h); longer text takes the general way.
  static constexpr std::size_t kShortWordUnits = 256;

  void SetItem(int32_t column, int32_t value) {
    if (column < 0) return;
    row_[static_cast<std::size_t>(column)] = value;
    bytes::StoreI32(encoded_.data() + 4 * static_cast<std::size_t>(column), value);
  }

  EntryBlockQueue& queue_;
  const SortEntryLayout& layout_;
  std::vector<int32_t> row_;
  int32_t score_column_;
  int32_t position_column_;
  std::size_t row_bytes_;
  bool narrow_;
  std::vector<uint8_t> encoded_;  // the row, then a short narrow word
  std::vector<uint8_t> entry_;
  int64_t entries_ = 0;
};

}  // namespace qm
