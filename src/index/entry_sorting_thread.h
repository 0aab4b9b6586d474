// EntrySortingThread: the second thread of a findex build. It takes the
// blocks of entries the row loop hands over (entry_block_queue.h), gathers
// them into sorted runs while the rows are still being read, and at the end
// merges them into the sorted file, or hands the merged entries block by
// block to the findex writer on the calling thread, which then works beside
// the merge. A failure here aborts the queues, so the row loop (or the
// writer) stops at its next block; Finish then raises this thread's error.
#pragma once

#include <cstddef>
#include <exception>
#include <thread>
#include <vector>

#include "format/mfile.h"
#include "format/sort_entry.h"
#include "index/entry_block_queue.h"
#include "index/entry_sort.h"

namespace qm {

class CGlobalDefs;

class EntrySortingThread {
 public:
  // The sort that gathers and merges the entries: the memory-bounded one,
  // or (tests only) the earlier two-way merge sort over a raw file.
  enum class Method { Runs, TwoWayMerge };

  // Splits memory_bytes between the queue (a quarter) and the run buffer,
  // and starts the thread; sorted receives the result on Finish. Without
  // sorted the result comes from PopMerged (Method::Runs only).
  EntrySortingThread(CGlobalDefs& defs, const SortEntryLayout& layout, std::size_t memory_bytes,
                     MFile* sorted, Method method);
  // Aborts and waits for a thread that was not finished.
  ~EntrySortingThread();
  EntrySortingThread(const EntrySortingThread&) = delete;
  EntrySortingThread& operator=(const EntrySortingThread&) = delete;

  // Where the row loop puts its entries.
  EntryBlockQueue& Queue() { return queue_; }
  // Closes the queue, waits for the sorted file; raises the thread's error.
  void Finish();
  // Without a sorted file: closes the queue, so the final merge starts.
  void CloseInput();
  // Without a sorted file, after CloseInput: the next block of merged
  // entries (whole entries, in order) into block; false after the last one.
  // Raises the thread's error when it failed.
  bool PopMerged(std::vector<uint8_t>& block);
  // Stops the thread, discarding what it sorted; never raises.
  void Abort();
  // The thread's error, if it failed (the queue is then aborted).
  std::exception_ptr Error() const { return error_; }

  double RunSeconds() const { return run_seconds_; }
  double MergeSeconds() const { return merge_seconds_; }
  int64_t Runs() const { return runs_; }

 private:
  void Work();

  CGlobalDefs& defs_;
  SortEntryLayout layout_;
  std::size_t run_bytes_;
  MFile* sorted_;
  Method method_;
  EntryBlockQueue queue_;
  EntryBlockQueue merged_;
  std::exception_ptr error_;
  double run_seconds_ = 0;
  double merge_seconds_ = 0;
  int64_t runs_ = 0;
  std::thread thread_;
};

}  // namespace qm
