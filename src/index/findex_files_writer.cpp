#include "index/findex_files_writer.h"

#include <algorithm>
#include <atomic>
#include <cmath>
#include <cstring>
#include <limits>
#include <new>
#include <optional>
#include <vector>

#include "base/error_numbers.h"
#include "format/sort_entry.h"
#include "index/sorted_entries.h"
#include "platform/file_io.h"
#include "format/bfile.h"
#include "format/column_set.h"
#include "base/exception_family.h"
#include "config/global_defs.h"
#include "format/mfile.h"
#include "base/trace.h"

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

FindexWriteCounts WriteFiles(CIndexHeader& header, SortedEntries& sorted, const std::string& sdx_path,
                             const std::string& fst_path, const FindexLimits& limits,
                             std::function<void(int32_t rows)> batch_observer) {
  const CColumnSet columns = CColumnSet::FromGeneralFlags(header.GeneralFlags);
  std::optional<CFindexPostingWriter> posting_writer;
  try {
    posting_writer.emplace(columns, limits.max_fst_bytes);
  } catch (const std::bad_alloc&) {
    Trace(true, kErrorTag, "Out of memory 1");
    throw CPiFIndexException::Numbered(kErrOutOfMemory, kMethod, nullptr);
  }
  CFindexPostingWriter& postings = *posting_writer;
  BFile sdx;
  sdx.OpenFile(sdx_path, BFile::kCreate, CFindexTreeWriter::kBlockUnits);
  CFindexTreeWriter tree(sdx, limits.max_block_number);
  postings.Create(fst_path);
  postings.SetBatchObserver(std::move(batch_observer));

  int64_t entries = 0;
  const bool has_entries = !sorted.Empty();
  if (has_entries) {
    if (!IsFindexType(header.FindexType)) {
      throw CPiFIndexException::Text("Unknown findex type %i", kMethod, nullptr, header.FindexType);
    }
    const auto type = static_cast<VALUE_TYPE>(header.FindexType);
    const int32_t width = columns.Width();
    const auto row_bytes = static_cast<std::size_t>(width) * 4;
    // Entries are taken in place; a value is decoded only where its bytes
    // differ from the current word's.
    const SortEntryLayout layout(width, type);
    std::vector<int32_t> row(static_cast<std::size_t>(width));
    auto take_row = [&](const uint8_t* entry) {
      for (int32_t i = 0; i < width; ++i) {
        row[static_cast<std::size_t>(i)] = SortEntryLayout::RowItem(entry, i);
      }
    };
    std::vector<uint8_t> current_bytes;  // the encoded value of current
    auto same_bytes = [&](const uint8_t* value, std::size_t n) {
      return n == current_bytes.size() && std::memcmp(value, current_bytes.data(), n) == 0;
    };
    CValue current(type);
    CValue next(type);
    std::size_t size = 0;
    const uint8_t* entry = sorted.Next(size);
    take_row(entry);
    layout.DecodeValue(entry, current);
    current_bytes.assign(entry + row_bytes, entry + size);
    for (bool more = true; more;) {
      tree.AddWord(current, postings.BeginList());
      // NaN equals nothing, not even its own bytes.
      const bool nan = type == VALUE_TYPE::Double && std::isnan(current.GetDouble());
      for (;;) {
        postings.AddEntry(row.data());
        ++entries;
        entry = sorted.Next(size);
        if (entry == nullptr) {
          more = false;
          break;
        }
        take_row(entry);
        const uint8_t* value = entry + row_bytes;
        if (!nan && same_bytes(value, size - row_bytes)) continue;
        layout.DecodeValue(entry, next);
        const int order = next.Compare(current);
        if (order == -1) {
          throw CPiFIndexException::Text("Sorted entry file out of order at entry %i", kMethod,
                                         nullptr, entries + 1);
        }
        // Values that cannot be ordered (NaN) each stand alone.
        if (order != 0) {
          current_bytes.assign(value, entry + size);
          break;
        }
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
  SortedFileEntries entries(header, sorted);
  return WriteFindexFiles(header, entries, sdx_path, fst_path, limits, std::move(batch_observer));
}

FindexWriteCounts WriteFindexFiles(CIndexHeader& header, SortedEntries& sorted,
                                   const std::string& sdx_path, const std::string& fst_path,
                                   const FindexLimits& limits,
                                   std::function<void(int32_t rows)> batch_observer) {
  try {
    return WriteFiles(header, sorted, sdx_path, fst_path, limits, std::move(batch_observer));
  } catch (const std::bad_alloc&) {
    Trace(true, kErrorTag, "Out of memory 2");
    throw CPiFIndexException::Numbered(kErrOutOfMemory, kMethod, nullptr);
  }
}

}  // namespace qm
