#include "search/item_runs.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <memory>
#include <vector>

#include "base/exception_family.h"
#include "format/items.h"

namespace qm {

namespace {

struct Run {
  int32_t first = 0;  // first item row (after the count row)
  int32_t end = 0;    // one past the last row
};

std::vector<Run> RunsOf(const CItems& items) {
  std::vector<Run> runs;
  int32_t at = 0;
  while (at < items.Count()) {
    const int32_t count = items.Key(at);
    if (count == 0) break;  // a cleared count row ends the sequence
    if (count < 0 || count > items.Count() - at) {
      throw CGiFIndexException::Text(
          "Damaged item array: a count row at row %i holds %i rows, %i remain", "MergeRuns",
          nullptr, at, count, items.Count() - at);
    }
    runs.push_back(Run{at + 1, at + count});
    at += count;
  }
  return runs;
}

int32_t SaturatingAdd(int32_t a, int32_t b) {
  const int64_t sum = int64_t{a} + b;
  return static_cast<int32_t>(std::clamp<int64_t>(sum, std::numeric_limits<int32_t>::min(),
                                                  std::numeric_limits<int32_t>::max()));
}

}  // namespace

int32_t CountRuns(const CItems& items) { return static_cast<int32_t>(RunsOf(items).size()); }

namespace {

// A key-sorted stretch of rows: a run still in the array, or the rows that
// merging made.
struct Segment {
  const int32_t* rows = nullptr;
  int64_t count = 0;
  std::shared_ptr<int32_t[]> owned;
};

// Merges two segments into fresh rows. With positions every row stays, by
// key and then position; without, rows of one key become one (the first
// segment's) with the scores added.
Segment MergeTwo(const Segment& first, const Segment& second, std::size_t w, int position,
                 int score) {
  Segment out;
  out.owned = std::make_shared_for_overwrite<int32_t[]>(
      static_cast<std::size_t>(first.count + second.count) * w);
  int32_t* to = out.owned.get();
  const int32_t* a = first.rows;
  const int32_t* b = second.rows;
  const int32_t* a_end = a + static_cast<std::size_t>(first.count) * w;
  const int32_t* b_end = b + static_cast<std::size_t>(second.count) * w;
  auto copy = [&](const int32_t* row) {
    for (std::size_t k = 0; k < w; ++k) to[k] = row[k];
    to += w;
  };
  while (a < a_end && b < b_end) {
    if (a[0] != b[0]) {
      if (a[0] < b[0]) {
        copy(a);
        a += w;
      } else {
        copy(b);
        b += w;
      }
    } else if (position >= 0) {
      if (a[position] <= b[position]) {
        copy(a);
        a += w;
      } else {
        copy(b);
        b += w;
      }
    } else {
      copy(a);
      if (score >= 0) to[static_cast<std::ptrdiff_t>(score) - static_cast<std::ptrdiff_t>(w)] =
          SaturatingAdd(a[score], b[score]);
      a += w;
      b += w;
    }
  }
  for (; a < a_end; a += w) copy(a);
  for (; b < b_end; b += w) copy(b);
  out.rows = out.owned.get();
  out.count = static_cast<int64_t>(to - out.owned.get()) / static_cast<int64_t>(w);
  return out;
}

}  // namespace

void MergeRuns(CItems& items) {
  const std::vector<Run> runs = RunsOf(items);
  if (runs.size() <= 1) return;
  const auto w = static_cast<std::size_t>(items.Width());
  const int position = items.Columns().p != 0 ? items.Columns().PositionColumn() : -1;
  const int score = items.Columns().s != 0 ? items.Columns().ScoreColumn() : -1;

  // The two shortest segments first, again and again: a long run is copied
  // by few merges however many short runs a pattern brings. The order of the
  // merges does not change the result: rows of one key are ordered by
  // position, or combined.
  auto longer = [](const Segment& x, const Segment& y) { return x.count > y.count; };
  std::vector<Segment> heap;
  heap.reserve(runs.size());
  for (const Run& run : runs) heap.push_back(Segment{items.Row(run.first), run.end - run.first, {}});
  std::make_heap(heap.begin(), heap.end(), longer);
  while (heap.size() > 1) {
    std::pop_heap(heap.begin(), heap.end(), longer);
    const Segment first = std::move(heap.back());
    heap.pop_back();
    std::pop_heap(heap.begin(), heap.end(), longer);
    const Segment second = std::move(heap.back());
    heap.pop_back();
    heap.push_back(MergeTwo(first, second, w, position, score));
    std::push_heap(heap.begin(), heap.end(), longer);
  }

  // The merged rows never outnumber the rows they came from.
  const Segment& merged = heap.front();
  const auto rows = static_cast<int32_t>(merged.count);
  int32_t* count_row = items.Row(0);
  std::fill(count_row, count_row + w, 0);
  count_row[0] = rows + 1;
  if (rows > 0) {
    std::memcpy(items.Row(1), merged.rows, static_cast<std::size_t>(rows) * w * sizeof(int32_t));
  }
  items.Truncate(rows + 1);
}

}  // namespace qm
