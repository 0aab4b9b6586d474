// CFindexPostingWriter: the posting file (.fst) of a findex being built.
//
// Each distinct value has one list: a count row (an item row whose column 0
// holds the number of postings + 1, the other columns 0) followed by its
// postings, item rows of the findex's column set, back to back. The count row
// is written as a placeholder when the list starts and patched in place when
// it ends, so the file is written once, front to back. Postings are gathered
// and written in batches of at most kBatchRows rows.
//
// Without a position column, entries of one key that follow each other are
// one posting, their scores added (saturating at the int32 range).
// Leaf rows and readers hold positions in this file as signed 32-bit
// integers: a list that would make the file pass max_file_bytes raises before
// any byte past the limit is written.
#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "format/column_set.h"
#include "config/win_file.h"

namespace qm {

class CFindexPostingWriter {
 public:
  static constexpr int32_t kBatchRows = 8193;
  static constexpr int64_t kMaxFileBytes = 2147483647;

  // REQUIRES: 0 < max_file_bytes <= kMaxFileBytes.
  CFindexPostingWriter(const CColumnSet& columns, int64_t max_file_bytes);
  CFindexPostingWriter(const CFindexPostingWriter&) = delete;
  CFindexPostingWriter& operator=(const CFindexPostingWriter&) = delete;

  // Creates (or truncates) the file.
  void Create(const std::string& path);

  // Starts the next value's list and returns its position: the byte offset
  // of its count row.
  int32_t BeginList();
  // One entry of the value: a row of the column set's width.
  void AddEntry(const int32_t* row);
  // Writes what is gathered, patches the count row; returns the postings.
  int32_t EndList();

  // Writes what is pending, pushes the file to the disk and closes it.
  void Close();
  // Bytes written so far (pending bytes included).
  int64_t Size() const { return end_; }

  // Tests: called with the rows of every batch written.
  void SetBatchObserver(std::function<void(int32_t rows)> observer) {
    batch_observer_ = std::move(observer);
  }

 private:
  void TakePending();
  void WriteBatch();
  // Appends bytes at the end of the file, through the output buffer.
  void Append(const uint8_t* data, std::size_t n, bool count_row);
  void Patch(int64_t position, const uint8_t* data, std::size_t n);
  void FlushOutput();
  [[noreturn]] void TooLarge() const;

  CColumnSet columns_;
  int32_t width_;
  int64_t max_file_bytes_;
  WinFile file_;
  std::string path_;

  std::vector<uint8_t> output_;  // bytes after flushed_, not yet written
  int64_t flushed_ = 0;          // bytes on disk
  int64_t end_ = 0;              // flushed_ + output_.size()

  bool list_open_ = false;
  int64_t list_position_ = 0;
  int64_t postings_ = 0;
  std::vector<int32_t> pending_;  // the posting still open to later entries
  bool has_pending_ = false;
  std::vector<int32_t> batch_;  // whole postings, up to kBatchRows rows
  int32_t batch_rows_ = 0;
  std::vector<uint8_t> encoded_;  // a batch in the file's byte order
  std::vector<uint8_t> count_row_;
  std::function<void(int32_t)> batch_observer_;
};

}  // namespace qm
