#include "search/item_runs.h"

#include <algorithm>
#include <cstring>
#include <limits>
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

void MergeRuns(CItems& items) {
  const std::vector<Run> runs = RunsOf(items);
  if (runs.size() <= 1) return;
  const int32_t width = items.Width();
  const bool positions = items.Columns().p != 0;
  const bool scores = items.Columns().s != 0;
  const int32_t position_column = items.Columns().PositionColumn();
  const auto w = static_cast<std::size_t>(width);

  // Segments of rows (without count rows), merged neighbour with neighbour,
  // pass after pass, until one is left.
  std::vector<std::vector<int32_t>> segments;
  segments.reserve(runs.size());
  for (const Run& run : runs) {
    segments.emplace_back(items.Row(run.first), items.Row(run.first) + (run.end - run.first) * w);
  }
  while (segments.size() > 1) {
    std::vector<std::vector<int32_t>> next;
    next.reserve((segments.size() + 1) / 2);
    for (std::size_t s = 0; s + 1 < segments.size(); s += 2) {
      const std::vector<int32_t>& left = segments[s];
      const std::vector<int32_t>& right = segments[s + 1];
      std::vector<int32_t> out;
      out.reserve(left.size() + right.size());
      std::size_t l = 0;
      std::size_t r = 0;
      while (l < left.size() && r < right.size()) {
        const int32_t* a = left.data() + l;
        const int32_t* b = right.data() + r;
        bool take_left;
        if (a[0] != b[0]) {
          take_left = a[0] < b[0];
        } else if (positions) {
          take_left = a[position_column] <= b[position_column];
        } else {
          // One row per key: the left one, scores added.
          out.insert(out.end(), a, a + w);
          if (scores) {
            int32_t& score = out[out.size() - w + static_cast<std::size_t>(items.Columns().ScoreColumn())];
            score = SaturatingAdd(score, b[items.Columns().ScoreColumn()]);
          }
          l += w;
          r += w;
          continue;
        }
        if (take_left) {
          out.insert(out.end(), a, a + w);
          l += w;
        } else {
          out.insert(out.end(), b, b + w);
          r += w;
        }
      }
      out.insert(out.end(), left.begin() + static_cast<std::ptrdiff_t>(l), left.end());
      out.insert(out.end(), right.begin() + static_cast<std::ptrdiff_t>(r), right.end());
      next.push_back(std::move(out));
    }
    if (segments.size() % 2 == 1) next.push_back(std::move(segments.back()));
    segments = std::move(next);
  }

  // The merged rows never outnumber the rows they came from.
  const std::vector<int32_t>& merged = segments.front();
  const auto rows = static_cast<int32_t>(merged.size() / w);
  int32_t* count_row = items.Row(0);
  std::fill(count_row, count_row + w, 0);
  count_row[0] = rows + 1;
  if (!merged.empty()) std::memcpy(items.Row(1), merged.data(), merged.size() * sizeof(int32_t));
  items.Truncate(rows + 1);
}

}  // namespace qm
