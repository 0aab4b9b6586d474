// WordSplittingThread: the thread of a text findex build that turns the
// texts of the rows read into sort entries, so that reading rows (on the
// calling thread) and splitting and normalising their words overlap. The
// reader gathers rows into batches; at most a few batches wait, so a slow
// splitter holds the reader back. Batches are split in the order they were
// read, so the entries reach the sorting thread in the same order as if one
// thread had done both.
//
// A failure of the splitting thread (or of the sorting thread behind it,
// seen as EntryBlockQueue::Stopped) ends the hand-over: the reader's next
// EndRow or Finish raises that error.
#pragma once

#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <exception>
#include <mutex>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

#include "format/column_set.h"
#include "format/sort_entry.h"
#include "index/entry_block_queue.h"
#include "text/word_pipeline.h"

namespace qm {

class CGlobalDefs;

class WordSplittingThread {
 public:
  // weights: the content weight of each indexed column, in the order the
  // row's values come. The pipeline is made here, on the calling thread, so
  // a language that fails to load fails before the thread starts. queue and
  // layout must outlive the object.
  WordSplittingThread(const CGlobalDefs& defs, const WordPipelineOptions& options,
                      EntryBlockQueue& queue, const SortEntryLayout& layout,
                      const CColumnSet& set, std::vector<int32_t> weights);
  // Unless finished, stops the thread and the sorting queue (the build is
  // given up) without waiting for what is queued; never raises.
  ~WordSplittingThread();
  WordSplittingThread(const WordSplittingThread&) = delete;
  WordSplittingThread& operator=(const WordSplittingThread&) = delete;

  // Reader side: one row is StartRow, then one call per indexed column in
  // order (Null for a column without a value), then EndRow.
  void StartRow(int32_t key);
  void Null();
  void Narrow(std::string_view utf8);
  void Wide(std::u16string_view text);
  // Hands the batch over when it is full; raises the splitting side's error.
  void EndRow();
  // Hands over the last batch and waits for every entry to be written to
  // the queue; raises the splitting side's error. Returns the entries written.
  int64_t Finish();

 private:
  // Rows read and not yet split: per row its key, per value its text's
  // place in narrow or wide (or none for a null).
  struct Batch {
    enum class Kind : uint8_t { Null, Narrow, Wide };
    struct Value {
      Kind kind;
      std::size_t begin;
      std::size_t size;
    };
    std::vector<int32_t> keys;
    std::vector<Value> values;
    std::string narrow;
    std::u16string wide;
    std::size_t Bytes() const { return narrow.size() + 2 * wide.size(); }
    void Clear() {
      keys.clear();
      values.clear();
      narrow.clear();
      wide.clear();
    }
  };

  void Work();
  void Split(const Batch& batch);
  void HandOver();
  // Stops both sides; the thread's error, if any, stays.
  void Abort();
  [[noreturn]] void RaiseStopped();

  CWordPipeline pipeline_;
  EntryBlockQueue& queue_;
  const SortEntryLayout& layout_;
  CColumnSet set_;
  std::vector<int32_t> weights_;
  Batch filling_;
  int64_t entries_ = 0;

  std::mutex mutex_;
  std::condition_variable changed_;
  std::deque<Batch> full_;
  std::vector<Batch> spare_;
  bool closed_ = false;
  bool aborted_ = false;
  std::exception_ptr error_;
  std::thread thread_;
};

}  // namespace qm
