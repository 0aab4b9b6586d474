#include "search/gi_tree_rowset.h"

#include <algorithm>
#include <charconv>
#include <cstring>
#include <limits>
#include <span>
#include <string_view>
#include <utility>

#include "base/exception_family.h"
#include "base/trace.h"
#include "config/global_defs.h"
#include "format/index_options.h"
#include "index/deleted_keys.h"
#include "platform/text_encoding.h"
#include "search/condition_tree.h"
#include "search/gi_findex.h"
#include "search/gi_repository.h"
#include "search/item_merge.h"
#include "search/item_runs.h"
#include "search/word_search.h"
#include "text/language.h"

namespace qm {

namespace {

constexpr std::string_view kTag = "GILIB.GiTreeRowset";

template <class Body>
decltype(auto) Guarded(const char* method, Body&& body) {
  return Guard<CGiTreeRowsetException, CGiTreeRowsetUnknownException>(method,
                                                                      std::forward<Body>(body));
}

std::string TagOf(const char* method) { return std::string(kTag) + "." + method; }

int32_t CountWords(const CGiNode* node) {
  if (node == nullptr) return 0;
  if (node->kind == GiNodeKind::Word) return 1;
  return CountWords(node->left.get()) + CountWords(node->right.get());
}

bool IsTextType(int32_t type) {
  return type == static_cast<int32_t>(VALUE_TYPE::AsciiString) ||
         type == static_cast<int32_t>(VALUE_TYPE::UnicodeString);
}

std::string_view Trimmed(std::string_view text) {
  while (!text.empty() && text.front() == ' ') text.remove_prefix(1);
  while (!text.empty() && text.back() == ' ') text.remove_suffix(1);
  return text;
}

// A query word as a number of the findex's type. The whole word must be the
// number: a word that only begins with digits is refused like any other.
template <class Number>
Number ParseNumber(const std::u16string& word, const char* message) {
  const std::string narrow = Utf16ToUtf8(word);
  const std::string_view text = Trimmed(narrow);
  Number value{};
  const char* end = text.data() + text.size();
  const char* begin = text.data();
  if (!text.empty() && text.front() == '+') ++begin;
  const auto [stop, error] = std::from_chars(begin, end, value);
  if (text.empty() || error != std::errc() || stop != end) {
    throw CGiTreeRowsetException::Text(message, "SearchNext", nullptr);
  }
  return value;
}

// "*" on a findex of numbers or dates: every value (the left side that a
// negation is taken from).
CWordSearch EveryValue(VALUE_TYPE type) {
  CValue low(type);
  CValue high(type);
  if (type == VALUE_TYPE::Integer) {
    low.SetInteger(std::numeric_limits<int32_t>::min());
    high.SetInteger(std::numeric_limits<int32_t>::max());
  } else if (type == VALUE_TYPE::Double) {
    low.SetDouble(std::numeric_limits<double>::lowest());
    high.SetDouble(std::numeric_limits<double>::max());
  } else {
    low.SetDateFromText("0-1-1", false);
    high.SetDateFromText("32767-12-31", true);
  }
  return CWordSearch::ForRange(low, high);
}

CWordSearch TypedSearch(const std::u16string& word, int32_t findex_type) {
  const auto type = static_cast<VALUE_TYPE>(findex_type);
  if (word == u"*" &&
      (type == VALUE_TYPE::Integer || type == VALUE_TYPE::Double || type == VALUE_TYPE::DateTime)) {
    return EveryValue(type);
  }
  switch (type) {
    case VALUE_TYPE::Integer: {
      CValue value(VALUE_TYPE::Integer);
      value.SetInteger(ParseNumber<int32_t>(word, "Not a valid integer"));
      return CWordSearch::ForValue(value);
    }
    case VALUE_TYPE::Double: {
      CValue value(VALUE_TYPE::Double);
      value.SetDouble(ParseNumber<double>(word, "Not a valid double"));
      return CWordSearch::ForValue(value);
    }
    case VALUE_TYPE::DateTime: {
      // A date without a time stands for its whole day.
      const std::string text = Utf16ToUtf8(word);
      CValue low(VALUE_TYPE::DateTime);
      CValue high(VALUE_TYPE::DateTime);
      low.SetDateFromText(text, false);
      high.SetDateFromText(text, true);
      return CWordSearch::ForRange(low, high);
    }
    default:
      return CWordSearch::ForText(word, findex_type);
  }
}

}  // namespace

struct CGiTreeRowset::Context {
  CGiRepository* view = nullptr;
  int32_t flags = 0;
  int32_t modifier = 0;
  int32_t word_count = 1;
};

namespace {

// The rows cut back to their first width columns (the attached order columns
// dropped).
CItems NarrowedTo(const CItems& rows, int32_t width) {
  if (rows.Width() <= width) return rows;
  CColumnSet set = rows.Columns();
  set.b = static_cast<uint16_t>(set.b - (rows.Width() - width));
  CItems narrowed(set);
  narrowed.AllocateMemory(rows.Count());
  for (int32_t i = 0; i < rows.Count(); ++i) {
    narrowed.InsertItem(std::span<const int32_t>(rows.Row(i), static_cast<std::size_t>(width)));
  }
  return narrowed;
}

}  // namespace

CGiTreeRowset::CGiTreeRowset(const CGlobalDefs& defs)
    : defs_(defs), order_(std::make_unique<CGiRowsetOrder>(defs)) {}

CGiTreeRowset::~CGiTreeRowset() {
  Trace(TraceLevel2.load(), TagOf("~CGiTreeRowset"), "Destroying TreeRowset");
}

void CGiTreeRowset::Close() {
  result_.reset();
  open_ = false;
  command_count_ = 0;
  command_column_ = false;
  total_ = 0;
  first_ = 1;
  num_ = 0;
  truncated_ = false;
  base_width_ = 0;
  // The attached orders give their reader locks back.
  order_->Reset({});
}

CItems& CGiTreeRowset::Rows(const char* method) const {
  if (!result_) throw CGiTreeRowsetException::Text("No open result set", method, nullptr);
  return *result_;
}

RowsetOrderContext CGiTreeRowset::OrderContext() const {
  RowsetOrderContext context;
  if (commands_.first_header) {
    context.score_support = (commands_.first_header->GeneralFlags & kIgoSupportScore) != 0;
    context.key_column = commands_.first_header->KeyColumn;
  }
  if (commands_.Count() > 0 && commands_.Command(1).IsParsed()) {
    context.part_count = commands_.Command(1).PartCount();
  }
  context.score_group_count = commands_.score_group_count;
  return context;
}

std::string CGiTreeRowset::SqlOrder(bool without_score) const {
  return order_->SqlOrderString(without_score);
}

bool CGiTreeRowset::AddOrderClause() const { return order_->AddOrderClause(); }

bool CGiTreeRowset::ScoreActive() const { return order_->ScoreActive(); }

bool CGiTreeRowset::HasScores() const { return result_ && result_->Columns().s != 0; }

int32_t CGiTreeRowset::CommandOfRow(int32_t row) const {
  if (!command_column_) return single_command_;
  return Rows("CommandOfRow").Row(row)[base_width_ - 1];
}

void CGiTreeRowset::OrderBy(std::string_view list, bool add_order_clause) {
  CItems& rows = Rows("SetOrder");
  const RowsetOrderContext context = OrderContext();
  order_->SetOrder(rows, list, add_order_clause, context);
  order_->SortItems(rows, context);
}

void CGiTreeRowset::CollectGroups() { order_->CollectItems(Rows("CollectGroups")); }

void CGiTreeRowset::MoveNext() { order_->MoveNext(); }

void CGiTreeRowset::MovePrev() { order_->MovePrev(); }

bool CGiTreeRowset::IsEOB() const { return order_->IsEOB(); }

int32_t CGiTreeRowset::GetTotalGroups() const { return order_->GetTotalGroups(); }

int32_t CGiTreeRowset::GetNumGroups() const { return order_->GetNumGroups(); }

int32_t CGiTreeRowset::GetValue(std::string_view column) const {
  return order_->GetValue(Rows("GetValue"), column, OrderContext());
}

int32_t CGiTreeRowset::GetCount(std::string_view column) const {
  return order_->GetCount(Rows("GetValue"), column, OrderContext());
}

std::string CGiTreeRowset::GetGroupString(std::string_view column) const {
  return order_->GetGroupString(Rows("GetGroupString"), column, OrderContext(), first_, num_);
}

std::u16string CGiTreeRowset::GetGroupSql(int32_t start, int32_t count,
                                          std::string_view column) {
  CItems& rows = Rows("GetGroupString");
  SetLimits(start, count);
  const RowsetOrderContext context = OrderContext();
  const std::string sql = order_->GetGroupSql(
      rows, column, context, first_, num_, [&](const std::string& keys) {
        CGiCmdTree& command = commands_.Command(1);
        command.RebuildSql(Utf8ToUtf16(keys), false, Utf8ToUtf16(context.key_column));
        return Utf16ToUtf8(command.Condition());
      });
  return Utf8ToUtf16(sql);
}

int32_t CGiTreeRowset::GetMaxScore() {
  return order_->GetMaxScore(Rows("GetMaxWeight"), OrderContext());
}

void CGiTreeRowset::AdjustScore(double start_value, double step_value, int32_t adjustment,
                                int32_t stop_count, bool stop_at_zero) {
  order_->AdjustWeight(Rows("AdjustWeight"), OrderContext(), start_value, step_value, adjustment,
                       stop_count, stop_at_zero);
}

void CGiTreeRowset::SetLimits(int32_t start, int32_t count) {
  first_ = std::max(start, 1);
  count = std::max(count, 0);
  num_ = first_ > total_
             ? 0
             : static_cast<int32_t>(std::min<int64_t>(count, int64_t{total_} - first_ + 1));
}

int32_t CGiTreeRowset::LimitRows(const CColumnSet& columns) const {
  if (cache_size_ == 0) return 0;
  return std::max(1, cache_size_ / columns.Size());
}

void CGiTreeRowset::StartRowset(int32_t command_number, bool append) {
  Guarded("StartRowset", [&] {
    const CGiCmdTree& command = commands_.Command(command_number);
    if (!command.IsParsed())
      throw CGiTreeRowsetException::Text("Command not parsed", "StartRowset", nullptr);
    if (!append || !open_) truncated_ = false;
    CItems items = Evaluate(command.Root(), Context{});
    const int32_t found = ResultRows(items);

    if (append && open_) {
      CItems joined =
          AddResultset(NarrowedTo(*result_, base_width_), command_column_, items, command_number);
      // The rows standing so far belong to the command evaluated first, which
      // is not command 1 when an earlier statement failed.
      if (!command_column_ && single_command_ != 1) {
        for (int32_t i = 1; i <= total_; ++i) joined.Row(i)[joined.Width() - 1] = single_command_;
      }
      result_ = std::make_unique<CItems>(std::move(joined));
      command_column_ = true;
      ++command_count_;
    } else {
      result_ = std::make_unique<CItems>(std::move(items));
      command_column_ = false;
      single_command_ = command_number;
      command_count_ = 1;
      commands_.score_active = false;
    }
    total_ = ResultRows(*result_);
    first_ = 1;
    num_ = total_;
    base_width_ = result_->Width();
    order_->Reset(commands_.first_header ? commands_.first_header->KeyColumn : std::string());
    open_ = true;
    Trace(TraceLevel1.load(), TagOf("StartRowset"), "Total resulting items for search: %i", found);
  });
}

CItems CGiTreeRowset::Evaluate(const CGiNode& node, const Context& context) {
  switch (node.kind) {
    case GiNodeKind::Condition:
      return EvaluateCondition(node, true);
    case GiNodeKind::Word:
      return SearchWord(node, context);
    case GiNodeKind::Operator: {
      if (node.left == nullptr || node.right == nullptr) {
        throw CGiTreeRowsetException::Text("Operator without operands", "StartRowset", nullptr);
      }
      // NEAR between two conditions compares every occurrence of both
      // sides: a condition reduced to one row per key would keep only its
      // last position. The pairs found are reduced afterwards instead.
      const bool near_conditions = node.op == kGiOpNear &&
                                   node.left->kind == GiNodeKind::Condition &&
                                   node.right->kind == GiNodeKind::Condition;
      // AND, FILTER and their negations only ask the right condition about
      // the left side's keys: its rows are not reduced for keys the left
      // side never meets.
      const bool keyed = (node.op == kGiOpAnd || node.op == kGiOpFilter || node.op == kGiOpAndNot ||
                          node.op == kGiOpFilterNot) &&
                         (context.flags & kGiCmpProximity) == 0 &&
                         node.right->kind == GiNodeKind::Condition;
      if (keyed) {
        const CItems left = Evaluate(*node.left, context);
        const CItems right = EvaluateCondition(*node.right, false);
        if (right.Columns().p == 0) {
          return MergeTwoResultset(left, right, node.op, context.flags, 0, context.word_count);
        }
        return Guarded("MergeTwoResultset", [&] {
          if (node.op == kGiOpAnd && !left.Columns().Equals(right.Columns())) {
            throw CGiTreeRowsetException::Numbered(10, "MergeTwoResultset", nullptr);
          }
          return KeepByCondition(left, right, node.op,
                                 std::max(1, CountWords(node.right->left.get())));
        });
      }
      CItems left =
          near_conditions ? EvaluateCondition(*node.left, false) : Evaluate(*node.left, context);
      CItems right =
          near_conditions ? EvaluateCondition(*node.right, false) : Evaluate(*node.right, context);
      int32_t distance = 0;
      if (node.op == kGiOpAdjacent || node.op == 7) {
        distance = context.modifier;
      } else if (node.op == kGiOpNear) {
        distance = CountWords(node.left.get()) + node.near_distance;
      }
      if (near_conditions) {
        CItems pairs = MergeTwoResultset(left, right, node.op, 0, distance, 1);
        if (pairs.Columns().p != 0) ReduceItems(pairs, CountWords(&node));
        return pairs;
      }
      return MergeTwoResultset(left, right, node.op, context.flags, distance, context.word_count);
    }
    case GiNodeKind::Negation:
      break;
  }
  throw CGiTreeRowsetException::Text("Negation left in the condition tree", "StartRowset", nullptr);
}

CItems CGiTreeRowset::EvaluateCondition(const CGiNode& node, bool reduce) {
  if (node.left == nullptr)
    throw CGiTreeRowsetException::Text("Condition without value", "StartRowset", nullptr);
  CGiRepository view(defs_);
  view.OpenRepository(Utf16ToUtf8(node.text));
  if (!commands_.first_header) commands_.first_header = view.Header();
  Context context;
  context.view = &view;
  context.flags = node.flags;
  context.modifier = node.modifier;
  context.word_count = std::max(1, CountWords(node.left.get()));
  CItems items = Evaluate(*node.left, context);
  view.Close();
  if (reduce && items.Columns().p != 0) ReduceItems(items, context.word_count);
  return items;
}

std::u16string CGiTreeRowset::NormaliseWord(const std::u16string& word,
                                            const CIndexHeader& header) {
  const int32_t steps =
      header.LanguageFlags & (CLanguage::kUseStemming | CLanguage::kUsePhonetic |
                              CLanguage::kRemoveAccents | CLanguage::kUseCharacterTranslation);
  // A pattern is matched against the stored words as written: a stem or a
  // phonetic code of "LIB*" is no pattern of the words it stands for.
  if (steps == 0 || word == u"*" || CWordPattern(word).HasWildcards()) return word;
  if (!language_) language_ = std::make_unique<CLanguage>(defs_);
  language_->LoadLanguage(header.Language, header.LanguageFlags & 31);
  return language_->Normalise(word);
}

CItems CGiTreeRowset::SearchWord(const CGiNode& node, const Context& context) {
  if (context.view == nullptr)
    throw CGiTreeRowsetException::Text("Word outside a condition", "SearchNext", nullptr);
  CGiRepository& view = *context.view;
  const CIndexHeader& header = view.Header();
  const CColumnSet columns = CColumnSet::FromGeneralFlags(header.GeneralFlags);
  const int32_t type = view.GetFindexType();

  std::u16string word = node.text;
  if (IsTextType(type)) word = NormaliseWord(word, header);
  CItems items(columns);
  if (word.empty()) return EmptyResult(columns);
  const CWordSearch search = TypedSearch(word, type);

  bool found = false;
  bool appended = false;
  for (int32_t i = 0; i < view.GetFindexCount(); ++i) {
    CGiFIndex& findex = view.GetFindex(i);
    Trace(TraceLevel2.load(), TagOf("SearchNext"), "Searching index: %s", findex.Name());
    const CLookupResult got =
        findex.GetItems(items, search, context.flags, context.modifier, cache_size_, appended);
    appended = true;
    found = found || got.found || got.rows > 0;
    truncated_ = truncated_ || got.truncated;
    Trace(TraceLevel2.load(), TagOf("SearchNext"), "Got items");
    for (int32_t n = 1;; ++n) {
      const std::string name = findex.Name() + "_ADD_" + std::to_string(n);
      Trace(TraceLevel2.load(), TagOf("SearchNext"), "Looking for additional index: %s", name);
      CGiFIndex add_on(defs_);
      if (!add_on.TryOpen(name)) {
        Trace(TraceLevel2.load(), TagOf("SearchNext"), "Additional index %s doesn't exist", name);
        break;
      }
      Trace(TraceLevel2.load(), TagOf("SearchNext"), "Found additional index; %s", name);
      const CLookupResult more =
          add_on.GetItems(items, search, context.flags, context.modifier, cache_size_, true);
      found = found || more.found || more.rows > 0;
      truncated_ = truncated_ || more.truncated;
      add_on.Close();
    }
  }
  if (!found || CountRuns(items) == 0) {
    Trace(TraceLevel2.load(), TagOf("SearchNext"), "Empty Search");
    return EmptyResult(columns);
  }
  // The operators need one key-sorted array, whatever made several runs:
  // ranges, patterns, similar words, several findexes or add-ons.
  MergeRuns(items);
  items.Truncate(std::clamp(items.Row(0)[0], 1, items.Count()));
  StampCount(items);
  for (int32_t i = 0; i < view.GetFindexCount(); ++i) {
    CGiFIndex& findex = view.GetFindex(i);
    Trace(TraceLevel2.load(), TagOf("SearchNext"), "Excluding deleted items from index %s",
          findex.Name());
    Exclude(findex, items);
  }
  Trace(TraceLevel2.load(), TagOf("SearchNext"), "Found a total of %i items", ResultRows(items));
  return items;
}

CItems CGiTreeRowset::MergeTwoResultset(const CItems& left, const CItems& right, int32_t code,
                                        int32_t flags, int32_t distance, int32_t word_count) {
  return Guarded("MergeTwoResultset", [&] {
    if ((flags & kGiCmpProximity) != 0 &&
        (code == kGiOpAnd || code == kGiOpOr || code == kGiOpAdjacent || code == kGiOpAndNot ||
         code == kGiOpNear)) {
      code = 7;
    }
    const bool compares_rows = code == kGiOpAnd || code == kGiOpOr || code == kGiOpAdjacent ||
                               code == 7 || code == kGiOpAndNot || code == kGiOpNear;
    if (compares_rows && !left.Columns().Equals(right.Columns())) {
      throw CGiTreeRowsetException::Numbered(10, "MergeTwoResultset", nullptr);
    }
    const bool needs_positions = code == kGiOpAdjacent || code == 7 || code == kGiOpNear;
    if (needs_positions && (left.Columns().p == 0 || right.Columns().p == 0)) {
      throw CGiTreeRowsetException::Numbered(57, "MergeTwoResultset", nullptr);
    }
    MergeLimit limit{LimitRows(left.Columns()), false};
    CItems merged = MergeResults(left, right, code, distance, word_count, limit);
    truncated_ = truncated_ || limit.truncated;
    return merged;
  });
}

void CGiTreeRowset::Exclude(const CGiFIndex& findex, CItems& items) {
  Guarded("Exclude", [&] {
    const std::vector<int32_t> deleted = ReadDeletedKeys(defs_, findex.Name());
    if (deleted.empty()) {
      Trace(TraceLevel2.load(), TagOf("Exclude"), "No deleted items for index %s", findex.Name());
      return;
    }
    Trace(TraceLevel2.load(), TagOf("Exclude"), "Found %i deleted items for index %s",
          static_cast<int32_t>(deleted.size()), findex.Name());
    RemoveKeys(items, deleted, [&](int32_t key) {
      Trace(TraceLevel3.load(), TagOf("Exclude"), "Deleting key %i from index %s", key,
            findex.Name());
    });
  });
}

void CGiTreeRowset::ReduceItems(CItems& items, int32_t word_count) {
  Guarded("ReduceItems", [&] { qm::ReduceItems(items, word_count); });
}

CItems CGiTreeRowset::AddResultset(const CItems& current, bool has_command_column,
                                   const CItems& added, int32_t command_number) {
  return Guarded("AddResultset", [&] {
    CColumnSet columns = current.Columns();
    if (!has_command_column) ++columns.b;
    CItems joined(columns);
    const int32_t width = columns.Width();
    const int32_t old_rows = ResultRows(current);
    const int32_t new_rows = ResultRows(added);
    joined.AllocateMemoryForce(old_rows + new_rows + 1);
    joined.SetItemOption(old_rows + new_rows, ItemKind::Key, 0);
    for (int32_t i = 1; i <= old_rows; ++i) {
      int32_t* row = joined.Row(i);
      const int32_t* from = current.Row(i);
      std::memcpy(row, from, sizeof(int32_t) * static_cast<std::size_t>(current.Width()));
      if (!has_command_column) row[width - 1] = 1;
    }
    // The new command's rows keep the key and whichever of score and
    // position both commands' findexes carry.
    const CColumnSet& from = added.Columns();
    const bool score = columns.s != 0 && from.s != 0;
    const bool position = columns.p != 0 && from.p != 0;
    for (int32_t i = 1; i <= new_rows; ++i) {
      int32_t* row = joined.Row(old_rows + i);
      const int32_t* source = added.Row(i);
      row[0] = source[0];
      if (score) row[columns.ScoreColumn()] = source[from.ScoreColumn()];
      if (position) row[columns.PositionColumn()] = source[from.PositionColumn()];
      row[width - 1] = command_number;
    }
    StampCount(joined);
    return joined;
  });
}

}  // namespace qm
