#include "index/sorted_entries.h"

#include "base/exception_family.h"
#include "format/column_set.h"

namespace qm {

SortedFileEntries::SortedFileEntries(const CIndexHeader& header, MFile& file)
    : SortedFileEntries(SortEntryLayout(CColumnSet::FromGeneralFlags(header.GeneralFlags).Width(),
                                        static_cast<VALUE_TYPE>(header.FindexType)),
                        file) {}

const uint8_t* SortedBlockEntries::Fetch(std::size_t& size) {
  while (at_ == block_.size()) {
    if (ended_ || !next_block_(block_)) {
      ended_ = true;
      return nullptr;
    }
    at_ = 0;
  }
  const uint8_t* entry = block_.data() + at_;
  // Blocks hold whole entries; one that does not is a broken hand-over.
  if (block_.size() - at_ < layout_.FixedSize() ||
      block_.size() - at_ < (size = layout_.SizeOf(entry))) {
    throw CMFileException::Text("EOF error reading from disk", "mread", nullptr);
  }
  at_ += size;
  return entry;
}

}  // namespace qm
