#include "search/rowset_order.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <utility>

#include "base/exception_family.h"
#include "base/plain_name.h"
#include "config/global_defs.h"
#include "format/order_layout.h"
#include "platform/text_encoding.h"
#include "search/attached_value.h"
#include "search/gi_order.h"

namespace qm {

namespace {

constexpr int32_t kBadDirection = 59;
constexpr int32_t kNoScoreSupport = 60;
constexpr int32_t kNoOrderColumn = 61;
constexpr int32_t kScoreColumn = 1;
// The maximum score is at least this much per condition part of command 1.
constexpr int32_t kScorePerPart = 200;
constexpr const char* kRepositoryPrefix = "_R_";

constexpr const char* kRoundText =
    "Error rounding score. The index does not support ordering by score. Please create the index "
    "with the SCORE keyword to support ordering by score.";
constexpr const char* kAdjustText =
    "Error adjusting score. The index does not support ordering by score. Please create the "
    "index with the SCORE keyword to support ordering by score.";

template <class Body>
decltype(auto) GuardRowset(const char* method, Body&& body) {
  return Guard<CGiTreeRowsetException, CGiTreeRowsetUnknownException>(method,
                                                                       std::forward<Body>(body));
}

std::string_view TrimBlanks(std::string_view text) {
  const auto first = text.find_first_not_of(" \t\r\n");
  if (first == std::string_view::npos) return {};
  const auto last = text.find_last_not_of(" \t\r\n");
  return text.substr(first, last - first + 1);
}

int32_t ResultRows(const CItems& rows) {
  return std::max(rows.Count() - CGiRowsetOrder::kFirstRow, 0);
}

bool CarriesScores(const CItems& rows) { return rows.Columns().s == 1; }

// -1 when a sorts before b by the keys, 0 when they tie, 1 otherwise.
int CompareRows(const int32_t* a, const int32_t* b, const std::vector<SortColumn>& keys) {
  for (const SortColumn& key : keys) {
    const int32_t x = a[key.column];
    const int32_t y = b[key.column];
    if (x != y) return (x < y) != key.descending ? -1 : 1;
  }
  return 0;
}

// Bottom-up merge sort of n rows of width integers: runs of 1, 2, 4, ...
// rows merged pairwise through a second buffer; on a tie the second run's
// row goes first.
void MergeSort(int32_t* data, int32_t n, std::size_t width, const std::vector<SortColumn>& keys) {
  std::vector<int32_t> buffer(static_cast<std::size_t>(n) * width);
  int32_t* from = data;
  int32_t* to = buffer.data();
  for (int64_t run = 1; run < n; run *= 2) {
    for (int64_t lo = 0; lo < n; lo += 2 * run) {
      const int64_t mid = std::min<int64_t>(lo + run, n);
      const int64_t hi = std::min<int64_t>(lo + 2 * run, n);
      int64_t a = lo;
      int64_t b = mid;
      int32_t* out = to + lo * width;
      while (a < mid && b < hi) {
        const int32_t* left = from + a * width;
        const int32_t* right = from + b * width;
        if (CompareRows(left, right, keys) < 0) {
          out = std::copy_n(left, width, out);
          ++a;
        } else {
          out = std::copy_n(right, width, out);
          ++b;
        }
      }
      out = std::copy(from + a * width, from + mid * width, out);
      std::copy(from + b * width, from + hi * width, out);
    }
    std::swap(from, to);
  }
  if (from != data) std::copy_n(from, static_cast<std::size_t>(n) * width, data);
}

// The same order for one or two sort keys, faster: that merge puts rows of
// equal sort values in the reverse of their order before the sort, so the
// rows sort by their sort values packed into 64 bits, then by their
// position from the end.
void PackedSort(int32_t* data, int32_t n, std::size_t width, const std::vector<SortColumn>& keys) {
  struct Entry {
    uint64_t values;
    uint32_t from_end;
    bool operator<(const Entry& o) const {
      return values != o.values ? values < o.values : from_end < o.from_end;
    }
  };
  // Signed order as unsigned order; a descending key inverted.
  const auto packed = [](const SortColumn& key, const int32_t* row) -> uint64_t {
    const uint32_t v = static_cast<uint32_t>(row[key.column]) ^ 0x80000000u;
    return key.descending ? uint32_t{~v} : v;
  };
  std::vector<int32_t> sorted(static_cast<std::size_t>(n) * width);
  int32_t* out = sorted.data();
  if (keys.size() == 1) {
    // One key: the value and the position from the end in one integer.
    std::vector<uint64_t> packed_rows(static_cast<std::size_t>(n));
    for (int32_t i = 0; i < n; ++i) {
      packed_rows[static_cast<std::size_t>(i)] =
          (packed(keys[0], data + static_cast<std::size_t>(i) * width) << 32) |
          static_cast<uint32_t>(n - 1 - i);
    }
    std::sort(packed_rows.begin(), packed_rows.end());
    for (const uint64_t p : packed_rows) {
      const auto from = static_cast<std::size_t>(n - 1) - static_cast<uint32_t>(p);
      out = std::copy_n(data + from * width, width, out);
    }
    std::copy(sorted.begin(), sorted.end(), data);
    return;
  }
  std::vector<Entry> entries(static_cast<std::size_t>(n));
  for (int32_t i = 0; i < n; ++i) {
    const int32_t* row = data + static_cast<std::size_t>(i) * width;
    uint64_t values = 0;
    for (const SortColumn& key : keys) values = (values << 32) | (packed(key, row) & 0xFFFFFFFFu);
    entries[static_cast<std::size_t>(i)] = {values, static_cast<uint32_t>(n - 1 - i)};
  }
  std::sort(entries.begin(), entries.end());
  for (const Entry& e : entries) {
    const auto from = static_cast<std::size_t>(n - 1) - e.from_end;
    out = std::copy_n(data + from * width, width, out);
  }
  std::copy(sorted.begin(), sorted.end(), data);
}

int32_t ClampScore(double score) {
  if (std::isnan(score) || score <= 0) return 0;
  if (score >= static_cast<double>(std::numeric_limits<int32_t>::max())) {
    return std::numeric_limits<int32_t>::max();
  }
  return static_cast<int32_t>(std::trunc(score));
}

// The header's column layouts place every value inside the stored rows, one
// after the other, in the slots its type takes; a damaged header must not
// make the attach read outside them.
void RequireSoundLayout(const COrderInfo& info, const std::string& name) {
  const bool ranks = info.OrderType == kOrderTypeRanks;
  bool sound = (ranks || info.OrderType == kOrderTypeValues) && !info.Columns.empty();
  int32_t next = 1;
  for (const OrderColumn& c : info.Columns) {
    if (!sound) break;
    const OrderColumnLayout layout = OrderColumnLayout::Of(c);
    const auto code = static_cast<int32_t>(layout.type);
    const bool known = code == 1 || code == 2 || code == 3 || code == 4 || code == 6;
    sound = known && layout.first == next &&
            layout.slots == (ranks ? 1 : ValueSlots(layout.type)) && (ranks || !IsTextType(layout.type));
    next += layout.slots;
  }
  if (!sound) {
    throw CGiOrderException::Text("Order %s is damaged: its header does not describe its rows",
                                  "AttachOrder", nullptr, name);
  }
}

}  // namespace

CGiRowsetOrder::CGiRowsetOrder(const CGlobalDefs& defs) : defs_(defs) {}

CGiRowsetOrder::~CGiRowsetOrder() = default;

void CGiRowsetOrder::Reset(std::string_view key_column) {
  attached_.clear();
  registry_.Clear();
  sort_keys_.clear();
  sql_order_ = std::string(key_column) + " ASC";
  add_order_clause_ = false;
  score_active_ = false;
  reverse_ = false;
  max_known_ = false;
  max_score_ = 0;
  DropGroups();
}

void CGiRowsetOrder::DropGroups() {
  collected_ = false;
  representatives_.clear();
  counts_.clear();
  cursor_ = 0;
  end_of_groups_ = true;
  num_groups_ = 0;
}

void CGiRowsetOrder::SetOrder(CItems& rows, std::string_view list, bool add_order_clause,
                              const RowsetOrderContext& context) {
  constexpr const char* kMethod = "SetOrder";
  GuardRowset(kMethod, [&] {
    if (context.score_group_count > 0) RoundScore(rows, context);
    const std::string upper = ToUpper(TrimBlanks(list));

    if (upper == "REVERSE") {
      std::string flipped;
      std::string_view rest = sql_order_;
      while (!rest.empty()) {
        const auto comma = rest.find(',');
        std::string item(rest.substr(0, comma));
        rest = comma == std::string_view::npos ? std::string_view{} : rest.substr(comma + 1);
        if (item.ends_with(" ASC")) {
          item.replace(item.size() - 4, 4, " DESC");
        } else if (item.ends_with(" DESC")) {
          item.replace(item.size() - 5, 5, " ASC");
        }
        flipped += (flipped.empty() ? "" : ",") + item;
      }
      sql_order_ = std::move(flipped);
      for (SortColumn& key : sort_keys_) key.descending = !key.descending;
      reverse_ = true;
      return;
    }

    // Built aside: a list that fails leaves the order as it was.
    std::vector<SortColumn> keys;
    std::string sql;
    bool score_active = false;
    std::string_view rest = upper;
    while (!rest.empty()) {
      const auto comma = rest.find(',');
      const std::string_view item = TrimBlanks(rest.substr(0, comma));
      rest = comma == std::string_view::npos ? std::string_view{} : rest.substr(comma + 1);
      if (item.empty()) continue;
      const auto blank = item.find(' ');
      const std::string_view column = item.substr(0, blank);
      const std::string_view direction =
          blank == std::string_view::npos ? std::string_view{} : TrimBlanks(item.substr(blank));
      bool descending = false;
      if (direction.empty()) {
        descending = column == "SCORE";
      } else if (direction == "DESC") {
        descending = true;
      } else if (direction != "ASC") {
        throw CGiTreeRowsetException::Numbered(kBadDirection, kMethod, nullptr);
      }
      const char* written = descending ? " DESC," : " ASC,";

      if (column == "SCORE") {
        if (!context.score_support || !CarriesScores(rows)) {
          throw CGiTreeRowsetException::Numbered(kNoScoreSupport, kMethod, nullptr);
        }
        keys.push_back({kScoreColumn, descending});
        sql += std::string("SCORE") + written;
        score_active = true;
      } else if (column == "KEY") {
        keys.push_back({0, descending});
        sql += context.key_column + written;
      } else {
        const AttachedColumn* attached = nullptr;
        try {
          attached = &AttachOrder(rows, column);
        } catch (const CExceptionBase& e) {
          throw CGiTreeRowsetException::Numbered(kNoOrderColumn, kMethod, &e);
        }
        for (int32_t i = 0; i < attached->slots; ++i) {
          keys.push_back({attached->first + i, descending});
        }
        sql += std::string(column) + written;
      }
    }
    if (!sql.empty()) sql.pop_back();
    sort_keys_ = std::move(keys);
    sql_order_ = std::move(sql);
    score_active_ = score_active;
    reverse_ = false;
    add_order_clause_ = add_order_clause;
    DropGroups();
  });
}

const AttachedColumn& CGiRowsetOrder::AttachOrder(CItems& rows, std::string_view order_column) {
  constexpr const char* kMethod = "AttachOrder";
  return GuardRowset(kMethod, [&]() -> const AttachedColumn& {
    const std::string wanted = ToUpper(TrimBlanks(order_column));
    const auto dot = wanted.find('.');
    if (dot == std::string::npos) {
      throw CGiTreeRowsetException::Text(
          "Order column %s is not written ORDER.COLUMN", kMethod, nullptr, ShowName(wanted));
    }
    const std::string order = wanted.substr(0, dot);
    const std::string column = wanted.substr(dot + 1);
    RequirePlainName<CGiTreeRowsetException>("order", order, kMethod);

    // Rows of another width are not the rows the orders were attached to.
    if (!attached_.empty() && rows.Width() != attached_width_) {
      attached_.clear();
      registry_.Clear();
    }
    if (attached_.contains(order)) {
      if (const AttachedColumn* known = registry_.Find(wanted)) return *known;
      throw CGiTreeRowsetException::Text("Column %S is not prepared for order", kMethod, nullptr,
                                         column);
    }

    auto file = std::make_unique<CGiOrder>(defs_);
    std::string name = order;
    if (!file->Exists(order) && file->Exists(kRepositoryPrefix + order)) {
      name = kRepositoryPrefix + order;
    }
    file->OpenOrder(name, CGiOrder::kModeRead);
    if (!file->HasColumn(column)) {
      throw CGiTreeRowsetException::Text("Column %S is not prepared for order", kMethod, nullptr,
                                         column);
    }

    const COrderInfo& info = file->Info();
    RequireSoundLayout(info, name);
    CItems stored(1);
    file->ReadRows(stored);
    const bool ranks = info.OrderType == kOrderTypeRanks;
    const int32_t base = rows.Width();
    const int32_t extra = StoredRowWidth(info) - 1;
    if (rows.Columns().b + extra > 0xFFFF) {
      throw CGiTreeRowsetException::Text("Order %s cannot be attached: the rows would be too wide",
                                         kMethod, nullptr, name);
    }
    std::vector<AttachedColumn> added;
    for (const OrderColumn& c : info.Columns) {
      const OrderColumnLayout layout = OrderColumnLayout::Of(c);
      AttachedColumn attached{order + "." + ToUpper(c.Name), layout.type, ranks,
                              base + layout.first - 1, layout.slots, {}, {}};
      if (ranks && !IsTextType(layout.type)) TakeRankValues(attached, file->ReadColumnValues(c));
      added.push_back(std::move(attached));
    }

    // The rows widened by the order's columns; a key the order lacks gets NULLs.
    CColumnSet set = rows.Columns();
    set.b = static_cast<uint16_t>(set.b + extra);
    CItems widened(set);
    widened.AllocateMemory(rows.Count());
    std::vector<int32_t> row(static_cast<std::size_t>(base + extra));
    const int32_t stored_count = stored.Count();
    for (int32_t i = 0; i < rows.Count(); ++i) {
      std::copy_n(rows.Row(i), base, row.begin());
      std::fill(row.begin() + base, row.end(), 0);
      if (i >= kFirstRow) {
        const int32_t key = rows.Key(i);
        int32_t lo = 0;
        int32_t hi = stored_count;
        while (lo < hi) {
          const int32_t mid = lo + (hi - lo) / 2;
          if (stored.Key(mid) < key) lo = mid + 1; else hi = mid;
        }
        const bool found = lo < stored_count && stored.Key(lo) == key;
        for (const AttachedColumn& c : added) {
          int32_t* out = row.data() + c.first;
          if (found) {
            ToSortable(c, stored.Row(lo) + (c.first - base + 1), out);
          } else {
            SortableNull(c, out);
          }
        }
      }
      widened.InsertItem(row);
    }
    rows = std::move(widened);
    for (AttachedColumn& c : added) registry_.Register(std::move(c));
    attached_.emplace(order, std::move(file));
    attached_width_ = rows.Width();
    DropGroups();
    return *registry_.Find(wanted);
  });
}

void CGiRowsetOrder::SortItems(CItems& rows, const RowsetOrderContext& context) {
  GuardRowset("SortItems", [&] {
    DropGroups();
    if (reverse_) {
      ReverseItems(rows);
      reverse_ = false;
      return;
    }
    const int32_t n = ResultRows(rows);
    const auto width = static_cast<std::size_t>(rows.Width());
    RequireSortColumns(rows, "SortItems");
    if (n >= 2) {
      if (sort_keys_.size() <= 2) {
        PackedSort(rows.Row(kFirstRow), n, width, sort_keys_);
      } else {
        MergeSort(rows.Row(kFirstRow), n, width, sort_keys_);
      }
    }
    KeepMaxScore(rows, context);
  });
}

void CGiRowsetOrder::KeepMaxScore(const CItems& rows, const RowsetOrderContext& context) {
  max_known_ = true;
  max_score_ = 0;
  if (!CarriesScores(rows) || ResultRows(rows) == 0) return;
  for (int32_t i = kFirstRow; i < rows.Count(); ++i) {
    max_score_ = std::max(max_score_, rows.Row(i)[kScoreColumn]);
  }
  const int64_t floor = int64_t{kScorePerPart} * context.part_count;
  max_score_ = static_cast<int32_t>(std::clamp<int64_t>(floor, max_score_, INT32_MAX));
}

void CGiRowsetOrder::RequireSortColumns(const CItems& rows, const char* method) const {
  for (const SortColumn& key : sort_keys_) {
    if (key.column >= rows.Width()) {
      throw CGiTreeRowsetException::Text("The rows lack sort column %i: order them anew", method,
                                         nullptr, key.column);
    }
  }
}

void CGiRowsetOrder::ReverseItems(CItems& rows) {
  GuardRowset("ReverseItems", [&] {
    DropGroups();
    const int32_t n = ResultRows(rows);
    const auto width = static_cast<std::size_t>(rows.Width());
    for (int32_t i = 0, j = n - 1; i < j; ++i, --j) {
      std::swap_ranges(rows.Row(kFirstRow + i), rows.Row(kFirstRow + i) + width,
                       rows.Row(kFirstRow + j));
    }
  });
}

void CGiRowsetOrder::CollectItems(const CItems& rows) {
  GuardRowset("CollectItems", [&] {
    DropGroups();
    RequireSortColumns(rows, "CollectItems");
    const int32_t n = ResultRows(rows);
    const std::size_t levels = sort_keys_.size();
    std::vector<int32_t> running(levels, 1);
    const auto close = [&](int32_t row, std::size_t from_level) {
      representatives_.push_back(row);
      for (std::size_t level = 0; level < levels; ++level) {
        counts_.push_back(level >= from_level ? running[level] : 0);
        if (level >= from_level) running[level] = 0;
      }
    };
    for (int32_t i = kFirstRow + 1; i < kFirstRow + n; ++i) {
      const int32_t differs = rows.FirstDifference(i, rows.Row(i - 1), sort_keys_);
      if (differs >= 0) close(i - 1, static_cast<std::size_t>(differs));
      for (int32_t& count : running) ++count;
    }
    if (n > 0) close(kFirstRow + n - 1, 0);
    collected_ = true;
    cursor_ = 1;
    end_of_groups_ = representatives_.empty();
  });
}

void CGiRowsetOrder::MoveNext() {
  // At the last group the cursor stays and the end is flagged, so a loop
  // that reads until IsEOB reads every group.
  if (cursor_ < GetTotalGroups()) {
    ++cursor_;
  } else {
    end_of_groups_ = true;
  }
}

void CGiRowsetOrder::MovePrev() {
  if (cursor_ > 1) {
    --cursor_;
    end_of_groups_ = false;
  }
}

int32_t CGiRowsetOrder::CurrentRow(const char* method) const {
  if (cursor_ > GetTotalGroups()) {
    throw CGiTreeRowsetException::Text("Out of bound", method, nullptr);
  }
  if (!collected_) {
    throw CGiTreeRowsetException::Text("Result set has not been collected", method, nullptr);
  }
  return representatives_[static_cast<std::size_t>(cursor_ - 1)];
}

CGiRowsetOrder::Target CGiRowsetOrder::Resolve(const CItems& rows, std::string_view column,
                                               const RowsetOrderContext& context,
                                               const char* method) const {
  const std::string name = ToUpper(TrimBlanks(column));
  Target target;
  int32_t last = 0;
  if (name == "SCORE") {
    if (!CarriesScores(rows)) {
      throw CGiTreeRowsetException::Text("The result rows carry no score", method, nullptr);
    }
    target.column = last = kScoreColumn;
  } else if (name == "KEY" || (!context.key_column.empty() && name == ToUpper(context.key_column))) {
    target.column = last = 0;
  } else {
    if (!collected_) {
      throw CGiTreeRowsetException::Text("Result set has not been collected", method, nullptr);
    }
    target.attached = registry_.Find(name);
    if (target.attached == nullptr) {
      throw CGiTreeRowsetException::Text("Group name not found", method, nullptr);
    }
    target.column = target.attached->first;
    last = target.attached->first + target.attached->slots - 1;
    if (last >= rows.Width()) throw CGiTreeRowsetException::General(method);
  }
  // The column's level: the sort key of its last slot (a value of two
  // slots is one value only when both agree).
  for (std::size_t i = 0; i < sort_keys_.size(); ++i) {
    if (sort_keys_[i].column == last) target.level = static_cast<int32_t>(i);
  }
  return target;
}

int32_t CGiRowsetOrder::RequireLevel(const Target& target, std::string_view column,
                                     const char* method) const {
  if (target.level < 0) {
    throw CGiTreeRowsetException::Text("Column %s is not ordered", method, nullptr,
                                       ShowName(column));
  }
  return target.level;
}

int32_t CGiRowsetOrder::GetValue(const CItems& rows, std::string_view column,
                                 const RowsetOrderContext& context) const {
  constexpr const char* kMethod = "GetValue";
  return GuardRowset(kMethod, [&] {
    const int32_t row = CurrentRow(kMethod);
    const Target target = Resolve(rows, column, context, kMethod);
    const int32_t* columns = rows.Row(row) + target.column;
    return target.attached != nullptr ? GroupValue(*target.attached, columns) : *columns;
  });
}

int32_t CGiRowsetOrder::GetCount(const CItems& rows, std::string_view column,
                                 const RowsetOrderContext& context) const {
  constexpr const char* kMethod = "GetCount";
  return GuardRowset(kMethod, [&] {
    CurrentRow(kMethod);
    const int32_t level = RequireLevel(Resolve(rows, column, context, kMethod), column, kMethod);
    return counts_[static_cast<std::size_t>(cursor_ - 1) * sort_keys_.size() +
                   static_cast<std::size_t>(level)];
  });
}

std::vector<int32_t> CGiRowsetOrder::WindowGroups(int32_t level, int32_t first,
                                                  int32_t num) const {
  const int32_t total = GetTotalGroups();
  const int32_t start = std::max(first, 1);
  const int64_t end = num > 0 ? std::min<int64_t>(int64_t{start} + num - 1, total) : total;
  std::vector<int32_t> groups;
  for (int64_t g = start; g <= end; ++g) {
    const auto index = static_cast<std::size_t>(g - 1);
    if (counts_[index * sort_keys_.size() + static_cast<std::size_t>(level)] != 0) {
      groups.push_back(static_cast<int32_t>(index));
    }
  }
  return groups;
}

std::string CGiRowsetOrder::GetGroupString(const CItems& rows, std::string_view column,
                                           const RowsetOrderContext& context, int32_t first,
                                           int32_t num) const {
  constexpr const char* kMethod = "GetGroupString";
  return GuardRowset(kMethod, [&] {
    CurrentRow(kMethod);
    const Target target = Resolve(rows, column, context, kMethod);
    const int32_t level = RequireLevel(target, column, kMethod);
    std::string text = "(";
    for (const int32_t g : WindowGroups(level, first, num)) {
      const int32_t* columns = rows.Row(representatives_[static_cast<std::size_t>(g)]) + target.column;
      if (text.size() > 1) text += ',';
      text += target.attached != nullptr ? GroupText(*target.attached, columns)
                                         : std::to_string(*columns);
    }
    return text + ")";
  });
}

std::string CGiRowsetOrder::GetGroupKeyString(const CItems& rows, std::string_view column,
                                              const RowsetOrderContext& context, int32_t first,
                                              int32_t num) {
  constexpr const char* kMethod = "GetGroupString";
  return GuardRowset(kMethod, [&] {
    num_groups_ = 0;
    if (!collected_) {
      throw CGiTreeRowsetException::Text("Result set has not been collected", kMethod, nullptr);
    }
    const int32_t level = RequireLevel(Resolve(rows, column, context, kMethod), column, kMethod);
    const std::vector<int32_t> groups = WindowGroups(level, first, num);
    std::string keys = "(";
    for (const int32_t g : groups) {
      const int32_t last = representatives_[static_cast<std::size_t>(g)];
      const int32_t count = counts_[static_cast<std::size_t>(g) * sort_keys_.size() +
                                    static_cast<std::size_t>(level)];
      for (int32_t row = last - count + 1; row <= last; ++row) {
        if (keys.size() > 1) keys += ',';
        keys += std::to_string(rows.Key(row));
      }
    }
    num_groups_ = static_cast<int32_t>(groups.size());
    return keys + ")";
  });
}

std::string CGiRowsetOrder::GetGroupSql(
    const CItems& rows, std::string_view column, const RowsetOrderContext& context, int32_t first,
    int32_t num, const std::function<std::string(const std::string&)>& rebuild) {
  return GuardRowset("GetGroupSql", [&] {
    const std::string keys = GetGroupKeyString(rows, column, context, first, num);
    if (keys == "()") return std::string();
    std::string sql = rebuild(keys);
    if (add_order_clause_ && !sql.empty()) {
      const std::string order = SqlOrderString(true);
      if (!order.empty()) sql += " order by " + order;
    }
    return sql;
  });
}

void CGiRowsetOrder::RequireScores(const CItems& rows, const RowsetOrderContext& context,
                                   const char* method, const char* text) const {
  if (!context.score_support || !CarriesScores(rows)) {
    throw CGiTreeRowsetException::Text(text, method, nullptr);
  }
}

int32_t CGiRowsetOrder::GetMaxScore(const CItems& rows, const RowsetOrderContext& context) {
  constexpr const char* kMethod = "GetMaxWeight";
  return GuardRowset(kMethod, [&] {
    if (!CarriesScores(rows)) {
      throw CGiTreeRowsetException::Text("The result set is not ordered by score", kMethod,
                                         nullptr);
    }
    if (!max_known_) KeepMaxScore(rows, context);
    return max_score_;
  });
}

void CGiRowsetOrder::RoundScore(CItems& rows, const RowsetOrderContext& context) {
  constexpr const char* kMethod = "RoundScore";
  GuardRowset(kMethod, [&] {
    RequireScores(rows, context, kMethod, kRoundText);
    for (int32_t i = kFirstRow; i < rows.Count(); ++i) {
      int32_t& score = rows.Row(i)[kScoreColumn];
      score = score / 100 * 100;
    }
  });
}

void CGiRowsetOrder::AdjustWeight(CItems& rows, const RowsetOrderContext& context,
                                  double start_value, double step_value, int32_t adjustment,
                                  int32_t stop_count, bool stop_at_zero) {
  constexpr const char* kMethod = "AdjustWeight";
  GuardRowset(kMethod, [&] {
    RequireScores(rows, context, kMethod, kAdjustText);
    double v = start_value;
    for (int32_t i = 1; i <= ResultRows(rows); ++i) {
      int32_t& score = rows.Row(kFirstRow + i - 1)[kScoreColumn];
      if (adjustment == 0) {
        score = ClampScore(score + v);
      } else if (adjustment == 1) {
        score = ClampScore(score + score * v);
      }
      if (stop_count != 0 && i == stop_count) break;
      v -= step_value;
      if (stop_at_zero && ((v < 0 && step_value > 0) || (v > 0 && step_value < 0))) v = 0;
    }
  });
}

std::string CGiRowsetOrder::SqlOrderString(bool without_score) const {
  if (!without_score) return sql_order_;
  std::string out;
  std::string_view rest = sql_order_;
  while (!rest.empty()) {
    const auto comma = rest.find(',');
    const std::string_view item = rest.substr(0, comma);
    rest = comma == std::string_view::npos ? std::string_view{} : rest.substr(comma + 1);
    if (item.substr(0, item.find(' ')) == "SCORE") continue;
    if (!out.empty()) out += ',';
    out += item;
  }
  return out;
}

}  // namespace qm
