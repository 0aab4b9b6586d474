// SortedEntries: what the findex writer takes a build's sorted entries from,
// in order: a sorted entry file, or the blocks of a merge still running on
// the sorting thread (entry_sorting_thread.h), so that writing goes on beside
// merging.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <vector>

#include "format/index_header.h"
#include "format/mfile.h"
#include "format/sort_entry.h"
#include "format/sort_stream.h"

namespace qm {

class SortedEntries {
 public:
  virtual ~SortedEntries() = default;

  // The next entry and its size, valid until the next call; null after the
  // last one.
  const uint8_t* Next(std::size_t& size) {
    if (!peeked_) return Fetch(size);
    peeked_ = false;
    size = peeked_size_;
    return peeked_entry_;
  }
  // Whether no entry is left; may wait for the first one.
  bool Empty() {
    if (!peeked_) {
      peeked_entry_ = Fetch(peeked_size_);
      peeked_ = true;
    }
    return peeked_entry_ == nullptr;
  }

 protected:
  virtual const uint8_t* Fetch(std::size_t& size) = 0;

 private:
  bool peeked_ = false;
  const uint8_t* peeked_entry_ = nullptr;
  std::size_t peeked_size_ = 0;
};

// The entries of a sorted file, from its start to its end.
class SortedFileEntries final : public SortedEntries {
 public:
  SortedFileEntries(const SortEntryLayout& layout, MFile& file) : reader_(layout) {
    reader_.Start(file);
  }
  // The entries of a findex's sorted file: the layout of header's column
  // set and findex type.
  SortedFileEntries(const CIndexHeader& header, MFile& file);

 private:
  const uint8_t* Fetch(std::size_t& size) override { return reader_.Next(size); }

  SortFileReader reader_;
};

// Entries in blocks of whole entries, as next_block hands them over (false
// after the last block).
class SortedBlockEntries final : public SortedEntries {
 public:
  SortedBlockEntries(const SortEntryLayout& layout,
                     std::function<bool(std::vector<uint8_t>&)> next_block)
      : layout_(layout), next_block_(std::move(next_block)) {}

 private:
  const uint8_t* Fetch(std::size_t& size) override;

  SortEntryLayout layout_;
  std::function<bool(std::vector<uint8_t>&)> next_block_;
  std::vector<uint8_t> block_;
  std::size_t at_ = 0;
  bool ended_ = false;
};

}  // namespace qm
