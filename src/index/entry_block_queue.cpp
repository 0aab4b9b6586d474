#include "index/entry_block_queue.h"

#include <utility>

namespace qm {

EntryBlockQueue::EntryBlockQueue(std::size_t block_bytes, std::size_t max_blocks)
    : block_bytes_(block_bytes), max_blocks_(max_blocks) {
  filling_.reserve(block_bytes_);
}

void EntryBlockQueue::HandOver() {
  std::unique_lock lock(mutex_);
  changed_.wait(lock, [&] { return aborted_ || full_.size() < max_blocks_; });
  if (aborted_) throw Stopped{};
  full_.push_back(std::move(filling_));
  if (!spare_.empty()) {
    filling_ = std::move(spare_.back());
    spare_.pop_back();
  } else {
    filling_ = std::vector<uint8_t>();
    filling_.reserve(block_bytes_);
  }
  filling_.clear();
  lock.unlock();
  changed_.notify_all();
}

void EntryBlockQueue::Close() {
  if (!filling_.empty()) HandOver();
  {
    std::lock_guard lock(mutex_);
    closed_ = true;
  }
  changed_.notify_all();
}

bool EntryBlockQueue::Pop(std::vector<uint8_t>& block) {
  std::unique_lock lock(mutex_);
  if (block.capacity() > 0) {
    block.clear();
    spare_.push_back(std::move(block));
    block = std::vector<uint8_t>();
  }
  changed_.wait(lock, [&] { return aborted_ || closed_ || !full_.empty(); });
  if (aborted_ || full_.empty()) return false;
  block = std::move(full_.front());
  full_.pop_front();
  lock.unlock();
  changed_.notify_all();
  return true;
}

void EntryBlockQueue::Abort() {
  {
    std::lock_guard lock(mutex_);
    aborted_ = true;
  }
  changed_.notify_all();
}

bool EntryBlockQueue::Aborted() const {
  std::lock_guard lock(mutex_);
  return aborted_;
}

}  // namespace qm
