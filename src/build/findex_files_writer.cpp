#include "build/findex_files_writer.h"

#include <algorithm>
#include <atomic>
#include <limits>
#include <new>
#include <optional>
#include <vector>

#include "platform/file_io.h"
#include "shared/bfile.h"
#include "shared/column_set.h"
#include "shared/exception_family.h"
#include "shared/global_defs.h"
#include "shared/mfile.h"
#include "shared/trace.h"

namespace qm {

namespace {

constexpr const char* kMethod = "BuildRowFindex";
constexpr const char* kErrorTag = "PILIB_ERROR.PiFindex.BuildRowFindex";

std::atomic<int32_t> g_max_block_number{CFindexTreeWriter::kMaxBlockNumber};
std::atomic<int64_t> g_max_fst_bytes{CFindexPostingWriter::kMaxFileBytes};

bool IsFindexType(int32_t type) {
  switch (static_cast<VALUE_TYPE>(type)) {
    case VALUE_TYPE::Integer:
    case VALUE_TYPE::AsciiString:
    case VALUE_TYPE::DateTime:
    case VALUE_TYPE::UnicodeString:
    case VALUE_TYPE::Double:
      return true;
  }
  return false;
}

// Pushes a closed file's data to the disk before it is moved into place.
void SyncToDisk(const std::string& path) {
  platform::FileHandle file = platform::OpenFileAs(path, platform::FileAccess::Read,
                                                   platform::FileDisposition::OpenExisting);
  if (!file.IsOpen() || !platform::SyncFileData(file.Get())) {
    throw CPiFIndexException::Text("Error writing to disk: %s", kMethod, nullptr, path);
  }
}

}  // namespace

FindexLimits FindexLimits::Current() {
  FindexLimits limits;
  limits.max_block_number = g_max_block_number.load();
  limits.max_fst_bytes = g_max_fst_bytes.load();
  return limits;
}

void SetFindexLimitsForTesting(const FindexLimits& limits) {
  g_max_block_number.store(std::min(limits.max_block_number, CFindexTreeWriter::kMaxBlockNumber));
  g_max_fst_bytes.store(std::min(limits.max_fst_bytes, CFindexPostingWriter::kMaxFileBytes));
}

namespace {

FindexWriteCounts WriteFiles(CIndexHeader& header, MFile& sorted, const std::string& sdx_path,
                             const std::string& fst_path, const FindexLimits& limits,
                             std::function<void(int32_t rows)> batch_observer) {
  const CColumnSet columns = CColumnSet::FromGeneralFlags(header.GeneralFlags);
  std::optional<CFindexPostingWriter> posting_writer;
  try {
    posting_writer.emplace(columns, limits.max_fst_bytes);
  } catch (const std::bad_alloc&) {
    Trace(true, kErrorTag, "Out of memory 1");
    throw CPiFIndexException::Numbered(11, kMethod, nullptr);
  }
  CFindexPostingWriter& postings = *posting_writer;
  BFile sdx;
  sdx.OpenFile(sdx_path, BFile::kCreate, CFindexTreeWriter::kBlockUnits);
  CFindexTreeWriter tree(sdx, limits.max_block_number);
  postings.Create(fst_path);
  postings.SetBatchObserver(std::move(batch_observer));

  int64_t entries = 0;
  const bool has_entries = !sorted.IsEOF();
  if (has_entries) {
    if (!IsFindexType(header.FindexType)) {
      throw CPiFIndexException::Text("Unknown findex type %i", kMethod, nullptr, header.FindexType);
    }
    const auto type = static_cast<VALUE_TYPE>(header.FindexType);
    std::vector<int32_t> row(static_cast<std::size_t>(columns.Width()));
    CValue current(type);
    CValue next(type);
    sorted.ReadRow(row, current);
    for (bool more = true; more;) {
      tree.AddWord(current, postings.BeginList());
      for (;;) {
        postings.AddEntry(row.data());
        ++entries;
        if (sorted.ReadRow(row, next) != 0) {
          more = false;
          break;
        }
        const int order = next.Compare(current);
        if (order == -1) {
          throw CPiFIndexException::Text("Sorted entry file out of order at entry %i", kMethod,
                                         nullptr, entries + 1);
        }
        // Values that cannot be ordered (NaN) each stand alone.
        if (order != 0) break;
      }
      postings.EndList();
      std::swap(current, next);
    }
  }

  FindexWriteCounts counts;
  counts.blocks = tree.Finish();
  counts.words =
      static_cast<int32_t>(std::min<int64_t>(entries, std::numeric_limits<int32_t>::max()));
  counts.distinct = tree.DistinctWords();
  postings.Close();

  header.BlockNum = counts.blocks;
  header.WordCount = counts.words;
  header.DistinctWordCount = counts.distinct;
  header.BuildState = 1;
  header.Version = CGlobalDefs::kVersion;
  header.VersionText = CGlobalDefs::kVersionText;
  header.WriteInfo(sdx);
  sdx.Close();
  SyncToDisk(sdx_path);
  return counts;
}

}  // namespace

FindexWriteCounts WriteFindexFiles(CIndexHeader& header, MFile& sorted, const std::string& sdx_path,
                                   const std::string& fst_path, const FindexLimits& limits,
                                   std::function<void(int32_t rows)> batch_observer) {
  try {
    return WriteFiles(header, sorted, sdx_path, fst_path, limits, std::move(batch_observer));
  } catch (const std::bad_alloc&) {
    Trace(true, kErrorTag, "Out of memory 2");
    throw CPiFIndexException::Numbered(11, kMethod, nullptr);
  }
}

}  // namespace qm
