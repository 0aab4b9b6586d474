#include "index/word_splitting_thread.h"

#include <utility>

#include "index/entry_writer.h"

namespace qm {

namespace {

// A batch is handed over once its text reaches this size; this many full
// batches may wait.
constexpr std::size_t kBatchBytes = 256 * 1024;
constexpr std::size_t kWaitingBatches = 4;

}  // namespace

WordSplittingThread::WordSplittingThread(const CGlobalDefs& defs,
                                         const WordPipelineOptions& options,
                                         EntryBlockQueue& queue, const SortEntryLayout& layout,
                                         const CColumnSet& set, std::vector<int32_t> weights)
    : pipeline_(defs, options),
      queue_(queue),
      layout_(layout),
      set_(set),
      weights_(std::move(weights)) {
  thread_ = std::thread([this] { Work(); });
}

WordSplittingThread::~WordSplittingThread() {
  if (!thread_.joinable()) return;
  // The build is given up: the thread may be waiting for room in the
  // sorting queue, which nobody may empty any more.
  Abort();
  queue_.Abort();
  thread_.join();
}

void WordSplittingThread::StartRow(int32_t key) { filling_.keys.push_back(key); }

void WordSplittingThread::Null() {
  filling_.values.push_back({Batch::Kind::Null, 0, 0});
}

void WordSplittingThread::Narrow(std::string_view utf8) {
  filling_.values.push_back({Batch::Kind::Narrow, filling_.narrow.size(), utf8.size()});
  filling_.narrow.append(utf8);
}

void WordSplittingThread::Wide(std::u16string_view text) {
  filling_.values.push_back({Batch::Kind::Wide, filling_.wide.size(), text.size()});
  filling_.wide.append(text);
}

void WordSplittingThread::EndRow() {
  if (filling_.Bytes() >= kBatchBytes) HandOver();
}

void WordSplittingThread::HandOver() {
  std::unique_lock lock(mutex_);
  changed_.wait(lock, [&] { return aborted_ || full_.size() < kWaitingBatches; });
  if (aborted_) {
    lock.unlock();
    RaiseStopped();
  }
  full_.push_back(std::move(filling_));
  if (!spare_.empty()) {
    filling_ = std::move(spare_.back());
    spare_.pop_back();
  } else {
    filling_ = Batch();
  }
  filling_.Clear();
  lock.unlock();
  changed_.notify_all();
}

int64_t WordSplittingThread::Finish() {
  if (!filling_.keys.empty()) HandOver();
  {
    std::lock_guard lock(mutex_);
    closed_ = true;
  }
  changed_.notify_all();
  if (thread_.joinable()) thread_.join();
  if (error_) std::rethrow_exception(error_);
  return entries_;
}

void WordSplittingThread::Abort() {
  {
    std::lock_guard lock(mutex_);
    aborted_ = true;
  }
  changed_.notify_all();
}

void WordSplittingThread::RaiseStopped() {
  if (thread_.joinable()) thread_.join();
  if (error_) std::rethrow_exception(error_);
  throw EntryBlockQueue::Stopped{};
}

void WordSplittingThread::Work() {
  try {
    Batch batch;
    for (;;) {
      {
        std::unique_lock lock(mutex_);
        if (batch.keys.capacity() > 0) {
          batch.Clear();
          spare_.push_back(std::move(batch));
          batch = Batch();
        }
        changed_.wait(lock, [&] { return aborted_ || closed_ || !full_.empty(); });
        if (aborted_ || full_.empty()) return;
        batch = std::move(full_.front());
        full_.pop_front();
      }
      changed_.notify_all();
      Split(batch);
    }
  } catch (...) {
    error_ = std::current_exception();
    Abort();
  }
}

void WordSplittingThread::Split(const Batch& batch) {
  EntryWriter writer(queue_, layout_, set_);
  const auto visit = [&](const SplitWord& word) {
    writer.SetPosition(word.position);
    writer.WriteText(word.form);
  };
  std::size_t next = 0;
  for (const int32_t key : batch.keys) {
    writer.SetKey(key);
    int32_t position = 0;
    for (std::size_t i = 0; i < weights_.size(); ++i) {
      const Batch::Value& value = batch.values[next++];
      if (i > 0) ++position;
      writer.SetWeight(weights_[i]);
      if (value.kind == Batch::Kind::Narrow) {
        pipeline_.WrittenWords(std::string_view(batch.narrow).substr(value.begin, value.size),
                               position, visit);
      } else if (value.kind == Batch::Kind::Wide) {
        pipeline_.WrittenWords(std::u16string_view(batch.wide).substr(value.begin, value.size),
                               position, visit);
      }
    }
  }
  entries_ += writer.Entries();
}

}  // namespace qm
