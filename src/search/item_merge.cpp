#include "search/item_merge.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <utility>

namespace qm {

namespace {

int32_t AddScores(int64_t sum) {
  return static_cast<int32_t>(std::clamp<int64_t>(sum, std::numeric_limits<int32_t>::min(),
                                                  std::numeric_limits<int32_t>::max()));
}

// Writes result rows straight into an array sized once for the most rows the
// operation can produce; Finish() sets the count row.
class ResultWriter {
 public:
  ResultWriter(const CColumnSet& columns, int64_t most_rows)
      : items_(columns), width_(items_.Width()) {
    const auto rows = static_cast<int32_t>(std::max<int64_t>(1, most_rows));
    items_.AllocateMemoryForce(rows);
    items_.SetItemOption(rows - 1, ItemKind::Key, 0);
    next_ = items_.Row(1 % rows);
    limit_ = rows;
  }
  int32_t Rows() const { return count_; }
  bool Full() const { return count_ + 1 >= limit_; }
  int32_t* Add(const int32_t* row) {
    int32_t* at = next_;
    std::memcpy(at, row, sizeof(int32_t) * static_cast<std::size_t>(width_));
    next_ += width_;
    ++count_;
    return at;
  }
  CItems Finish() {
    items_.Truncate(count_ + 1);
    items_.Row(0)[0] = count_ + 1;
    return std::move(items_);
  }

 private:
  CItems items_;
  int32_t width_;
  int32_t* next_ = nullptr;
  int32_t limit_ = 0;
  int32_t count_ = 0;
};

// The rows of a result array after its count row.
struct RowRange {
  const int32_t* at;
  int32_t rows;
  int32_t width;
  const int32_t* Row(int32_t i) const { return at + static_cast<std::ptrdiff_t>(i) * width; }
};

RowRange DataRows(const CItems& items) {
  const int32_t rows = ResultRows(items);
  return {rows > 0 ? items.Row(1) : nullptr, rows, items.Width()};
}

struct Columns {
  int score = -1;     // -1: none
  int position = -1;  // -1: none
  explicit Columns(const CColumnSet& set) {
    if (set.s != 0) score = set.ScoreColumn();
    if (set.p != 0) position = set.PositionColumn();
  }
};

// The first row from `from` on whose key is not below key: a galloping
// search, so a short list meets a long one in far fewer steps than rows.
int32_t FirstNotBelow(const RowRange& r, int32_t from, int32_t key) {
  int32_t step = 1;
  int32_t low = from;  // r.Row(low)[0] < key
  int32_t high = from + 1;
  while (high < r.rows && r.Row(high)[0] < key) {
    low = high;
    step *= 2;
    high = static_cast<int32_t>(std::min<int64_t>(int64_t{high} + step, r.rows));
  }
  // r.Row(low) is below key; r.Row(high) is not (or high == r.rows).
  while (high - low > 1) {
    const int32_t middle = low + (high - low) / 2;
    (r.Row(middle)[0] < key ? low : high) = middle;
  }
  return high;
}

// FILTER, AND NOT, FILTER NOT and AND: left rows kept by whether their key
// occurs on the right. right_words > 0: the right rows are a condition's rows
// before ReduceItems, and AND adds the score that reduction would give the
// key's rows, computed for the keys met only.
CItems KeepByRightKeys(const CItems& left, const CItems& right, bool keep_present, bool add_scores,
                       int32_t right_words = 0) {
  const RowRange l = DataRows(left);
  const RowRange r = DataRows(right);
  const Columns c(left.Columns());
  const Columns rc(right.Columns());
  ResultWriter out(left.Columns(), int64_t{l.rows} + 1);
  int32_t j = 0;
  for (int32_t i = 0; i < l.rows; ++i) {
    const int32_t key = l.Row(i)[0];
    if (j < r.rows && r.Row(j)[0] < key) j = FirstNotBelow(r, j, key);
    const bool present = j < r.rows && r.Row(j)[0] == key;
    if (present != keep_present) continue;
    int32_t* row = out.Add(l.Row(i));
    if (!present || !add_scores || c.score < 0 || rc.score < 0) continue;
    int64_t right_score = r.Row(j)[rc.score];
    if (right_words > 0) {
      int64_t best = right_score;
      int32_t end = j + 1;
      for (; end < r.rows && r.Row(end)[0] == key; ++end) {
        best = std::max<int64_t>(best, r.Row(end)[rc.score]);
      }
      right_score = 200 / right_words + int64_t{end - j} + best;
    }
    row[c.score] = AddScores(int64_t{row[c.score]} + right_score);
  }
  return out.Finish();
}

CItems MergeOr(const CItems& left, const CItems& right, MergeLimit& limit) {
  const RowRange l = DataRows(left);
  const RowRange r = DataRows(right);
  const Columns c(left.Columns());
  const int64_t most = int64_t{l.rows} + r.rows + 1;
  ResultWriter out(left.Columns(),
                   limit.max_rows > 0 ? std::min<int64_t>(most, limit.max_rows) : most);
  int32_t i = 0;
  int32_t j = 0;
  while (i < l.rows || j < r.rows) {
    if (limit.max_rows > 0 && out.Full()) {
      limit.truncated = true;
      break;
    }
    if (j >= r.rows || (i < l.rows && l.Row(i)[0] < r.Row(j)[0])) {
      out.Add(l.Row(i++));
    } else if (i >= l.rows || r.Row(j)[0] < l.Row(i)[0]) {
      out.Add(r.Row(j++));
    } else {
      int32_t* row = out.Add(l.Row(i));
      if (c.score >= 0) row[c.score] = AddScores(int64_t{row[c.score]} + r.Row(j)[c.score]);
      ++i;
      ++j;
    }
  }
  return out.Finish();
}

CItems MergeAdjacent(const CItems& left, const CItems& right, int32_t word_count) {
  const RowRange l = DataRows(left);
  const RowRange r = DataRows(right);
  const Columns c(left.Columns());
  ResultWriter out(left.Columns(), int64_t{std::min(l.rows, r.rows)} + 1);
  const int32_t bonus = 200 / word_count;
  int32_t i = 0;
  int32_t j = 0;
  while (i < l.rows && j < r.rows) {
    const int32_t* a = l.Row(i);
    const int32_t* b = r.Row(j);
    if (a[0] != b[0]) {
      (a[0] < b[0] ? i : j)++;
      continue;
    }
    const int64_t wanted = int64_t{b[c.position]} - 1;
    if (a[c.position] == wanted) {
      int32_t* row = out.Add(a);
      if (c.score >= 0) row[c.score] = AddScores(int64_t{a[c.score]} + b[c.score] + bonus);
      ++i;
      ++j;
    } else if (a[c.position] < wanted) {
      ++i;
    } else {
      ++j;
    }
  }
  return out.Finish();
}

// NEAR and proximity. A pair too far apart advances only the side that lies
// behind, so a later occurrence on that side can still meet the other one.
CItems MergeNear(const CItems& left, const CItems& right, int32_t distance, int32_t word_count,
                 MergeLimit& limit) {
  const RowRange l = DataRows(left);
  const RowRange r = DataRows(right);
  const Columns c(left.Columns());
  const bool copy_unmatched = distance == -1;
  const int64_t most = int64_t{l.rows} + r.rows + 1;
  ResultWriter out(left.Columns(),
                   limit.max_rows > 0 ? std::min<int64_t>(most, limit.max_rows) : most);
  const int32_t adjacent_bonus = 200 / word_count;
  int32_t i = 0;
  int32_t j = 0;
  auto full = [&] {
    if (limit.max_rows > 0 && out.Full()) {
      limit.truncated = true;
      return true;
    }
    return false;
  };
  auto keep = [&](const int32_t* row, int64_t score) {
    int32_t* kept = out.Add(row);
    if (c.score >= 0) kept[c.score] = AddScores(score);
  };
  while (i < l.rows && j < r.rows) {
    const int32_t* a = l.Row(i);
    const int32_t* b = r.Row(j);
    if (a[0] != b[0]) {
      const bool left_behind = a[0] < b[0];
      if (copy_unmatched) {
        if (full()) return out.Finish();
        out.Add(left_behind ? a : b);
      }
      (left_behind ? i : j)++;
      continue;
    }
    if (c.position < 0) {
      ++i;
      ++j;
      continue;
    }
    if (full()) return out.Finish();
    const int64_t d = int64_t{a[c.position]} - (int64_t{b[c.position]} - 1);
    const int64_t both = c.score >= 0 ? int64_t{a[c.score]} + b[c.score] : 0;
    const int64_t near_bonus = std::max<int64_t>(0, (25 - std::llabs(d)) * 2 / word_count);
    const bool close = distance < 1 || std::llabs(d) <= distance;
    if (d == 0) {
      keep(a, both + adjacent_bonus);
      ++i;
      ++j;
    } else if (d < 0) {
      if (close) keep(a, both + near_bonus);
      ++i;
    } else {
      if (close) keep(b, both + near_bonus);
      ++j;
    }
  }
  if (copy_unmatched) {
    for (; i < l.rows; ++i) {
      if (full()) break;
      out.Add(l.Row(i));
    }
    for (; j < r.rows; ++j) {
      if (full()) break;
      out.Add(r.Row(j));
    }
  }
  return out.Finish();
}

}  // namespace

CItems KeepByCondition(const CItems& left, const CItems& right, int32_t code, int32_t right_words) {
  switch (code) {
    case 1:
      return KeepByRightKeys(left, right, true, true, std::max(1, right_words));
    case 4:
      return KeepByRightKeys(left, right, true, false);
    default:
      return KeepByRightKeys(left, right, false, false);
  }
}

int32_t ResultRows(const CItems& items) { return std::max(0, items.Count() - 1); }

CItems EmptyResult(const CColumnSet& columns) {
  ResultWriter out(columns, 1);
  return out.Finish();
}

void StampCount(CItems& items) {
  if (items.Count() == 0) items.SetItemOption(0, ItemKind::Key, 0);
  items.Row(0)[0] = items.Count();
}

CItems MergeResults(const CItems& left, const CItems& right, int32_t code, int32_t distance,
                    int32_t word_count, MergeLimit& limit) {
  word_count = std::max(1, word_count);
  switch (code) {
    case 1:
      return KeepByRightKeys(left, right, true, true);
    case 4:
      return KeepByRightKeys(left, right, true, false);
    case 8:
    case 9:
      return KeepByRightKeys(left, right, false, false);
    case 2:
      return MergeOr(left, right, limit);
    case 6:
      return MergeAdjacent(left, right, word_count);
    case 7:
    case 11:
      return MergeNear(left, right, distance, word_count, limit);
    default:
      return EmptyResult(left.Columns());
  }
}

void ReduceItems(CItems& items, int32_t word_count) {
  word_count = std::max(1, word_count);
  const Columns c(items.Columns());
  const int32_t rows = ResultRows(items);
  if (rows > 0) {
    const auto w = static_cast<std::size_t>(items.Width());
    int32_t* out = items.Row(1);
    const int32_t* at = out;
    const int32_t* end = at + static_cast<std::size_t>(rows) * w;
    int32_t kept = 0;
    while (at < end) {
      const int32_t key = at[0];
      int64_t best = c.score >= 0 ? at[c.score] : 0;
      const int32_t* next = at + w;
      for (; next < end && next[0] == key; next += w) {
        if (c.score >= 0) best = std::max<int64_t>(best, next[c.score]);
      }
      // The key's last row; out never passes it, so the copy cannot overlap.
      const int32_t* last = next - w;
      if (out != last) {
        for (std::size_t k = 0; k < w; ++k) out[k] = last[k];
      }
      if (c.score >= 0) {
        out[c.score] =
            AddScores(200 / word_count + (next - at) / static_cast<std::ptrdiff_t>(w) + best);
      }
      out += w;
      ++kept;
      at = next;
    }
    items.Truncate(kept + 1);
  }
  if (items.Count() > 0) StampCount(items);
}

void RemoveKeys(CItems& items, std::span<const int32_t> deleted,
                const std::function<void(int32_t key)>& met) {
  const int32_t rows = ResultRows(items);
  const auto w = static_cast<std::size_t>(items.Width());
  std::size_t d = 0;
  int32_t kept = 0;
  int32_t last_met = 0;
  bool any_met = false;
  for (int32_t i = 0; i < rows; ++i) {
    const int32_t key = items.Row(i + 1)[0];
    while (d < deleted.size() && deleted[d] < key) ++d;
    if (d < deleted.size() && deleted[d] == key) {
      if (!any_met || last_met != key) met(key);
      any_met = true;
      last_met = key;
      continue;
    }
    if (kept != i) std::memmove(items.Row(kept + 1), items.Row(i + 1), sizeof(int32_t) * w);
    ++kept;
  }
  if (items.Count() > 0) {
    items.Truncate(kept + 1);
    StampCount(items);
  }
}

}  // namespace qm
