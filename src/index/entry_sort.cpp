#include "index/entry_sort.h"

#include <algorithm>
#include <chrono>
#include <cstring>
#include <new>
#include <string>

#include "base/checked_allocation.h"
#include "base/error_numbers.h"
#include "base/exception_family.h"
#include "base/trace.h"
#include "config/global_defs.h"
#include "config/megabyte_setting.h"
#include "config/temp_names.h"
#include "format/sort_stream.h"
#include "platform/file_io.h"

namespace qm {

namespace {

// Entries between looks at the clock of progress while merging.
constexpr int64_t kProgressStep = 4096;
// Room for several of the longest entries a layout can hold (64 KB each).
constexpr std::size_t kLeastBufferBytes = 256 * 1024;
// A run buffer is sorted in about this many pieces as it fills.
constexpr std::size_t kPiecesPerBuffer = 16;

using Clock = std::chrono::steady_clock;

double SecondsSince(Clock::time_point start) {
  return std::chrono::duration<double>(Clock::now() - start).count();
}

}  // namespace

std::size_t CEntrySort::ConfiguredMemoryBytes() {
  return ReadMegabyteSetting("sort_memory_mb", kDefaultMemoryMb, kMinimumMemoryMb);
}

CEntrySort::CEntrySort(CGlobalDefs& defs, SortEntryLayout layout, Module module,
                       std::size_t memory_bytes, std::size_t merge_ways)
    : defs_(defs),
      layout_(layout),
      module_(module),
      // Whole slots, and room for the longest entry a layout can hold.
      buffer_bytes_(std::max(memory_bytes, kLeastBufferBytes) / sizeof(Slot) * sizeof(Slot)),
      merge_ways_(std::max<std::size_t>(merge_ways, 2)) {}

CEntrySort::CEntrySort(CGlobalDefs& defs, SortEntryLayout layout, Module module)
    : CEntrySort(defs, layout, module, ConfiguredMemoryBytes()) {}

CEntrySort::~CEntrySort() = default;

const char* CEntrySort::TraceTag() const {
  return module_ == Module::PiSort ? "PILIB.PiSort.SortFindexTable" : "PILIB.PiOrderSort.Sort";
}

void CEntrySort::RaiseAllocationFailure() {
  buffer_.reset();
  fill_ = slots_ = 0;
  if (module_ == Module::PiSort) {
    throw CPiSortException::Numbered(kErrOutOfMemory, "AllocateRowArrays", nullptr);
  }
  throw CPiOrderSortException::Numbered(kErrOutOfMemory, "AllocateRowArrays", nullptr);
}

void CEntrySort::Allocate() {
  try {
    CheckAllocationSize(buffer_bytes_);
    // Not zeroed: pages are only touched as entries arrive.
    buffer_ = std::make_unique_for_overwrite<std::byte[]>(buffer_bytes_);
  } catch (const std::bad_alloc&) {
    RaiseAllocationFailure();
  }
}

void CEntrySort::OpenSortFile(const CGlobalDefs& defs, MFile& file) {
  const std::string path = SLGetTempWorkFilePath(defs, kTempCallerSortRuns);
  try {
    file.OpenFile(path, MFile::kCreate, platform::kFileAttributeDeleteOnClose);
  } catch (...) {
    // The name was created for us; without an open file nothing else removes it.
    platform::UnlinkFile(path);  // best effort: the file may be gone already
    throw;
  }
}

CEntrySort::Slot* CEntrySort::SlotsBegin() const {
  return std::launder(reinterpret_cast<Slot*>(buffer_.get() + buffer_bytes_ - slots_ * sizeof(Slot)));
}

void CEntrySort::Add(const uint8_t* entry, std::size_t size) {
  if (!buffer_) Allocate();
  if (fill_ + size + (slots_ + 1) * sizeof(Slot) > buffer_bytes_) SpillRun();
  std::memcpy(buffer_.get() + fill_, entry, size);
  ++slots_;
  *SlotsBegin() = Slot{0, fill_};
  fill_ += size;
  ++entries_;
  // Pieces are sorted as they fill, while the rows are still being read; the
  // run is merged from them when it is written.
  if (fill_ - piece_fill_ >= PieceBytes()) SortPiece();
}

std::size_t CEntrySort::PieceBytes() const {
  return std::max(buffer_bytes_ / kPiecesPerBuffer, kLeastBufferBytes / 4);
}

void CEntrySort::AddEntries(const uint8_t* entries, std::size_t bytes) {
  for (std::size_t at = 0; at < bytes;) {
    const std::size_t size = layout_.SizeOf(entries + at);
    Add(entries + at, size);
    at += size;
  }
}

CEntrySort::Slot* CEntrySort::SlotAt(std::size_t index) const {
  // Slot index i (in the order added) lies i + 1 slots below the end.
  return std::launder(reinterpret_cast<Slot*>(buffer_.get() + buffer_bytes_ -
                                              (index + 1) * sizeof(Slot)));
}

void CEntrySort::SortPiece() {
  const std::size_t first = pieces_.empty() ? 0 : pieces_.back();
  if (slots_ == first) return;
  const Clock::time_point start = Clock::now();
  const auto* base = reinterpret_cast<const uint8_t*>(buffer_.get());
  // Slots first..slots_ - 1 lie from SlotAt(slots_ - 1) upwards.
  Slot* begin = SlotAt(slots_ - 1);
  Slot* end = begin + (slots_ - first);
  layout_.WithComparison([&](auto compare) {
    for (Slot* s = begin; s != end; ++s) s->prefix = compare.Prefix(base + s->offset);
    // Equal entries by offset, that is in the order they were added.
    std::sort(begin, end, [&](const Slot& a, const Slot& b) {
      if (a.prefix != b.prefix) return a.prefix < b.prefix;
      const int c = compare(base + a.offset, base + b.offset);
      return c != 0 ? c < 0 : a.offset < b.offset;
    });
  });
  pieces_.push_back(slots_);
  piece_fill_ = fill_;
  if (entries_ - traced_ >= kSortedTraceStep) {
    traced_ = entries_;
    Trace(defs_.TraceLevel2(), TraceTag(), "Words Sorted: %i", entries_);
  }
  run_seconds_ += SecondsSince(start);
}

std::vector<CEntrySort::SlotRange> CEntrySort::SortedPieces() {
  SortPiece();
  std::vector<SlotRange> ranges;
  std::size_t first = 0;
  for (const std::size_t last : pieces_) {
    if (last > first) ranges.push_back(SlotRange{SlotAt(last - 1), SlotAt(last - 1) + (last - first)});
    first = last;
  }
  return ranges;
}

void CEntrySort::ClearBuffer() {
  fill_ = slots_ = piece_fill_ = 0;
  pieces_.clear();
}

// The k-way merge of runs: inputs are runs in a file and, after them, the
// sorted pieces of the buffer; a heap picks the smallest entry, the lower
// input first among equals. With work 0 it shows no progress.
class CEntrySort::Merger {
 public:
  Merger(CEntrySort& sort, int64_t work) : sort_(sort), work_(work) {}

  // Merges runs of file and pieces into out (from its current end); returns
  // the bytes written.
  int64_t Run(MFile& file, const std::vector<CEntrySort::Run>& runs,
              const std::vector<SlotRange>& pieces, MFile& out) {
    inputs_.clear();
    inputs_.reserve(runs.size() + 1);
    for (const CEntrySort::Run& run : runs) {
      inputs_.emplace_back(sort_.layout_);
      inputs_.back().reader.Start(file, run.begin, run.bytes);
    }
    for (const SlotRange& piece : pieces) {
      inputs_.emplace_back(sort_.layout_);
      inputs_.back().slot = piece.begin;
      inputs_.back().slot_end = piece.end;
    }
    SortFileWriter writer;
    writer.Start(out);
    int64_t bytes = 0;
    sort_.layout_.WithComparison([&](auto compare) {
      const auto after = [&](int a, int b) {
        const int c = compare(inputs_[a].entry, inputs_[b].entry);
        return c != 0 ? c > 0 : a > b;
      };
      std::vector<int> heap;
      heap.reserve(inputs_.size());
      for (int i = 0; i < static_cast<int>(inputs_.size()); ++i) {
        if (Next(i)) heap.push_back(i);
      }
      std::make_heap(heap.begin(), heap.end(), after);
      while (!heap.empty()) {
        std::pop_heap(heap.begin(), heap.end(), after);
        const int i = heap.back();
        writer.Put(inputs_[i].entry, inputs_[i].size);
        bytes += static_cast<int64_t>(inputs_[i].size);
        if (Next(i)) {
          std::push_heap(heap.begin(), heap.end(), after);
        } else {
          heap.pop_back();
        }
        if (++merged_ % kProgressStep == 0 && work_ > 0) ShowProgress();
      }
    });
    writer.Finish();
    return bytes;
  }

 private:
  struct Input {
    explicit Input(const SortEntryLayout& layout) : reader(layout) {}
    SortFileReader reader;
    const Slot* slot = nullptr;  // in the buffer: the next slot, and the end
    const Slot* slot_end = nullptr;
    const uint8_t* entry = nullptr;
    std::size_t size = 0;
  };

  bool Next(int i) {
    Input& in = inputs_[static_cast<std::size_t>(i)];
    if (in.slot_end != nullptr) {
      if (in.slot == in.slot_end) return false;
      in.entry = reinterpret_cast<const uint8_t*>(sort_.buffer_.get()) + in.slot->offset;
      in.size = sort_.layout_.SizeOf(in.entry);
      ++in.slot;
      return true;
    }
    in.entry = in.reader.Next(in.size);
    return in.entry != nullptr;
  }

  void ShowProgress() {
    const int64_t span = kProgressSorted - kProgressSorting;
    sort_.defs_.SetProgress(static_cast<int32_t>(kProgressSorting + span * std::min(merged_, work_) / work_));
  }

  CEntrySort& sort_;
  int64_t work_;  // entries to merge over all passes
  int64_t merged_ = 0;
  std::vector<Input> inputs_;
};

void CEntrySort::SpillRun() {
  const Clock::time_point start = Clock::now();
  const std::vector<SlotRange> pieces = SortedPieces();
  if (!run_file_.IsOpen()) OpenSortFile(defs_, run_file_);
  const int64_t begin =
      runs_in_file_.empty() ? 0 : runs_in_file_.back().begin + runs_in_file_.back().bytes;
  Merger merge(*this, 0);
  runs_in_file_.push_back(Run{begin, merge.Run(run_file_, {}, pieces, run_file_)});
  ++runs_;
  ClearBuffer();
  run_seconds_ += SecondsSince(start);
}

void CEntrySort::Finish(MFile& sorted) {
  try {
    Merge(sorted);
  } catch (const std::bad_alloc&) {
    RaiseAllocationFailure();
  }
}

void CEntrySort::Merge(MFile& sorted) {
  const Clock::time_point start = Clock::now();
  // The last run stays in memory and joins the final merge as its last input,
  // unless passes before it must merge groups of runs first.
  const bool intermediate = runs_in_file_.size() + (slots_ > 0 ? 1 : 0) > merge_ways_;
  if (intermediate && slots_ > 0) SpillRun();
  const std::vector<SlotRange> pieces = SortedPieces();
  if (slots_ > 0) ++runs_;
  int64_t passes = 1;
  for (std::size_t n = runs_in_file_.size(); n > merge_ways_; n = (n + merge_ways_ - 1) / merge_ways_) {
    ++passes;
  }
  Merger merge(*this, entries_ * passes);
  passes_ = 0;
  while (runs_in_file_.size() > merge_ways_) {
    MFile next;
    OpenSortFile(defs_, next);
    std::vector<Run> merged;
    for (std::size_t first = 0; first < runs_in_file_.size(); first += merge_ways_) {
      const std::size_t last = std::min(first + merge_ways_, runs_in_file_.size());
      const std::vector<Run> group(runs_in_file_.begin() + static_cast<std::ptrdiff_t>(first),
                                   runs_in_file_.begin() + static_cast<std::ptrdiff_t>(last));
      const int64_t begin = merged.empty() ? 0 : merged.back().begin + merged.back().bytes;
      merged.push_back(Run{begin, merge.Run(run_file_, group, {}, next)});
    }
    ++passes_;
    Trace(defs_.TraceLevel1(), TraceTag(), "Sorting. Turns Left: %i",
          static_cast<int64_t>(merged.size()));
    run_file_.TakeOver(next);
    runs_in_file_ = std::move(merged);
  }
  OpenSortFile(defs_, sorted);
  merge.Run(run_file_, runs_in_file_, pieces, sorted);
  ++passes_;
  Trace(defs_.TraceLevel1(), TraceTag(), "Sorting. Turns Left: %i", int64_t{1});
  buffer_.reset();
  ClearBuffer();
  run_file_.Close();
  runs_in_file_.clear();
  sorted.Seek(0);
  defs_.SetProgress(kProgressSorted);
  merge_seconds_ += SecondsSince(start);
}

void CEntrySort::Sort(MFile& raw, MFile& sorted) {
  // A small raw file needs no more memory than its entries and their slots.
  const auto raw_bytes = static_cast<std::size_t>(std::max<int64_t>(raw.FileSize(), 0));
  const std::size_t needed = raw_bytes + (raw_bytes / layout_.FixedSize() + 1) * sizeof(Slot);
  buffer_bytes_ = std::min(buffer_bytes_, std::max(needed, kLeastBufferBytes) / sizeof(Slot) * sizeof(Slot));
  SortFileReader reader(layout_);
  reader.Start(raw);
  std::size_t size = 0;
  for (const uint8_t* entry = reader.Next(size); entry != nullptr; entry = reader.Next(size)) {
    Add(entry, size);
  }
  raw.Close();
  Finish(sorted);
}

}  // namespace qm
