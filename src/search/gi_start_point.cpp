#include "search/gi_start_point.h"

#include <fcntl.h>

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <utility>
#include <vector>

#include "base/exception_family.h"
#include "base/plain_name.h"
#include "base/trace.h"
#include "config/temp_names.h"
#include "locks/lock_manager.h"
#include "platform/file_io.h"
#include "platform/text_encoding.h"
#include "search/cmd_tree.h"
#include "search/gi_findex.h"
#include "search/gi_tree_rowset.h"
#include "search/word_pattern.h"

namespace qm {

namespace {

constexpr std::string_view kBannerStartTag = "GILIB.GiStartPoint.GiStartPoint";
constexpr std::string_view kBannerEndTag = "GILIB.~GiStartPoint.GiStartPoint";
constexpr std::string_view kBannerFrame = "************************************";
constexpr const char* kNoResultSet = "No open result set";

template <class Body>
decltype(auto) Public(const char* method, Body&& body) {
  return Guard<CGiStartPointException, CGiStartPointUnknownException>(method,
                                                                      std::forward<Body>(body));
}

// The group reads name what the column lookups failed on below the facade's
// own text.
template <class Body>
decltype(auto) GroupRead(const char* text, const char* method, Body&& body) {
  try {
    return body();
  } catch (const CExceptionBase& e) {
    throw CGiStartPointException::Text(text, method, &e);
  }
}

std::string TagOf(const char* method) { return std::string("GILIB.GiStartPoint.") + method; }

void TraceBanner(std::string_view tag, std::string_view middle) {
  const bool on = TraceLevel1.load();
  Trace(on, tag, "");
  Trace(on, tag, kBannerFrame);
  Trace(on, tag, middle);
  Trace(on, tag, kBannerFrame);
}

inline void AppendNumber(std::string& out, int32_t value) {
  char digits[12];
  const auto [end, error] = std::to_chars(digits, digits + sizeof digits, value);
  (void)error;
  out.append(digits, end);
}

std::u16string TrimBlanks(std::u16string_view text) {
  while (!text.empty() && text.front() == u' ') text.remove_prefix(1);
  while (!text.empty() && text.back() == u' ') text.remove_suffix(1);
  return std::u16string(text);
}

}  // namespace

CGiStartPoint::CGiStartPoint() { TraceBanner(kBannerStartTag, "**Starting New GILIB Trace Session**"); }

CGiStartPoint::~CGiStartPoint() {
  if (rowset_) {
    Trace(TraceLevel1.load(), "GILIB.GiStartPoint.~GiStartPoint", "Deleting m_oTreeRowset");
    rowset_.reset();
  }
  TraceBanner(kBannerEndTag, "**Ending GILIB Trace Session********");
}

CGiTreeRowset& CGiStartPoint::OpenRowset(const char* method) {
  if (!open_ || !rowset_) throw CGiStartPointException::Text(kNoResultSet, method, nullptr);
  return *rowset_;
}

void CGiStartPoint::RefreshCounts() {
  total_ = rowset_->GetTotal();
  num_ = rowset_->GetNum();
}

// --- statements ---

void CGiStartPoint::ExecuteW(std::u16string_view statement, bool add) {
  constexpr const char* kMethod = "ExecuteW";
  Public(kMethod, [&] {
    if (!add && open_) {
      throw CGiStartPointException::Text(
          "A result set is already open. Please close the result set before opening a new one.",
          kMethod, nullptr);
    }
    if (statement.empty()) throw CGiStartPointException::Text("Nothing to execute", kMethod, nullptr);
    Trace(TraceLevel1.load(), "GILIB.GiStartPoint.ExecuteW", "Opening Recordset");
    if (!rowset_) rowset_ = std::make_unique<CGiTreeRowset>(defs_);
    CGiCmdList& commands = rowset_->Commands();
    // A failed first statement leaves its command; the next one reuses it.
    if (add || commands.Count() == 0) commands.Add(std::make_unique<CGiCmdTree>(defs_));
    const int32_t number = commands.Count();
    CGiCmdTree& command = commands.Command(number);
    command.SplitSqlW(statement);
    rowset_->SetCacheSize(cache_size_);
    rowset_->StartRowset(number, add);
    RefreshCounts();
    if (command.HasOrder()) rowset_->OrderBy(Utf16ToUtf8(command.OrderList()), true);
    open_ = true;
  });
}

std::u16string CGiStartPoint::ValidateStatementW(std::u16string_view statement) {
  return Public("ValidateStatementW", [&] {
    CGiCmdTree command(defs_);
    command.SplitSqlW(statement);
    return command.TreeToString();
  });
}

void CGiStartPoint::Close() {
  Public("Close", [&] {
    OpenRowset("Close");
    rowset_.reset();
    open_ = false;
    total_ = num_ = total_groups_ = 0;
    key_file_.clear();
  });
}

// --- results ---

template <class Visit>
void CGiStartPoint::ForEachWindowRow(int32_t command, Visit&& visit) {
  const CGiTreeRowset& rowset = *rowset_;
  const int32_t number = command == 0 ? rowset.Commands().Count() : command;
  const CItems& rows = rowset.Result();
  const bool score = rowset.ScoreActive() && rowset.HasScores();
  const int32_t score_column = rows.Columns().ScoreColumn();
  const int32_t last = rowset.GetFirst() + rowset.GetNum() - 1;
  for (int32_t i = rowset.GetFirst(); i <= last; ++i) {
    if (rowset.CommandOfRow(i) != number) continue;
    visit(rows.Key(i), score ? rows.Row(i)[score_column] : 0);
  }
}

CGiTreeRowset& CGiStartPoint::KeyWindow(const char* method, int32_t start, int32_t count,
                                        int32_t command) {
  CGiTreeRowset& rowset = OpenRowset(method);
  Trace(TraceLevel1.load(), TagOf(method), "Start: %i, Count: %i, CmdNumber: %i", start, count,
        command);
  if (command < 0 || command > rowset.Commands().Count()) {
    throw CGiStartPointException::Text("Command number not executed", method, nullptr);
  }
  if (count > 0) rowset.SetLimits(start, count);
  return rowset;
}

std::string CGiStartPoint::KeyString(int32_t command) {
  CGiTreeRowset& rowset = *rowset_;
  const std::string tag = TagOf("KeyString");
  Trace(TraceLevel2.load(), tag, "Getting keys for cmd: %i",
        command == 0 ? rowset.Commands().Count() : command);
  const bool score = rowset.ScoreActive() && rowset.HasScores();
  const int32_t group_count = rowset.Commands().score_group_count;
  const int32_t max_score =
      score && rowset.Commands().score_return_mode == 2 ? rowset.GetMaxScore() : 0;

  std::string keys;
  // Room for the usual key of up to seven digits and its comma.
  keys.reserve(static_cast<std::size_t>(rowset.GetNum()) * 8 + 16);
  int32_t count = 0;
  if (!score) {
    Trace(TraceLevel2.load(), tag, "score is not active");
    keys.push_back('(');
    ForEachWindowRow(command, [&](int32_t key, int32_t) {
      if (count++ > 0) keys.push_back(',');
      AppendNumber(keys, key);
    });
    keys.push_back(')');
  } else {
    Trace(TraceLevel2.load(), tag, "Score is active");
    bool in_group = false;
    int32_t group_score = 0;
    int32_t in_this_group = 0;
    ForEachWindowRow(command, [&](int32_t key, int32_t row_score) {
      if (!in_group || row_score != group_score) {
        if (in_group) keys.append(");");
        AppendNumber(keys, ShownScore(row_score, max_score));
        keys.append(";(");
        in_group = true;
        group_score = row_score;
        in_this_group = 0;
      }
      if (group_count > 0 && in_this_group >= group_count) return;
      if (in_this_group++ > 0) keys.push_back(',');
      AppendNumber(keys, key);
      ++count;
    });
    if (in_group) keys.append(");");
  }
  if (count == 0) {
    Trace(TraceLevel2.load(), tag, "Result set is empty");
    keys = score ? "0;());" : "()";
  }
  Trace(TraceLevel2.load(), tag, "Count: %i, Key String: %s", count, keys);
  return keys;
}

int32_t CGiStartPoint::ShownScore(int32_t score, int32_t max_score) const {
  if (rowset_->Commands().score_return_mode != 2) return score;
  if (max_score <= 0) return 0;
  // The percentage of the maximum, rounded up only past one half.
  const int64_t scaled = int64_t{score} * 100;
  int64_t percent = scaled / max_score;
  if (2 * (scaled % max_score) > max_score) ++percent;
  return static_cast<int32_t>(percent);
}

std::u16string CGiStartPoint::GetSql(int32_t start, int32_t count) {
  constexpr const char* kMethod = "GetSql";
  return Public(kMethod, [&] {
    CGiTreeRowset& rowset = OpenRowset(kMethod);
    const std::string tag = TagOf(kMethod);
    Trace(TraceLevel1.load(), tag, "Start: %i, Count: %i", start, count);
    if (count > 0) rowset.SetLimits(start, count);
    const bool score = rowset.ScoreActive() && rowset.HasScores();
    const std::u16string key_column = Utf8ToUtf16(GetSqlKeyName());
    std::u16string sql;
    CGiCmdList& commands = rowset.Commands();
    for (int32_t number = 1; number <= commands.Count(); ++number) {
      CGiCmdTree& command = commands.Command(number);
      // A statement that failed to parse stays in the list but has no SQL.
      if (!command.IsParsed()) continue;
      const std::u16string keys = TrimBlanks(Utf8ToUtf16(KeyString(number)));
      command.RebuildSql(keys, score, key_column);
      if (!sql.empty()) sql.append(u" UNION ALL ");
      sql.append(command.Condition());
    }
    if (rowset.AddOrderClause() && !sql.empty()) {
      const bool union_all = sql.find(u"UNION ALL") != std::u16string::npos;
      const std::string order = rowset.SqlOrder(!union_all);
      if (!order.empty()) {
        sql.append(u" order by ");
        sql.append(Utf8ToUtf16(order));
      }
    }
    RefreshCounts();
    Trace(TraceLevel1.load(), tag, "Total: %i, Num: %i, SQL: %s", total_, num_, sql);
    return sql;
  });
}

std::u16string CGiStartPoint::GetSqlOrderString() {
  return Public("GetSqlOrderString",
                [&] { return Utf8ToUtf16(OpenRowset("GetSqlOrderString").SqlOrder()); });
}

std::string CGiStartPoint::GetSqlKeyName() {
  return Public("GetSqlKeyName", [&] {
    const CGiCmdList& commands = OpenRowset("GetSqlKeyName").Commands();
    return commands.first_header ? commands.first_header->KeyColumn : std::string();
  });
}

int32_t CGiStartPoint::GetTotal() {
  return Public("GetTotal", [&] {
    OpenRowset("GetTotal");
    return total_;
  });
}

int32_t CGiStartPoint::GetNum() {
  return Public("GetNum", [&] {
    OpenRowset("GetNum");
    return num_;
  });
}

int32_t CGiStartPoint::GetTruncInfo() {
  return Public("GetTruncInfo", [&] { return OpenRowset("GetTruncInfo").IsTruncated() ? 1 : 0; });
}

bool CGiStartPoint::IsTruncated() const { return rowset_ && rowset_->IsTruncated(); }

void CGiStartPoint::SetLimits(int32_t start, int32_t count) {
  Public("SetLimits", [&] { OpenRowset("SetLimits").SetLimits(start, count); });
}

std::string CGiStartPoint::GetRawKeyString(int32_t start, int32_t count, int32_t command) {
  constexpr const char* kMethod = "GetRawKeyString";
  return Public(kMethod, [&] {
    KeyWindow(kMethod, start, count, command);
    std::string keys = KeyString(command);
    RefreshCounts();
    Trace(TraceLevel1.load(), TagOf(kMethod), "Total: %i, Num: %i, Raw Key String: %s", total_,
          num_, keys);
    return keys;
  });
}

std::string CGiStartPoint::GetRawKeyFile(int32_t start, int32_t count, int32_t command) {
  constexpr const char* kMethod = "GetRawKeyFile";
  return Public(kMethod, [&] {
    CGiTreeRowset& rowset = KeyWindow(kMethod, start, count, command);
    const bool score = rowset.ScoreActive() && rowset.HasScores();
    const int32_t max_score =
        score && rowset.Commands().score_return_mode == 2 ? rowset.GetMaxScore() : 0;
    std::string text;
    text.reserve(static_cast<std::size_t>(rowset.GetNum()) * (score ? 12 : 9));
    int32_t written = 0;
    ForEachWindowRow(command, [&](int32_t key, int32_t row_score) {
      if (score) {
        AppendNumber(text, ShownScore(row_score, max_score));
        text.push_back(',');
      }
      AppendNumber(text, key);
      text.append("\r\n");
      ++written;
    });
    if (key_file_.empty()) key_file_ = SLGetTempWorkFilePath(defs_, kTempCallerKeyFile);
    platform::FileHandle file =
        platform::OpenFile(key_file_, O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC);
    if (!file.IsOpen() || !platform::WriteAll(file.Get(), text.data(), text.size()) ||
        file.Close() != 0) {
      throw CGiStartPointException::Text("Error writing key file %s", kMethod, nullptr, key_file_);
    }
    const std::string tag = TagOf(kMethod);
    Trace(TraceLevel2.load(), tag, "Count: %i, Key File: %s", written, key_file_);
    RefreshCounts();
    Trace(TraceLevel1.load(), tag, "Total: %i, Num: %i, Raw Key File: %s", total_, num_, key_file_);
    return key_file_;
  });
}

int32_t CGiStartPoint::GetMaxScore() {
  return Public("GetMaxScore", [&] {
    CGiTreeRowset& rowset = OpenRowset("GetMaxScore");
    if (!rowset.HasScores()) {
      throw CGiStartPointException::Text("The result set is not ordered by score", "GetMaxWeight",
                                         nullptr);
    }
    return rowset.GetMaxScore();
  });
}

void CGiStartPoint::SetNumericOption(std::string_view name, int32_t value) {
  constexpr const char* kMethod = "SetNumericOption";
  Public(kMethod, [&] {
    CGiCmdList& commands = OpenRowset(kMethod).Commands();
    if (name == "SCORE_GROUP_COUNT") {
      commands.score_group_count = std::max(value, 0);
    } else if (name == "SCORE_RETURN") {
      commands.score_return_mode = std::max(value, 0);
    } else {
      throw CGiStartPointException::Text("Unknown Option %S", kMethod, nullptr, name);
    }
  });
}

// --- orders and groups ---

void CGiStartPoint::OrderBy(std::string_view columns, bool add_order_clause) {
  Public("OrderBy", [&] { OpenRowset("OrderBy").OrderBy(columns, add_order_clause); });
}

void CGiStartPoint::CollectGroups() {
  Public("CollectGroups", [&] {
    CGiTreeRowset& rowset = OpenRowset("CollectGroups");
    rowset.CollectGroups();
    total_groups_ = rowset.GetTotalGroups();
  });
}

int32_t CGiStartPoint::GetTotalGroups() {
  return Public("GetTotalGroups", [&] {
    OpenRowset("GetTotalGroups");
    return total_groups_;
  });
}

int32_t CGiStartPoint::GetNumGroups() {
  return Public("GetNumGroups", [&] { return OpenRowset("GetNumGroups").GetNumGroups(); });
}

void CGiStartPoint::MoveNext() {
  Public("MoveNext", [&] { OpenRowset("MoveNext").MoveNext(); });
}

void CGiStartPoint::MovePrev() {
  Public("MovePrev", [&] { OpenRowset("MovePrev").MovePrev(); });
}

bool CGiStartPoint::IsEOB() {
  return Public("IsEOB", [&] { return OpenRowset("IsEOB").IsEOB(); });
}

int32_t CGiStartPoint::GetValue(std::string_view column) {
  return Public("GetValue", [&] {
    if (!open_) throw CGiStartPointException::Text("GetValue: No open result set", "GetValue", nullptr);
    return GroupRead("Error fetching value. Make sure the column has been ordered", "GetValue",
                     [&] { return rowset_->GetValue(column); });
  });
}

int32_t CGiStartPoint::GetCount(std::string_view column) {
  return Public("GetCount", [&] {
    CGiTreeRowset& rowset = OpenRowset("GetCount");
    return GroupRead("Error fetching count. Make sure the column has been ordered", "GetCount",
                     [&] { return rowset.GetCount(column); });
  });
}

std::string CGiStartPoint::GetGroupString(std::string_view column) {
  return Public("GetGroupString", [&] {
    CGiTreeRowset& rowset = OpenRowset("GetGroupString");
    return GroupRead("Error fetching group string. Make sure the column has been ordered",
                     "GetGroupString", [&] { return rowset.GetGroupString(column); });
  });
}

std::u16string CGiStartPoint::GetGroupSql(int32_t start, int32_t count, std::string_view column) {
  return Public("GetGroupSql", [&] {
    CGiTreeRowset& rowset = OpenRowset("GetGroupSql");
    return GroupRead("Error fetching group string. Make sure the column has been ordered",
                     "GetGroupSql", [&] { return rowset.GetGroupSql(start, count, column); });
  });
}

void CGiStartPoint::AdjustScore(double start_value, double step_value, int32_t adjustment,
                                int32_t stop_count, bool stop_at_zero) {
  Public("AdjustScore", [&] {
    OpenRowset("AdjustScore")
        .AdjustScore(start_value, step_value, adjustment, stop_count, stop_at_zero);
  });
}

// --- settings ---

void CGiStartPoint::SetGroup(std::string_view group) {
  constexpr const char* kMethod = "SetGroup";
  Public(kMethod, [&] {
    if (open_) {
      throw CGiStartPointException::Text(
          "Error: A result set is open, close the result set before changeing group.", kMethod,
          nullptr);
    }
    RequirePlainName<CGiStartPointException>("group", group, kMethod);
    defs_.SetGroup(group);
  });
}

void CGiStartPoint::SetDataPath(std::string_view path) {
  constexpr const char* kMethod = "SetDataPath";
  Public(kMethod, [&] {
    if (open_) {
      throw CGiStartPointException::Text(
          "A result set is open, close the result set before changing data path.", kMethod,
          nullptr);
    }
    if (!platform::IsDirectory(std::string(path))) {
      throw CGiStartPointException::Text("Data path does not exist: %S", kMethod, nullptr, path);
    }
    defs_.SetDataPath(path);
  });
}

void CGiStartPoint::SetCacheSize(int32_t megabytes) {
  Public("SetCacheSize", [&] {
    const int64_t bytes = int64_t{megabytes} * 1000000;
    cache_size_ = bytes <= 0 ? 0 : static_cast<int32_t>(std::min<int64_t>(bytes, INT32_MAX));
  });
}

// --- findex words ---

std::u16string CGiStartPoint::GetFindexWords(std::string_view findex, int32_t start,
                                             int32_t count, std::u16string_view filter,
                                             std::u16string_view separator) {
  constexpr const char* kMethod = "GetFindexWords";
  return Public(kMethod, [&] {
    RequirePlainName<CGiStartPointException>("findex", findex, kMethod);
    const CWordPattern pattern(ToUpper(filter));
    const int32_t last = static_cast<int32_t>(std::min<int64_t>(int64_t{start} + count, INT32_MAX));
    std::vector<std::u16string> listed;
    int32_t total = 0;
    const auto list = [&](const std::string& name, bool required) {
      CLockManager lock(defs_.GetLockScope(), defs_.GetGroup(), name, kLockFindex);
      lock.LockReader();
      CGiFIndex file(defs_);
      if (required) {
        file.Open(name);
      } else if (!file.TryOpen(name)) {
        return false;
      }
      std::vector<std::u16string> words;
      file.GetFindexWordsW(pattern, start, last, words, total);
      for (std::u16string& word : words) listed.push_back(std::move(word));
      return true;
    };
    list(std::string(findex), true);
    for (int32_t n = 1;; ++n) {
      const std::string add_on = std::string(findex) + "_ADD_" + std::to_string(n);
      Trace(TraceLevel2.load(), TagOf(kMethod), "Looking for additional index: %s", add_on);
      if (!list(add_on, false)) break;
      Trace(TraceLevel2.load(), TagOf(kMethod), "Found additional index; %s", add_on);
    }
    listed_words_ = count;
    total_words_ = total;
    std::u16string joined;
    for (std::size_t i = 0; i < listed.size(); ++i) {
      if (i > 0) joined.append(separator);
      joined.append(listed[i]);
    }
    return joined;
  });
}

}  // namespace qm
