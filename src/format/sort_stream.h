// Streams of sort entries over MFile in large pieces: the sort moves every
// entry through a file once per pass, and one MFile call per entry costs more
// than comparing it. The reader hands out entries in place in its buffer; the
// writer gathers entries and hands them to the file a piece at a time.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <vector>

#include "format/sort_entry.h"
#include "format/mfile.h"

namespace qm {

class SortFileReader {
 public:
  static constexpr std::size_t kPieceBytes = 64 * 1024;

  explicit SortFileReader(const SortEntryLayout& layout) : layout_(layout) {}

  // Reads file from its start to its end, which must hold whole entries.
  void Start(MFile& file);
  // Reads the bytes [begin, begin + length) of file, whole entries. Several
  // readers may share one file: each seeks to its own place before it reads.
  void Start(MFile& file, int64_t begin, int64_t length);
  // The next entry and its size, valid until the next call; null at the end.
  // A file that ends inside an entry raises the MFile error.
  const uint8_t* Next(std::size_t& size) {
    // Most entries lie whole in the buffer: no call for them.
    const std::size_t held = end_ - begin_;
    if (held >= layout_.FixedSize()) {
      const uint8_t* entry = buffer_.data() + begin_;
      size = layout_.SizeOf(entry);
      if (held >= size && !NegativeLength(entry)) {
        begin_ += size;
        return entry;
      }
    }
    return NextAfterRefill(size);
  }

 private:
  bool NegativeLength(const uint8_t* entry) const {
    return layout_.IsText() &&
           (entry[4 * static_cast<std::size_t>(layout_.RowWidth()) + 1] & 0x80) != 0;
  }
  const uint8_t* NextAfterRefill(std::size_t& size);
  // At least n bytes buffered from begin_; false when the file ends first.
  bool Have(std::size_t n);

  SortEntryLayout layout_;
  MFile* file_ = nullptr;
  std::vector<uint8_t> buffer_;
  std::size_t begin_ = 0;
  std::size_t end_ = 0;
  int64_t next_ = 0;       // where the next read starts in the file
  int64_t remaining_ = 0;  // bytes of the range not yet read
};

class SortFileWriter {
 public:
  static constexpr std::size_t kPieceBytes = 64 * 1024;

  // Entries go to file from its current position.
  void Start(MFile& file);
  void Put(const uint8_t* entry, std::size_t size) {
    if (filled_ + size <= buffer_.size()) {
      std::memcpy(buffer_.data() + filled_, entry, size);
      filled_ += size;
      return;
    }
    PutAfterFinish(entry, size);
  }
  // Hands what is gathered to the file. REQUIRES: before the file is read,
  // rewound or closed.
  void Finish();

 private:
  void PutAfterFinish(const uint8_t* entry, std::size_t size);

  MFile* file_ = nullptr;
  std::vector<uint8_t> buffer_;
  std::size_t filled_ = 0;
};

}  // namespace qm
