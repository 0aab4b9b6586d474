#include "index/entry_sort.h"

#include <algorithm>
#include <cstring>
#include <new>
#include <system_error>

#include "platform/file_io.h"
#include "base/error_numbers.h"
#include "format/sort_stream.h"
#include "base/checked_allocation.h"
#include "base/exception_family.h"
#include "config/global_defs.h"
#include "config/temp_names.h"
#include "base/trace.h"

namespace qm {

namespace {

// Room reserved per array entry at first; the arena grows past it for long text.
constexpr std::size_t kFirstBytesPerEntry = 32;

}  // namespace

CEntrySort::CEntrySort(CGlobalDefs& defs, SortEntryLayout layout, Module module)
    : defs_(defs), layout_(layout), module_(module) {}

const char* CEntrySort::TraceTag() const {
  return module_ == Module::PiSort ? "PILIB.PiSort.SortFindexTable" : "PILIB.PiOrderSort.Sort";
}

void CEntrySort::RaiseAllocationFailure() {
  FreeRowArrays();
  if (module_ == Module::PiSort) {
    throw CPiSortException::Numbered(kErrOutOfMemory, "AllocateRowArrays", nullptr);
  }
  throw CPiOrderSortException::Numbered(kErrOutOfMemory, "AllocateRowArrays", nullptr);
}

void CEntrySort::AllocateRowArrays() {
  try {
    ReserveChecked(entries_a_, kArrayEntries);
    ReserveChecked(entries_b_, kArrayEntries);
    ReserveChecked(arena_, kArrayEntries * std::max(kFirstBytesPerEntry, layout_.FixedSize()));
    arena_.resize(arena_.capacity());  // entries are read into it, not appended
  } catch (const std::bad_alloc&) {
    RaiseAllocationFailure();
  }
}

void CEntrySort::FreeRowArrays() {
  std::vector<uint8_t>().swap(arena_);
  std::vector<Slot>().swap(entries_a_);
  std::vector<Slot>().swap(entries_b_);
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

namespace {

// Bottom-up merge sort of slots (prefix, offset into base), stable: on equal
// entries the left one goes first. from and to hold n slots each; returns the
// array that holds the result.
template <class Slot, class Compare>
Slot* MergeSortSlots(const uint8_t* base, Slot* from, Slot* to, std::size_t n, Compare compare) {
  // The right entry goes first only when strictly smaller.
  auto right_first = [&](const Slot& right, const Slot& left) {
    if (right.prefix != left.prefix) return right.prefix < left.prefix;
    return compare(base + right.offset, base + left.offset) < 0;
  };
  for (std::size_t width = 1; width < n; width *= 2) {
    for (std::size_t left = 0; left < n; left += 2 * width) {
      const std::size_t mid = std::min(left + width, n);
      const std::size_t right = std::min(left + 2 * width, n);
      std::size_t i = left;
      std::size_t j = mid;
      std::size_t k = left;
      while (i < mid && j < right) to[k++] = right_first(from[j], from[i]) ? from[j++] : from[i++];
      while (i < mid) to[k++] = from[i++];
      while (j < right) to[k++] = from[j++];
    }
    std::swap(from, to);
  }
  return from;
}

}  // namespace

void CEntrySort::SortArray() {
  const std::size_t n = entries_a_.size();
  entries_b_.resize(n);
  const Slot* result = layout_.WithComparison([&](auto compare) {
    for (Slot& slot : entries_a_) slot.prefix = compare.Prefix(arena_.data() + slot.offset);
    return MergeSortSlots(arena_.data(), entries_a_.data(), entries_b_.data(), n, compare);
  });
  if (result != entries_a_.data()) std::copy(result, result + n, entries_a_.data());
}

void CEntrySort::WriteRun(SortFileWriter& out) {
  const uint8_t* base = arena_.data();
  for (const Slot& slot : entries_a_) out.Put(base + slot.offset, layout_.SizeOf(base + slot.offset));
}

void CEntrySort::LevelOne(MFile& raw, MFile* runs) {
  SortFileReader reader(layout_);
  reader.Start(raw);
  SortFileWriter writers[2];
  writers[0].Start(runs[0]);
  writers[1].Start(runs[1]);
  int64_t traced = 0;
  for (bool more = true; more;) {
    std::size_t filled = 0;
    entries_a_.clear();
    while (entries_a_.size() < kArrayEntries) {
      std::size_t size = 0;
      const uint8_t* entry = reader.Next(size);
      if (entry == nullptr) {
        more = false;
        break;
      }
      if (arena_.size() < filled + size) arena_.resize(std::max(filled + size, 2 * arena_.size()));
      std::memcpy(arena_.data() + filled, entry, size);
      entries_a_.push_back(Slot{0, static_cast<uint32_t>(filled)});
      filled += size;
    }
    if (entries_a_.empty()) break;
    SortArray();
    WriteRun(writers[level_one_runs_ % 2]);
    ++level_one_runs_;
    sorted_entries_ += static_cast<int64_t>(entries_a_.size());
    if (sorted_entries_ - traced >= kSortedTraceStep) {
      traced = sorted_entries_;
      Trace(defs_.TraceLevel2(), TraceTag(), "Words Sorted: %i", sorted_entries_);
    }
  }
  writers[0].Finish();
  writers[1].Finish();
}

int64_t CEntrySort::MergePass(MFile* in, MFile* out, int64_t run_length) {
  SortFileReader readers[2] = {SortFileReader(layout_), SortFileReader(layout_)};
  SortFileWriter writers[2];
  for (int i = 0; i < 2; ++i) {
    readers[i].Start(in[i]);
    writers[i].Start(out[i]);
  }
  const int64_t runs = layout_.WithComparison([&](auto compare) {
    // Per input: the entry waiting (null: none) and its size, entries left in
    // its run, the end of its file.
    const uint8_t* current[2] = {nullptr, nullptr};
    std::size_t size[2] = {0, 0};
    bool ended[2] = {false, false};
    int64_t left[2] = {0, 0};
    auto ready = [&](int i) {
      if (current[i] != nullptr) return true;
      if (left[i] == 0 || ended[i]) return false;
      current[i] = readers[i].Next(size[i]);
      if (current[i] == nullptr) {
        ended[i] = true;
        return false;
      }
      --left[i];
      return true;
    };

    int64_t written = 0;
    for (;;) {
      left[0] = left[1] = run_length;
      SortFileWriter& target = writers[written % 2];
      bool wrote = false;
      for (;;) {
        const bool a = ready(0);
        const bool b = ready(1);
        if (!a && !b) break;
        // The second input goes first only when strictly smaller.
        const int take = (b && (!a || compare(current[1], current[0]) < 0)) ? 1 : 0;
        target.Put(current[take], size[take]);
        current[take] = nullptr;
        wrote = true;
      }
      if (!wrote) break;
      ++written;
    }
    return written;
  });
  writers[0].Finish();
  writers[1].Finish();
  return runs;
}

void CEntrySort::Sort(MFile& raw, MFile& sorted) {
  sorted_entries_ = 0;
  level_one_runs_ = 0;
  passes_ = 0;
  MFile level_one[2];
  OpenSortFile(defs_, level_one[0]);
  OpenSortFile(defs_, level_one[1]);

  AllocateRowArrays();
  try {
    LevelOne(raw, level_one);
    defs_.SetProgress(20);
    FreeRowArrays();
    raw.Close();
    MergeLevelTwo(level_one, sorted);
  } catch (const std::bad_alloc&) {
    RaiseAllocationFailure();
  }
}

void CEntrySort::MergeLevelTwo(MFile* level_one, MFile& sorted) {
  MFile level_two[2];
  OpenSortFile(defs_, level_two[0]);
  OpenSortFile(defs_, level_two[1]);
  MFile* in = level_one;
  MFile* out = level_two;
  for (int64_t run_length = kArrayEntries;; run_length *= 2) {
    const int64_t runs = MergePass(in, out, run_length);
    ++passes_;
    Trace(defs_.TraceLevel1(), TraceTag(), "Sorting. Turns Left: %i", runs);
    const int64_t n = std::max<int64_t>(runs, 1);
    defs_.SetProgress(static_cast<int32_t>(20 + (70 / n) * n));
    if (runs <= 1) break;
    std::swap(in, out);
    // The next pass writes its outputs from empty files.
    out[0].Truncate(0);
    out[1].Truncate(0);
  }
  // The one run (or none) went to the first output.
  out[0].Seek(0);
  sorted.TakeOver(out[0]);
  sorted.Seek(0);
}

}  // namespace qm
