// CTwoWayMergeSort: the earlier external sort of a raw entry file, kept as the
// reference the memory-bounded sort (entry_sort.h) is checked against: both
// must write the same sorted file byte for byte. Builds use CEntrySort; only
// CPiSort's comparison switch for tests selects this one.
//
// Level one cuts the raw file into runs of 8,192 entries, each sorted in
// memory by a stable bottom-up merge sort and written alternately to two run
// files. Level two merges runs of length L (8,192 first) pairwise from two
// input files into two output files, alternately, doubling L and swapping
// inputs and outputs after each pass, until a pass writes at most one run.
// The merge takes from the first input on ties, so the whole sort is stable:
// entries with equal value and key keep their raw-file order.
//
// The four run files are delete-on-close temporary files of the group's work
// folder: whatever happens, closing them removes them.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "format/sort_entry.h"
#include "format/mfile.h"

namespace qm {

class CGlobalDefs;
class SortFileWriter;

class CTwoWayMergeSort {
 public:
  // Entries held in memory at a time, and the first merge run length.
  static constexpr std::size_t kArrayEntries = 8192;
  // "Words Sorted" is traced each time this many more entries were sorted.
  static constexpr int64_t kSortedTraceStep = 100000;

  // Which engine module reports the sort's failures (error 11 when the sort
  // arrays cannot be allocated) and tags its traces.
  enum class Module { PiSort, PiOrderSort };

  CTwoWayMergeSort(CGlobalDefs& defs, SortEntryLayout layout, Module module);

  // Sorts raw (written from its start, any position) into sorted, which is
  // left open for reading at its start; raw is closed. Progress: 20 after
  // level one, then 20 + (70 div n) x n after each pass that wrote n runs.
  void Sort(MFile& raw, MFile& sorted);

  // What the last Sort did.
  int64_t EntriesSorted() const { return sorted_entries_; }
  int64_t LevelOneRuns() const { return level_one_runs_; }
  int32_t MergePasses() const { return passes_; }

 private:
  // The two sort arrays; error 11 when they cannot be had.
  void AllocateRowArrays();
  void FreeRowArrays();
  void SortArray();
  void WriteRun(SortFileWriter& out);
  // Writes the runs alternately to runs[0] and runs[1].
  void LevelOne(MFile& raw, MFile* runs);
  // One merge pass; returns the number of runs written.
  // in and out point to two files each.
  int64_t MergePass(MFile* in, MFile* out, int64_t run_length);
  // The passes of level two over the two level-one files, into sorted.
  void MergeLevelTwo(MFile* level_one, MFile& sorted);
  [[noreturn]] void RaiseAllocationFailure();
  const char* TraceTag() const;

  CGlobalDefs& defs_;
  SortEntryLayout layout_;
  Module module_;
  std::vector<uint8_t> arena_;       // the entries of the array, back to back
  // An entry of the array: where it lies in arena_, and its prefix.
  struct Slot {
    uint64_t prefix;
    uint32_t offset;
  };
  std::vector<Slot> entries_a_;
  std::vector<Slot> entries_b_;  // the merge sort's second array
  int64_t sorted_entries_ = 0;
  int64_t level_one_runs_ = 0;
  int32_t passes_ = 0;
};

}  // namespace qm
