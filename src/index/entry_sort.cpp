#include "index/entry_sort.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <cstring>
#include <new>
#include <string>

#include "base/byte_layout.h"
#include "base/checked_allocation.h"
#include "base/error_numbers.h"
#include "base/exception_family.h"
#include "base/trace.h"
#include "config/global_defs.h"
#include "config/megabyte_setting.h"
#include "config/temp_names.h"
#include "format/sort_stream.h"
#include "index/entry_block_queue.h"
#include "platform/file_io.h"
#include "platform/huge_pages.h"

namespace qm {

namespace {

// Entries between looks at the clock of progress while merging.
constexpr int64_t kProgressStep = 4096;
// Room for several of the longest entries a layout can hold (64 KB each).
constexpr std::size_t kLeastBufferBytes = 256 * 1024;
// Slots hold 32-bit offsets into the run buffer.
constexpr std::size_t kMostBufferBytes = std::size_t{0xFFFFFFFF};
// A run buffer is sorted in about this many pieces as it fills, each at most
// 4 MB: few pieces keep the merge narrow, while a piece small enough to stay
// in the processor's cache sorts much faster (and the last one, sorted after
// the rows end, is short).
constexpr std::size_t kPiecesPerBuffer = 16;
constexpr std::size_t kMostPieceBytes = 4 * 1024 * 1024;

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
      buffer_bytes_(std::clamp(memory_bytes, kLeastBufferBytes, kMostBufferBytes) / sizeof(Slot) *
                    sizeof(Slot)),
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
    // The merge reads the buffer's entries in sorted order, all over it.
    platform::AdviseHugePages(buffer_.get(), buffer_bytes_);
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
  *SlotsBegin() = Slot{0, static_cast<uint32_t>(fill_), 0};
  fill_ += size;
  ++entries_;
  // Pieces are sorted as they fill, while the rows are still being read; the
  // run is merged from them when it is written.
  if (fill_ - piece_fill_ >= PieceBytes()) SortPiece();
}

std::size_t CEntrySort::PieceBytes() const {
  return std::clamp(buffer_bytes_ / kPiecesPerBuffer, kLeastBufferBytes / 4, kMostPieceBytes);
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

void CEntrySort::RadixSortByPrefix(Slot* begin, Slot* end) {
  const auto n = static_cast<std::size_t>(end - begin);
  if (n < 2) return;
  // One count per byte value of each of the prefix's eight bytes, the
  // lowest first; a byte that is the same in every slot needs no pass.
  std::array<std::array<uint32_t, 256>, 8> counts{};
  for (const Slot* s = begin; s != end; ++s) {
    for (std::size_t b = 0; b < 8; ++b) ++counts[b][(s->prefix >> (8 * b)) & 0xFF];
  }
  radix_scratch_.resize(n);
  Slot* from = begin;
  Slot* to = radix_scratch_.data();
  for (std::size_t b = 0; b < 8; ++b) {
    std::array<uint32_t, 256>& count = counts[b];
    const unsigned shift = static_cast<unsigned>(8 * b);
    if (count[(from->prefix >> shift) & 0xFF] == n) continue;
    uint32_t sum = 0;
    for (uint32_t& c : count) {
      const uint32_t here = c;
      c = sum;
      sum += here;
    }
    for (std::size_t i = 0; i < n; ++i) to[count[(from[i].prefix >> shift) & 0xFF]++] = from[i];
    std::swap(from, to);
  }
  if (from != begin) std::copy(from, from + n, begin);
}

void CEntrySort::SortPiece() {
  const std::size_t first = pieces_.empty() ? 0 : pieces_.back();
  if (slots_ == first) return;
  const Clock::time_point start = Clock::now();
  const auto* base = reinterpret_cast<const uint8_t*>(buffer_.get());
  // Slots first..slots_ - 1 lie from SlotAt(slots_ - 1) upwards, the last
  // added lowest: reversed, they stand in the order added.
  Slot* begin = SlotAt(slots_ - 1);
  Slot* end = begin + (slots_ - first);
  std::reverse(begin, end);
  try {
    layout_.WithComparison([&](auto compare) {
      for (Slot* s = begin; s != end; ++s) {
        s->prefix = compare.Prefix(base + s->offset);
        s->key = bytes::LoadI32(base + s->offset);  // the row's first item
      }
      // By prefix, equal ones still in the order added; then each group of
      // equal prefixes by key when the prefix holds the whole value, else by
      // entry; equal entries by offset, that is in the order they were added.
      RadixSortByPrefix(begin, end);
      const auto by_key = [](const Slot& a, const Slot& b) { return a.key < b.key; };
      const auto by_entry = [&](const Slot& a, const Slot& b) {
        const int c = compare(base + a.offset, base + b.offset);
        return c != 0 ? c < 0 : a.offset < b.offset;
      };
      for (Slot* group = begin; group != end;) {
        Slot* after = group + 1;
        while (after != end && after->prefix == group->prefix) ++after;
        if (after - group > 1) {
          if (!compare.WholeValue(group->prefix)) {
            std::sort(group, after, by_entry);
          } else if (!std::is_sorted(group, after, by_key)) {
            std::stable_sort(group, after, by_key);
          }
        }
        group = after;
      }
    });
  } catch (const std::bad_alloc&) {
    RaiseAllocationFailure();
  }
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

  // Merges runs of file and pieces into out, anything with Put(entry, size);
  // returns the bytes put.
  template <class Sink>
  int64_t Run(MFile& file, const std::vector<CEntrySort::Run>& runs,
              const std::vector<SlotRange>& pieces, Sink& out) {
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
    int64_t bytes = 0;
    sort_.layout_.WithComparison([&](auto compare) {
      // Whether input a's entry comes after input b's. The prefixes settle
      // most comparisons (a piece's come with its slots); equal ones that
      // hold whole values leave it to the keys.
      const auto after = [&](int a, int b) {
        const Input& x = inputs_[static_cast<std::size_t>(a)];
        const Input& y = inputs_[static_cast<std::size_t>(b)];
        if (x.prefix != y.prefix) return x.prefix > y.prefix;
        if (compare.WholeValue(x.prefix)) {
          if (x.key != y.key) return x.key > y.key;
        } else {
          const int c = compare(x.entry, y.entry);
          if (c != 0) return c > 0;
        }
        return a > b;
      };
      const auto next = [&](int i) {
        if (!Next(i)) return false;
        Input& in = inputs_[static_cast<std::size_t>(i)];
        if (in.slot_end != nullptr) {
          in.prefix = in.slot[-1].prefix;
          in.key = in.slot[-1].key;
        } else {
          in.prefix = compare.Prefix(in.entry);
          in.key = bytes::LoadI32(in.entry);
        }
        return true;
      };
      // A heap of inputs, the smallest entry on top; the top is replaced
      // and sifted down, one pass for each entry written.
      std::vector<int> heap;
      heap.reserve(inputs_.size());
      const auto sift_down = [&](std::size_t at) {
        const std::size_t n = heap.size();
        for (;;) {
          std::size_t child = 2 * at + 1;
          if (child >= n) return;
          if (child + 1 < n && after(heap[child], heap[child + 1])) ++child;
          if (!after(heap[at], heap[child])) return;
          std::swap(heap[at], heap[child]);
          at = child;
        }
      };
      for (int i = 0; i < static_cast<int>(inputs_.size()); ++i) {
        if (next(i)) heap.push_back(i);
      }
      for (std::size_t at = heap.size() / 2; at-- > 0;) sift_down(at);
      while (!heap.empty()) {
        const int i = heap.front();
        out.Put(inputs_[static_cast<std::size_t>(i)].entry, inputs_[static_cast<std::size_t>(i)].size);
        bytes += static_cast<int64_t>(inputs_[static_cast<std::size_t>(i)].size);
        if (!next(i)) {
          heap.front() = heap.back();
          heap.pop_back();
        }
        if (!heap.empty()) sift_down(0);
        if (++merged_ % kProgressStep == 0 && work_ > 0) ShowProgress();
      }
    });
    return bytes;
  }

 private:
  // How far ahead of a piece's next slot its entry is fetched into the cache.
  static constexpr std::ptrdiff_t kPrefetchSlots = 16;

  struct Input {
    explicit Input(const SortEntryLayout& layout) : reader(layout) {}
    SortFileReader reader;
    const Slot* slot = nullptr;  // in the buffer: the next slot, and the end
    const Slot* slot_end = nullptr;
    const uint8_t* entry = nullptr;
    std::size_t size = 0;
    uint64_t prefix = 0;  // the entry's comparison prefix and key
    int32_t key = 0;
  };

  bool Next(int i) {
    Input& in = inputs_[static_cast<std::size_t>(i)];
    if (in.slot_end != nullptr) {
      if (in.slot == in.slot_end) return false;
      const auto* base = reinterpret_cast<const uint8_t*>(sort_.buffer_.get());
      // A piece's slots are in order of value, its entries in the order they
      // came: each entry is a cache miss unless asked for well ahead.
      if (in.slot_end - in.slot > kPrefetchSlots) __builtin_prefetch(base + in.slot[kPrefetchSlots].offset);
      in.entry = base + in.slot->offset;
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
  SortFileWriter writer;
  writer.Start(run_file_);
  runs_in_file_.push_back(Run{begin, merge.Run(run_file_, {}, pieces, writer)});
  writer.Finish();
  ++runs_;
  ClearBuffer();
  run_seconds_ += SecondsSince(start);
}

void CEntrySort::Finish(MFile& sorted) {
  try {
    Merge([&](auto& merge, std::vector<Run>& runs, const std::vector<SlotRange>& pieces) {
      OpenSortFile(defs_, sorted);
      SortFileWriter writer;
      writer.Start(sorted);
      merge.Run(run_file_, runs, pieces, writer);
      writer.Finish();
    });
    sorted.Seek(0);
  } catch (const std::bad_alloc&) {
    RaiseAllocationFailure();
  }
}

void CEntrySort::Finish(EntryBlockQueue& merged) {
  try {
    Merge([&](auto& merge, std::vector<Run>& runs, const std::vector<SlotRange>& pieces) {
      merge.Run(run_file_, runs, pieces, merged);
    });
    merged.Close();
  } catch (const std::bad_alloc&) {
    RaiseAllocationFailure();
  }
}

template <class FinalPass>
void CEntrySort::Merge(FinalPass&& final_pass) {
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
    SortFileWriter writer;
    writer.Start(next);
    std::vector<Run> merged;
    for (std::size_t first = 0; first < runs_in_file_.size(); first += merge_ways_) {
      const std::size_t last = std::min(first + merge_ways_, runs_in_file_.size());
      const std::vector<Run> group(runs_in_file_.begin() + static_cast<std::ptrdiff_t>(first),
                                   runs_in_file_.begin() + static_cast<std::ptrdiff_t>(last));
      const int64_t begin = merged.empty() ? 0 : merged.back().begin + merged.back().bytes;
      merged.push_back(Run{begin, merge.Run(run_file_, group, {}, writer)});
    }
    writer.Finish();
    ++passes_;
    Trace(defs_.TraceLevel1(), TraceTag(), "Sorting. Turns Left: %i",
          static_cast<int64_t>(merged.size()));
    run_file_.TakeOver(next);
    runs_in_file_ = std::move(merged);
  }
  final_pass(merge, runs_in_file_, pieces);
  ++passes_;
  Trace(defs_.TraceLevel1(), TraceTag(), "Sorting. Turns Left: %i", int64_t{1});
  buffer_.reset();
  radix_scratch_ = std::vector<Slot>();
  ClearBuffer();
  run_file_.Close();
  runs_in_file_.clear();
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
