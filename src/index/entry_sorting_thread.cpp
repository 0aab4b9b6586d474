#include "index/entry_sorting_thread.h"

#include <algorithm>
#include <vector>

#include "format/sort_stream.h"
#include "index/two_way_merge_sort.h"

namespace qm {

namespace {

constexpr std::size_t kMinBlockBytes = 16 * 1024;
constexpr std::size_t kMaxBlockBytes = 1024 * 1024;

// Merged entries wait for the findex writer in a few blocks of this size:
// enough to even out the two threads' pace.
constexpr std::size_t kMergedBlockBytes = 256 * 1024;
constexpr std::size_t kMergedBlocks = 8;

std::size_t QueueBytes(std::size_t memory_bytes) { return memory_bytes / 4; }

std::size_t BlockBytes(std::size_t memory_bytes) {
  return std::clamp(QueueBytes(memory_bytes) / 8, kMinBlockBytes, kMaxBlockBytes);
}

}  // namespace

EntrySortingThread::EntrySortingThread(CGlobalDefs& defs, const SortEntryLayout& layout,
                                       std::size_t memory_bytes, MFile* sorted, Method method)
    : defs_(defs),
      layout_(layout),
      run_bytes_(memory_bytes - QueueBytes(memory_bytes)),
      sorted_(sorted),
      method_(method),
      queue_(BlockBytes(memory_bytes),
             std::max<std::size_t>(2, QueueBytes(memory_bytes) / BlockBytes(memory_bytes))),
      merged_(kMergedBlockBytes, kMergedBlocks) {
  thread_ = std::thread([this] { Work(); });
}

EntrySortingThread::~EntrySortingThread() { Abort(); }

void EntrySortingThread::Work() {
  try {
    std::vector<uint8_t> block;
    if (method_ == Method::TwoWayMerge) {
      MFile raw;
      CEntrySort::OpenSortFile(defs_, raw);
      SortFileWriter writer;
      writer.Start(raw);
      while (queue_.Pop(block)) writer.Put(block.data(), block.size());
      if (queue_.Aborted()) return;
      writer.Finish();
      CTwoWayMergeSort(defs_, layout_, CTwoWayMergeSort::Module::PiSort).Sort(raw, *sorted_);
      return;
    }
    CEntrySort sort(defs_, layout_, CEntrySort::Module::PiSort, run_bytes_);
    while (queue_.Pop(block)) sort.AddEntries(block.data(), block.size());
    if (queue_.Aborted()) return;
    if (sorted_ != nullptr) {
      sort.Finish(*sorted_);
    } else {
      sort.Finish(merged_);
    }
    run_seconds_ = sort.RunSeconds();
    merge_seconds_ = sort.MergeSeconds();
    runs_ = sort.Runs();
  } catch (...) {
    error_ = std::current_exception();
    queue_.Abort();
    merged_.Abort();
    // A half-written sorted file is nobody's: closing removes it.
    try {
      if (sorted_ != nullptr && sorted_->IsOpen()) sorted_->Close();
    } catch (...) {
    }
  }
}

void EntrySortingThread::Finish() {
  try {
    queue_.Close();
  } catch (const EntryBlockQueue::Stopped&) {
    // The thread failed; its error follows.
  }
  if (thread_.joinable()) thread_.join();
  if (error_) std::rethrow_exception(error_);
}

void EntrySortingThread::CloseInput() {
  try {
    queue_.Close();
  } catch (const EntryBlockQueue::Stopped&) {
    // The thread failed; PopMerged raises its error.
  }
}

bool EntrySortingThread::PopMerged(std::vector<uint8_t>& block) {
  if (merged_.Pop(block)) return true;
  // The end, or the thread failed: either way it is done, or about to be.
  if (thread_.joinable()) thread_.join();
  if (error_) std::rethrow_exception(error_);
  return false;
}

void EntrySortingThread::Abort() {
  queue_.Abort();
  merged_.Abort();
  if (thread_.joinable()) thread_.join();
}

}  // namespace qm
