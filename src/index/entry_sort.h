// CEntrySort: the external sort of index entries (sort_entry.h), shared by the
// word sort and the order sort. Memory-bounded: entries are gathered in one
// buffer of the memory budget and sorted in place in pieces as it fills (so
// sorting keeps pace with a producer on another thread); a full buffer is
// merged from its pieces and written as a run. At the end the runs (and the
// last one, still in memory) are merged k ways at a time into a sorted file,
// or into a queue for a reader on another thread, so each entry is written
// and read at most about twice however large the input. Only when more than
// kMergeWays runs exist does a pass merge groups of them into longer runs
// first.
//
// The sorted file orders entries by value, then key; entries that compare
// equal keep the order in which they were added (a run keeps it by its buffer
// offsets, the merge by run number), so the result is the same file the
// earlier two-way merge sort wrote.
//
// Run files are delete-on-close temporary files of the group's work folder:
// whatever happens, closing them removes them.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <vector>

#include "format/mfile.h"
#include "format/sort_entry.h"

namespace qm {

class CGlobalDefs;
class EntryBlockQueue;

class CEntrySort {
 public:
  // "Words Sorted" is traced each time this many more entries were sorted.
  static constexpr int64_t kSortedTraceStep = 100000;
  // Runs merged at once; each takes a 64 KB read buffer.
  static constexpr std::size_t kMergeWays = 64;
  // The budget when the configuration store names none, and the least one.
  static constexpr std::size_t kDefaultMemoryMb = 256;
  static constexpr std::size_t kMinimumMemoryMb = 1;
  // Progress while merging moves from the first to the second by the share
  // of entries merged; the end of the sort reaches the second.
  static constexpr int32_t kProgressSorting = 15;
  static constexpr int32_t kProgressSorted = 90;

  // Which engine module reports the sort's failures (error 11 when the sort
  // memory cannot be allocated) and tags its traces.
  enum class Module { PiSort, PiOrderSort };

  // The memory budget in bytes: "sort_memory_mb" of the configuration store
  // (MORVIL_SORT_MEMORY_MB overrides it), default 256, at least 1.
  static std::size_t ConfiguredMemoryBytes();

  // memory_bytes: the run buffer; the merge adds its read buffers. Tests
  // lower merge_ways to reach the passes over groups of runs with few runs.
  CEntrySort(CGlobalDefs& defs, SortEntryLayout layout, Module module, std::size_t memory_bytes,
             std::size_t merge_ways = kMergeWays);
  CEntrySort(CGlobalDefs& defs, SortEntryLayout layout, Module module);
  ~CEntrySort();
  CEntrySort(const CEntrySort&) = delete;
  CEntrySort& operator=(const CEntrySort&) = delete;

  // Opens file on a new delete-on-close temporary file of the work folder.
  static void OpenSortFile(const CGlobalDefs& defs, MFile& file);

  // One entry of the layout, copied.
  void Add(const uint8_t* entry, std::size_t size);
  // Whole entries back to back.
  void AddEntries(const uint8_t* entries, std::size_t bytes);
  // Sorts what was added into sorted, a new temporary file left open for
  // reading at its start, and frees the memory. Progress: 15 to 90.
  void Finish(MFile& sorted);
  // The same, but the final merge puts its entries into merged, which it
  // closes at the end, for a reader on another thread.
  void Finish(EntryBlockQueue& merged);
  // Adds every entry of raw (written from its start, any position), closes
  // raw, and finishes into sorted.
  void Sort(MFile& raw, MFile& sorted);

  // What the sort did so far.
  int64_t EntriesSorted() const { return entries_; }
  int64_t Runs() const { return runs_; }
  int32_t MergePasses() const { return passes_; }
  // Seconds spent sorting buffers and writing runs, and merging into sorted.
  double RunSeconds() const { return run_seconds_; }
  double MergeSeconds() const { return merge_seconds_; }

 private:
  // An entry of the buffer: its comparison prefix and its offset. Slots fill
  // the buffer from its end downwards while entries fill it from its start.
  // The key is kept beside the prefix: equal words (the most frequent tie)
  // are then ordered without reading their entries. Offsets are 32-bit, so a
  // run buffer holds at most 4 GB.
  struct Slot {
    uint64_t prefix;
    uint32_t offset;
    int32_t key;
  };
  struct Run {
    int64_t begin;
    int64_t bytes;
  };
  class Merger;

  // Merges groups of runs until few enough are left, then calls
  // final_pass(merger, runs, pieces) for the last merge.
  template <class FinalPass>
  void Merge(FinalPass&& final_pass);

  // A sorted piece of the buffer's slots.
  struct SlotRange {
    const Slot* begin;
    const Slot* end;
  };

  void Allocate();
  [[noreturn]] void RaiseAllocationFailure();
  // The slot of the index-th entry added to the buffer.
  Slot* SlotAt(std::size_t index) const;
  std::size_t PieceBytes() const;
  // Sorts the slots added since the last piece by entry, then offset.
  void SortPiece();
  // Orders slots by prefix, keeping the order of equal ones.
  void RadixSortByPrefix(Slot* begin, Slot* end);
  // Every piece of the buffer, sorted, the earliest first.
  std::vector<SlotRange> SortedPieces();
  // Merges the pieces of the buffer into one run of the run file.
  void SpillRun();
  void ClearBuffer();
  Slot* SlotsBegin() const;
  const char* TraceTag() const;

  CGlobalDefs& defs_;
  SortEntryLayout layout_;
  Module module_;
  std::size_t buffer_bytes_;
  std::size_t merge_ways_;
  std::unique_ptr<std::byte[]> buffer_;
  std::size_t fill_ = 0;   // entry bytes at the start of buffer_
  std::size_t slots_ = 0;  // slots at the end of buffer_
  std::vector<std::size_t> pieces_;  // the slot counts at which pieces end
  std::vector<Slot> radix_scratch_;   // the other half of the prefix radix sort
  std::size_t piece_fill_ = 0;       // fill_ when the last piece ended
  MFile run_file_;
  std::vector<Run> runs_in_file_;
  int64_t entries_ = 0;
  int64_t traced_ = 0;
  int64_t runs_ = 0;
  int32_t passes_ = 0;
  double run_seconds_ = 0;
  double merge_seconds_ = 0;
};

}  // namespace qm
