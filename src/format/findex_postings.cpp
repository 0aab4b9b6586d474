#include "format/findex_postings.h"

#include <algorithm>
#include <cstring>
#include <limits>

#include "platform/file_io.h"
#include "base/byte_layout.h"
#include "base/exception_family.h"
#include "base/trace.h"

namespace qm {

namespace {

constexpr const char* kMethod = "BuildRowFindex";
constexpr const char* kErrorTag = "PILIB_ERROR.PiFindex.BuildRowFindex";
// Small lists are gathered into writes of about this size.
constexpr std::size_t kOutputBytes = 256 * 1024;

int32_t SaturatingAdd(int32_t a, int32_t b) {
  const int64_t sum = static_cast<int64_t>(a) + b;
  return static_cast<int32_t>(std::clamp<int64_t>(sum, std::numeric_limits<int32_t>::min(),
                                                  std::numeric_limits<int32_t>::max()));
}

}  // namespace

CFindexPostingWriter::CFindexPostingWriter(const CColumnSet& columns, int64_t max_file_bytes)
    : columns_(columns),
      width_(columns.Width()),
      max_file_bytes_(std::clamp<int64_t>(max_file_bytes, 0, kMaxFileBytes)) {
  pending_.resize(static_cast<std::size_t>(width_));
  batch_.resize(static_cast<std::size_t>(width_) * kBatchRows);
  encoded_.resize(batch_.size() * 4);
  count_row_.resize(static_cast<std::size_t>(width_) * 4);
  output_.reserve(kOutputBytes);
}

void CFindexPostingWriter::Create(const std::string& path) {
  file_.CreateWinFile(path, platform::FileAccess::ReadWrite,
                      platform::kFileAttributeHidden | platform::kFileAttributeSequentialScan);
  path_ = path;
  output_.clear();
  flushed_ = end_ = 0;
}

void CFindexPostingWriter::TooLarge() const {
  throw CPiFIndexException::Text(
      "Findex too large: its posting file would pass %i bytes, the most that 32-bit positions "
      "address. Split the data into smaller findexes",
      kMethod, nullptr, max_file_bytes_);
}

int32_t CFindexPostingWriter::BeginList() {
  list_position_ = end_;
  postings_ = 0;
  has_pending_ = false;
  batch_rows_ = 0;
  list_open_ = true;
  // The placeholder: the real count goes in when the list ends.
  std::fill(count_row_.begin(), count_row_.end(), 0);
  Append(count_row_.data(), count_row_.size(), true);
  return static_cast<int32_t>(list_position_);
}

void CFindexPostingWriter::AddEntry(const int32_t* row) {
  if (has_pending_ && columns_.p == 0 && pending_[0] == row[0]) {
    if (columns_.s != 0) {
      const auto score = static_cast<std::size_t>(columns_.ScoreColumn());
      pending_[score] = SaturatingAdd(pending_[score], row[score]);
    }
    return;
  }
  TakePending();
  std::copy(row, row + width_, pending_.begin());
  has_pending_ = true;
}

void CFindexPostingWriter::TakePending() {
  if (!has_pending_) return;
  if (batch_rows_ == kBatchRows) WriteBatch();
  std::copy(pending_.begin(), pending_.end(),
            batch_.begin() + static_cast<std::ptrdiff_t>(batch_rows_) * width_);
  ++batch_rows_;
  ++postings_;
  has_pending_ = false;
}

void CFindexPostingWriter::WriteBatch() {
  if (batch_rows_ == 0) return;
  const std::size_t ints = static_cast<std::size_t>(batch_rows_) * width_;
  for (std::size_t i = 0; i < ints; ++i) bytes::StoreI32(encoded_.data() + 4 * i, batch_[i]);
  Append(encoded_.data(), ints * 4, false);
  if (batch_observer_) batch_observer_(batch_rows_);
  batch_rows_ = 0;
}

int32_t CFindexPostingWriter::EndList() {
  if (!list_open_) throw CPiFIndexException::General(kMethod);
  TakePending();
  WriteBatch();
  // Positions are limited to 31 bits, so the count (at most a quarter of
  // that) always fits.
  bytes::StoreI32(count_row_.data(), static_cast<int32_t>(postings_ + 1));
  Patch(list_position_, count_row_.data(), count_row_.size());
  Trace(TraceLevel3.load(std::memory_order_relaxed), "PILIB.PiFIndex.BuildRowFindex",
        "Writing to .fst file");
  list_open_ = false;
  return static_cast<int32_t>(postings_);
}

void CFindexPostingWriter::Append(const uint8_t* data, std::size_t n, bool count_row) {
  if (end_ + static_cast<int64_t>(n) > max_file_bytes_) TooLarge();
  try {
    if (output_.size() + n > kOutputBytes) FlushOutput();
    if (n >= kOutputBytes) {
      file_.Write(data, n);
      flushed_ += static_cast<int64_t>(n);
    } else {
      output_.insert(output_.end(), data, data + n);
    }
  } catch (const CException& e) {
    if (count_row) {
      Trace(true, kErrorTag, "Error writing ItemRow to .fst file. ItemRowSize: %i", n);
    } else {
      Trace(true, kErrorTag, "Error writing void to .fst file. Size: %i", n);
    }
    throw CPiFIndexException::General(kMethod, &e);
  }
  end_ += static_cast<int64_t>(n);
}

void CFindexPostingWriter::Patch(int64_t position, const uint8_t* data, std::size_t n) {
  try {
    // The part already on disk is written in place, the rest in the buffer.
    std::size_t on_disk = 0;
    if (position < flushed_) {
      on_disk = static_cast<std::size_t>(std::min<int64_t>(flushed_ - position, n));
      file_.WriteAt(data, on_disk, position);
    }
    if (on_disk < n) {
      const auto at = static_cast<std::size_t>(position + static_cast<int64_t>(on_disk) - flushed_);
      std::memcpy(output_.data() + at, data + on_disk, n - on_disk);
    }
  } catch (const CException& e) {
    Trace(true, kErrorTag, "Error writing ItemRow to .fst file. ItemRowSize: %i", n);
    throw CPiFIndexException::General(kMethod, &e);
  }
}

void CFindexPostingWriter::FlushOutput() {
  if (output_.empty()) return;
  file_.Write(output_.data(), output_.size());
  flushed_ += static_cast<int64_t>(output_.size());
  output_.clear();
}

void CFindexPostingWriter::Close() {
  if (!file_.IsOpen()) return;
  try {
    FlushOutput();
  } catch (const CException& e) {
    Trace(true, kErrorTag, "Error writing void to .fst file. Size: %i", output_.size());
    throw CPiFIndexException::General(kMethod, &e);
  }
  // The file is moved into place next; it must be whole on the disk first.
  if (!platform::SyncFileData(file_.Descriptor())) {
    throw CPiFIndexException::Text("Error writing to disk: %s", kMethod, nullptr, path_);
  }
  file_.Close();
}

}  // namespace qm
