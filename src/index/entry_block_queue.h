// EntryBlockQueue: the bounded hand-over of encoded sort entries from the
// thread that reads rows to the thread that sorts them. The reader fills a
// block of whole entries and hands it over when it is full; at most a fixed
// number of blocks wait, so a slow sorter holds the reader back instead of
// letting memory grow. Either side can stop the other: Abort wakes both, and
// from then on Put raises Stopped and Pop returns false.
#pragma once

#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <mutex>
#include <vector>

namespace qm {

class EntryBlockQueue {
 public:
  // What Put raises once the queue was aborted.
  struct Stopped {};

  // REQUIRES: block_bytes >= 1, max_blocks >= 1.
  EntryBlockQueue(std::size_t block_bytes, std::size_t max_blocks);

  // Reader side. Appends one entry to the block being filled.
  void Put(const uint8_t* entry, std::size_t size) {
    if (filling_.size() + size > block_bytes_ && !filling_.empty()) HandOver();
    filling_.insert(filling_.end(), entry, entry + size);
  }
  // No more entries: hands over the last block and lets Pop end.
  void Close();

  // Sorter side. The next block into block (its old content is given back
  // for reuse); false once the queue is closed and empty, or aborted.
  bool Pop(std::vector<uint8_t>& block);

  // Either side: ends the hand-over at once.
  void Abort();
  bool Aborted() const;

 private:
  void HandOver();

  const std::size_t block_bytes_;
  const std::size_t max_blocks_;
  std::vector<uint8_t> filling_;
  mutable std::mutex mutex_;
  std::condition_variable changed_;
  std::deque<std::vector<uint8_t>> full_;
  std::vector<std::vector<uint8_t>> spare_;
  bool closed_ = false;
  bool aborted_ = false;
};

}  // namespace qm
