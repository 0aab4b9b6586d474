#include "format/sort_stream.h"

#include <algorithm>
#include <cstring>

#include "base/exception_family.h"

namespace qm {

namespace {

[[noreturn]] void EndedInsideEntry() {
  throw CMFileException::Text("EOF error reading from disk", "mread", nullptr);
}

}  // namespace

void SortFileReader::Start(MFile& file) {
  file.Seek(0);  // hands what is buffered for writing to the file first
  Start(file, 0, file.FileSize(false));
}

void SortFileReader::Start(MFile& file, int64_t begin, int64_t length) {
  file_ = &file;
  next_ = begin;
  remaining_ = length;
  begin_ = end_ = 0;
  if (buffer_.empty()) buffer_.resize(kPieceBytes);
}

bool SortFileReader::Have(std::size_t n) {
  if (end_ - begin_ >= n) return true;
  if (begin_ > 0) {
    std::memmove(buffer_.data(), buffer_.data() + begin_, end_ - begin_);
    end_ -= begin_;
    begin_ = 0;
  }
  if (buffer_.size() < n) buffer_.resize(std::max(n, 2 * buffer_.size()));
  const auto want = static_cast<std::size_t>(
      std::min<int64_t>(remaining_, static_cast<int64_t>(buffer_.size() - end_)));
  if (want > 0) {
    file_->Seek(next_);
    file_->mread(buffer_.data() + end_, want);
    next_ += static_cast<int64_t>(want);
    end_ += want;
    remaining_ -= static_cast<int64_t>(want);
  }
  return end_ >= n;
}

const uint8_t* SortFileReader::NextAfterRefill(std::size_t& size) {
  const std::size_t fixed = layout_.FixedSize();
  if (!Have(fixed)) {
    if (end_ == begin_) return nullptr;
    EndedInsideEntry();
  }
  if (NegativeLength(buffer_.data() + begin_)) throw CMFileException::General("ReadValue");
  size = layout_.SizeOf(buffer_.data() + begin_);
  if (!Have(size)) EndedInsideEntry();
  const uint8_t* entry = buffer_.data() + begin_;
  begin_ += size;
  return entry;
}

void SortFileWriter::Start(MFile& file) {
  file_ = &file;
  filled_ = 0;
  if (buffer_.empty()) buffer_.resize(kPieceBytes);
}

void SortFileWriter::PutAfterFinish(const uint8_t* entry, std::size_t size) {
  Finish();
  if (size > buffer_.size()) {
    file_->mwrite(entry, size);
    return;
  }
  std::memcpy(buffer_.data() + filled_, entry, size);
  filled_ += size;
}

void SortFileWriter::Finish() {
  if (filled_ == 0) return;
  // More than MFile's buffer holds: the piece goes straight to the file.
  file_->mwrite(buffer_.data(), filled_);
  filled_ = 0;
}

}  // namespace qm
