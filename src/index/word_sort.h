// CPiSort: the first half of a findex build. Reads the rows of a definition's
// SELECT, turns every column value into index entries and sorts them on disk.
//
// Contract between the word sort and the findex writer: an entry of the
// sorted file is an item row (key; weight with score support; position with
// phrase support: the CColumnSet of the definition's general flags) followed
// by the value in the findex type's MFile encoding (text: 16-bit length then
// UTF-8 bytes for an ANSI findex or UTF-16 units for a Unicode one; integer 4
// bytes; double 8; date/time 16). Entries come by value, then key, stably.
#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <vector>

#include "config/global_defs.h"
#include "format/index_header.h"
#include "format/mfile.h"
#include "index/entry_sorting_thread.h"
#include "index/sorted_entries.h"

namespace qm {

class CShareDatabase;

class CPiSort {
 public:
  explicit CPiSort(CGlobalDefs& defs);

  // What a selection without rows means: error 47 for a build that must
  // index something (CREATE, rebuilds), nothing new for an update.
  enum class NoRows { Raise, Allow };

  // What the last SortFindexTable measured, in seconds: the row loop (with
  // runs sorted beside it), the sorting thread's time on runs, and the wait
  // for the merge after the row loop (with SortFindexRows: from the end of
  // the row loop to the last merged entry taken).
  struct Phases {
    double row_loop = 0;
    double runs = 0;
    double merge = 0;
    int64_t run_count = 0;
  };

  // Selects, writes and sorts; returns the rows read. The rows are read on
  // the calling thread while a second thread sorts them into runs. On return
  // sorted is open for reading at its start (a delete-on-close temporary
  // file) and definition holds what the rows gave: FindexType, SortMax,
  // KeyCount (rows read), MaxDateTimeKey, BuildTime and LastUpdateTime.
  // Progress goes to the settings: 5 before the row loop, towards 15 by rows
  // read when the driver tells the row count, 15 after the loop, towards 90
  // by entries merged. No row raises error 47, or with NoRows::Allow returns
  // 0 with sorted not opened. Text columns are read whole up to
  // "max_column_text_mb" (MORVIL_MAX_COLUMN_TEXT_MB, default 64); a longer
  // value is cut, traced and counted in CutValues.
  int64_t SortFindexTable(CIndexHeader& definition, MFile& sorted, NoRows no_rows = NoRows::Raise);
  // The same, but no sorted file is written: the final merge goes on on the
  // sorting thread while the caller takes its entries from Merged(), so the
  // findex writer works beside it. Progress reaches 90 when the last entry
  // is merged.
  int64_t SortFindexRows(CIndexHeader& definition, NoRows no_rows = NoRows::Raise);
  // After SortFindexRows found rows: its entries in order, valid while this
  // object lives. Raises the sorting thread's error (as SortFindexTable
  // would) when the merge fails.
  SortedEntries& Merged();
  // Whether the error Merged() last raised was the sort's.
  bool MergeFailed() const { return merge_failed_; }

  // Text values the last SortFindexTable cut at the column text limit.
  int64_t CutValues() const { return cut_values_; }
  // Text values cut by every findex build of this process so far, for the
  // host's summary of a build (foreground or background).
  static int64_t CutValuesInProcess();
  const Phases& LastPhases() const { return phases_; }

  // The column text limit in bytes.
  static std::size_t ConfiguredColumnTextBytes();

  // Tests only: sort with the earlier two-way merge sort, to compare files.
  void SetSortMethodForTesting(EntrySortingThread::Method method) { method_ = method; }

 private:
  // Runs the selection's statements in order, each only when the one before
  // it failed; records the build and update times.
  void ExecuteSelect(CShareDatabase& database, CIndexHeader& definition);
  // Decides the findex type from the executed selection's columns, starts
  // the sorting thread on sorted, then runs the row loop: every row into
  // entries for it. Returns the rows read; sorting holds the thread.
  int64_t WriteFindexRows(CShareDatabase& database, CIndexHeader& definition, MFile* sorted);
  // SortFindexTable into sorted, or SortFindexRows without it.
  int64_t Sort(CIndexHeader& definition, MFile* sorted, NoRows no_rows);
  // The next block of merged entries, for Merged().
  bool PopMerged(std::vector<uint8_t>& block);

  CGlobalDefs& defs_;
  EntrySortingThread::Method method_ = EntrySortingThread::Method::Runs;
  int64_t cut_values_ = 0;
  Phases phases_;
  std::optional<EntrySortingThread> sorting_;
  std::optional<SortedBlockEntries> merged_;
  std::chrono::steady_clock::time_point merge_start_;
  bool merge_failed_ = false;
};

}  // namespace qm
