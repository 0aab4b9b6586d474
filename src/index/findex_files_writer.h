// WriteFindexFiles: the second half of a findex build. Turns the sorted
// entries of the word sort (CPiSort, index/word_sort.h), from a file or from
// its merge as it runs, into the two files of a findex: the word tree with
// its header in block 0, and the posting file.
#pragma once

#include <cstdint>
#include <functional>
#include <string>

#include "format/findex_postings.h"
#include "format/findex_tree.h"
#include "format/index_header.h"

namespace qm {

class MFile;
class SortedEntries;

// What the files of a findex can address: block numbers of 16 bits in the
// leaf chain, positions of 31 bits in the posting file.
struct FindexLimits {
  int32_t max_block_number = CFindexTreeWriter::kMaxBlockNumber;
  int64_t max_fst_bytes = CFindexPostingWriter::kMaxFileBytes;

  // The limits in force: the real ones unless a test lowered them.
  static FindexLimits Current();
};
// Tests: lowers the limits of later builds (values above the real limits
// are cut to them); FindexLimits{} restores them.
void SetFindexLimitsForTesting(const FindexLimits& limits);

struct FindexWriteCounts {
  int32_t blocks = 0;    // blocks of the .sdx, the header included
  int32_t words = 0;     // entries read (saturating)
  int32_t distinct = 0;  // leaf rows: distinct values
};

// Reads the entries of sorted from its start to its end (item
// rows of header's column set, values of header.FindexType, ascending by
// value, then key), writes sdx_path and fst_path (created or truncated) and
// stores the header with BlockNum, WordCount, DistinctWordCount and
// BuildState 1 in block 0. Both files are whole on the disk and closed on
// return; on failure their contents are undefined (the caller removes them).
// An entry file out of order raises rather than write a tree that searches
// would misread.
FindexWriteCounts WriteFindexFiles(CIndexHeader& header, MFile& sorted, const std::string& sdx_path,
                                   const std::string& fst_path, const FindexLimits& limits,
                                   std::function<void(int32_t rows)> batch_observer = {});
// The same from entries handed over in order (a merge still running).
FindexWriteCounts WriteFindexFiles(CIndexHeader& header, SortedEntries& sorted,
                                   const std::string& sdx_path, const std::string& fst_path,
                                   const FindexLimits& limits,
                                   std::function<void(int32_t rows)> batch_observer = {});

}  // namespace qm
