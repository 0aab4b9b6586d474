#include "index/findex_writer.h"

#include <cerrno>
#include <optional>

#include "base/error_numbers.h"
#include "index/findex_file_set.h"
#include "index/findex_files_writer.h"
#include "index/sorted_entries.h"
#include "index/word_sort.h"
#include "platform/file_io.h"
#include "format/bfile.h"
#include "base/exception_family.h"
#include "config/file_operations.h"
#include "config/temp_file_claim.h"
#include "config/temp_file_sweep.h"
#include "config/temp_names.h"
#include "base/trace.h"

namespace qm {

namespace {

constexpr const char* kTraceTag = "PILIB.PiFIndex.BuildRowFindex";
constexpr int32_t kModeRead = 3;
// Names are taken until one is free; the generator's lock makes them unique
// between builds, so only files left behind by a crash can be in the way.
constexpr int kTempNameAttempts = 100;

template <class Body>
decltype(auto) Guarded(const char* method, Body&& body) {
  return Guard<CPiFIndexException, CPiFIndexUnknownException>(method, std::forward<Body>(body));
}

}  // namespace

struct CPiFIndex::State {
  int32_t mode = 0;  // 0 while closed
  std::string name;
  BFile sdx;  // mode 3
  CIndexHeader header;
  std::string temp_sdx;  // mode 4: the build files until they are moved into place
  std::string temp_fst;
  // Held while the build files exist, so a sweep never takes them for a
  // killed build's.
  TempFileClaim sdx_claim;
  TempFileClaim fst_claim;
};

CPiFIndex::CPiFIndex(CGlobalDefs& defs) : defs_(defs), state_(std::make_unique<State>()) {}

CPiFIndex::~CPiFIndex() { Close(); }

bool CPiFIndex::IsOpen() const { return state_->mode != 0; }

void CPiFIndex::Open(std::string_view name, int32_t mode) {
  Guarded("Open", [&] {
    findex::CheckFindexName(name, "Open");
    Close();
    if (mode == kModeBuild) {
      const std::string folder = defs_.GetFullDataPath(FolderKind::Indexes);
      for (int attempt = 1;; ++attempt) {
        const std::string base = folder + SLGetTempFileName(defs_, true, kTempCallerFindexFiles);
        std::optional<TempFileClaim> sdx = TempFileClaim::Create(base + ".tmp1");
        if (!sdx && errno != EEXIST) {
          throw CPiFIndexException::Text(kOpenFailureText, "Open", nullptr, base + ".tmp1");
        }
        std::optional<TempFileClaim> fst;
        if (sdx) {
          fst = TempFileClaim::Create(base + ".tmp2");
          if (!fst) {
            const int error = errno;
            platform::UnlinkFile(base + ".tmp1");
            if (error != EEXIST) {
              throw CPiFIndexException::Text(kOpenFailureText, "Open", nullptr, base + ".tmp2");
            }
          }
        }
        if (fst) {
          state_->temp_sdx = base + ".tmp1";
          state_->temp_fst = base + ".tmp2";
          state_->sdx_claim = std::move(*sdx);
          state_->fst_claim = std::move(*fst);
          break;
        }
        if (attempt == kTempNameAttempts) {
          throw CPiFIndexException::Text("No free temporary name in %s", "Open", nullptr, folder);
        }
      }
    } else if (mode == kModeRead) {
      const findex::FilePaths paths = findex::PathsOf(defs_, name);
      CIndexHeader header;
      state_->sdx.OpenFile(paths.sdx, BFile::kReadOnly, CFindexTreeWriter::kBlockUnits);
      try {
        // The postings are read through short-lived handles; they must be there.
        WinFile fst;
        fst.OpenWinFile(paths.fst, platform::FileAccess::Read, platform::kFileAttributeNormal,
                        platform::FileDisposition::OpenExisting);
        header.ReadInfo(state_->sdx);
      } catch (...) {
        state_->sdx.Close();
        throw;
      }
      state_->header = std::move(header);
    } else {
      // Modes 1 and 2 create or truncate: an existing findex is never opened so.
      throw CPiFIndexException::Text(
          "Unknown index mode %i: findexes open for reading (3) or "
          "for a build (4)",
          "Open", nullptr, mode);
    }
    state_->name = std::string(name);
    state_->mode = mode;
  });
}

void CPiFIndex::Close() {
  state_->sdx.Close();
  // Build files still here were not moved into place: a failed build.
  for (std::string* path : {&state_->temp_sdx, &state_->temp_fst}) {
    if (path->empty()) continue;
    try {
      DropFile(*path);
    } catch (const CException& e) {
      Trace(true, "PILIB_ERROR.PiFindex.Close", "Could not delete %s: %s", *path,
            e.GetFullTextUtf8(kLevelGeneral));
    }
    path->clear();
  }
  state_->sdx_claim.Release();
  state_->fst_claim.Release();
  state_->mode = 0;
}

const CIndexHeader& CPiFIndex::Header() const {
  if (state_->mode != kModeRead) throw CPiFIndexException::General("Header");
  return state_->header;
}

void CPiFIndex::BuildRowFindex(CIndexHeader& definition, bool rebuild) {
  Guarded("BuildRowFindex", [&] {
    findex::CheckFindexName(definition.IndexName, "BuildRowFindex");
    findex::RemoveOrphanedTempFiles(defs_);
    // The sort's final merge runs beside the writer; failing, either one
    // stops the other.
    CPiSort sort(defs_);
    int64_t rows = 0;
    const auto sort_failed = [] {
      Trace(true, "PILIB_ERROR.PiFindex.BuildRowFindex", "SortFindexTable failed");
    };
    try {
      // An update that finds no new row is done; a rebuild must index rows.
      rows = sort.SortFindexRows(definition,
                                 rebuild ? CPiSort::NoRows::Raise : CPiSort::NoRows::Allow);
    } catch (...) {
      sort_failed();
      throw;
    }
    if (rows == 0) {
      Trace(defs_.TraceLevel1(), kTraceTag, "No new rows for %s, nothing to update",
            definition.IndexName);
      defs_.SetProgress(100);
      return;
    }
    try {
      BuildFromSorted(definition, sort.Merged(), rebuild);
    } catch (...) {
      if (sort.MergeFailed()) sort_failed();
      throw;
    }
  });
}

void CPiFIndex::BuildFromSorted(CIndexHeader& definition, MFile& sorted, bool rebuild) {
  SortedFileEntries entries(definition, sorted);
  BuildFromSorted(definition, entries, rebuild);
}

void CPiFIndex::BuildFromSorted(CIndexHeader& definition, SortedEntries& sorted, bool rebuild) {
  Guarded("BuildRowFindex", [&] {
    if (!rebuild && sorted.Empty()) {
      // An update that found nothing new keeps the findex as it is.
      Trace(defs_.TraceLevel1(), kTraceTag, "Could not read first row, aborting");
      defs_.SetProgress(100);
      return;
    }
    Open(definition.IndexName, kModeBuild);
    try {
      if (defs_.IsConnectionSet()) {
        definition.ConnectionString = defs_.GetConnectionString();
        definition.DisplayName = defs_.GetDisplayName();
      }
      const FindexWriteCounts counts = WriteFindexFiles(definition, sorted, state_->temp_sdx,
                                                        state_->temp_fst, FindexLimits::Current());
      Trace(defs_.TraceLevel1(), kTraceTag,
            "End Status: BlockNum: %i, WordCount: %i, DistinctWords: %i, IntVersion: %i",
            counts.blocks, counts.words, counts.distinct, CGlobalDefs::kVersion);
      Trace(defs_.TraceLevel1(), kTraceTag, "Renaming index: %s", definition.IndexName);
      findex::MoveIntoPlace(defs_, definition.IndexName, state_->temp_sdx, state_->temp_fst,
                            rebuild);
    } catch (...) {
      Close();
      throw;
    }
    Close();
    defs_.SetProgress(100);
  });
}

void CPiFIndex::DropFindex() {
  Guarded("DropFindex", [&] {
    if (state_->mode == 0) throw CPiFIndexException::General("DropFindex");
    if (findex::IsAddOnName(state_->name))
      throw CPiFIndexException::Numbered(kErrDropAddOn, "DropFindex", nullptr);
    const std::string name = state_->name;
    Close();
    findex::DropFiles(defs_, name);
  });
}

std::vector<std::string> CPiFIndex::DropFindexFiles(std::string_view name) {
  return Guarded("DropFindex", [&] {
    findex::CheckFindexName(name, "DropFindex");
    if (findex::IsAddOnName(name)) throw CPiFIndexException::Numbered(44, "DropFindex", nullptr);
    Close();
    if (findex::ExistingFiles(defs_, name).empty()) {
      // Nothing to drop: the same failure as any use of a missing findex.
      Open(name, kModeRead);
      Close();
    }
    std::vector<std::string> removed = findex::DropFiles(defs_, name);
    for (const std::string& path : removed) {
      Trace(defs_.TraceLevel1(), "PILIB.PiFindex.DropFindex", "Dropped file %s", path);
    }
    for (std::string& path : findex::RemoveOrphanedTempFiles(defs_)) {
      removed.push_back(std::move(path));
    }
    return removed;
  });
}

}  // namespace qm
