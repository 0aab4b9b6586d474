#include "search/cmd_tree.h"

#include <utility>
#include <vector>

#include "base/exception_family.h"
#include "base/plain_name.h"
#include "base/trace.h"
#include "config/global_defs.h"
#include "platform/text_encoding.h"
#include "search/condition_text.h"
#include "text/language.h"
#include "text/separators.h"

namespace qm {

namespace {

constexpr int32_t kErrorEmptyCondition = 52;
// Values at least this long keep their stop words.
constexpr std::size_t kStopWordValueLimit = 200;
// A longer word is cut to kWordCutLength.
constexpr std::size_t kWordLimit = 200;
constexpr std::size_t kWordCutLength = 195;

template <class Body>
decltype(auto) Guarded(const char* method, Body&& body) {
  return Guard<CGiCmdTreeException, CGiCmdTreeUnknownException>(method,
                                                                 std::forward<Body>(body));
}

// Takes text from position up to delimiter. Leading delimiters are skipped;
// the delimiter counts only outside single-quoted literals and outside
// regions enclosed in "#", and is consumed.
std::u16string Cut(std::u16string_view text, std::size_t& position, char16_t delimiter,
                   bool skip_leading = true) {
  while (skip_leading && position < text.size() && text[position] == delimiter) ++position;
  std::u16string out;
  bool quoted = false;
  bool hashed = false;
  for (; position < text.size(); ++position) {
    const char16_t c = text[position];
    if (c == delimiter && !quoted && !hashed) {
      ++position;
      return out;
    }
    if (c == u'\'' && !hashed) {
      if (quoted && position + 1 < text.size() && text[position + 1] == u'\'') {
        out.append(u"''");
        ++position;
        continue;
      }
      quoted = !quoted;
    } else if (c == u'#' && !quoted) {
      hashed = !hashed;
    }
    out.push_back(c);
  }
  return out;
}

bool IsIdentifierChar(char16_t c) {
  return (c >= u'A' && c <= u'Z') || (c >= u'a' && c <= u'z') || (c >= u'0' && c <= u'9') ||
         c == u'_';
}

constexpr std::u16string_view kScoreWord = u"SCORE";

// The position of the next whole-word "SCORE" of head at or after from (a
// column such as MYSCORE does not count), or npos.
std::size_t NextScoreWord(std::u16string_view head, std::size_t from) {
  for (auto at = head.find(kScoreWord, from); at != std::u16string_view::npos;
       at = head.find(kScoreWord, at + 1)) {
    const std::size_t end = at + kScoreWord.size();
    if ((at == 0 || !IsIdentifierChar(head[at - 1])) &&
        (end == head.size() || !IsIdentifierChar(head[end]))) {
      return at;
    }
  }
  return std::u16string_view::npos;
}

// Replaces each whole-word "SCORE" of the head together with a comma that
// follows it ("SCORE,") or, failing that, one that precedes it (",SCORE").
std::u16string ReplaceScoreColumn(std::u16string_view head, std::u16string_view with_comma_after,
                                  std::u16string_view with_comma_before) {
  std::u16string out;
  std::size_t i = 0;
  for (auto at = NextScoreWord(head, i); at != std::u16string_view::npos;
       at = NextScoreWord(head, i)) {
    const std::size_t end = at + kScoreWord.size();
    if (end < head.size() && head[end] == u',') {
      out.append(head.substr(i, at - i));
      out.append(with_comma_after);
      i = end + 1;
    } else if (at > 0 && head[at - 1] == u',') {
      out.append(head.substr(i, at - 1 - i));
      out.append(with_comma_before);
      i = end;
    } else {
      out.append(head.substr(i, end - i));
      i = end;
    }
  }
  out.append(head.substr(i));
  return out;
}

// Every whole-word "SCORE" of the head replaced by text.
std::u16string ReplaceScoreWord(std::u16string_view head, std::u16string_view text) {
  std::u16string out;
  std::size_t i = 0;
  for (auto at = NextScoreWord(head, i); at != std::u16string_view::npos;
       at = NextScoreWord(head, i)) {
    out.append(head.substr(i, at - i));
    out.append(text);
    i = at + kScoreWord.size();
  }
  out.append(head.substr(i));
  return out;
}

void PrintNode(const CGiNode& node, std::u16string& out) {
  switch (node.kind) {
    case GiNodeKind::Word:
      out.append(node.text);
      return;
    case GiNodeKind::Condition:
      out.push_back(u'\'');
      if (node.left) PrintNode(*node.left, out);
      out.push_back(u'\'');
      return;
    case GiNodeKind::Negation:
      out.append(u" NOT ");
      if (node.left) PrintNode(*node.left, out);
      return;
    case GiNodeKind::Operator:
      break;
  }
  const bool grouped = node.op == kGiOpAnd || node.op == kGiOpOr;
  if (grouped) out.push_back(u'(');
  if (node.left) PrintNode(*node.left, out);
  switch (node.op) {
    case kGiOpAnd: out.append(u" AND "); break;
    case kGiOpOr: out.append(u" OR "); break;
    case kGiOpFilter: out.append(u" FILTER "); break;
    case kGiOpAdjacent: out.push_back(u' '); break;
    default: out.append(u" OPERATOR "); break;
  }
  if (node.right) PrintNode(*node.right, out);
  if (grouped) out.push_back(u')');
}

const CGiNode* FirstCondition(const CGiNode& node) {
  if (node.kind == GiNodeKind::Condition) return &node;
  if (node.kind == GiNodeKind::Word) return nullptr;
  if (node.left) {
    if (const CGiNode* found = FirstCondition(*node.left)) return found;
  }
  if (node.kind == GiNodeKind::Operator && node.right) return FirstCondition(*node.right);
  return nullptr;
}

// An operand that no operator chose stands for every word of the findex.
std::unique_ptr<CGiNode> EveryWord(const CGiNode* negated, bool value_mode) {
  if (value_mode) return CGiNode::Word(u"*");
  auto condition = std::make_unique<CGiNode>();
  condition->kind = GiNodeKind::Condition;
  condition->text = CGiCmdTree::FindFirstIndexW(*negated);
  condition->flags = kGiCmpEqual;
  condition->left = CGiNode::Word(u"*");
  return condition;
}

// Leaves no negation node for the evaluator: X AND NOT Y becomes AND NOT
// (8), X FILTER NOT Y becomes FILTER NOT (9), and any other NOT Y becomes
// FILTER NOT (every word, Y). Operands that were negations are rewritten in
// turn, so A AND NOT B AND NOT C is A AND NOT (B AND NOT C). Values are
// rewritten the same way, with the word "*" as every word.
void RewriteNegations(std::unique_ptr<CGiNode>& node, bool value_mode) {
  if (!node) return;
  switch (node->kind) {
    case GiNodeKind::Word:
      return;
    case GiNodeKind::Condition:
      RewriteNegations(node->left, true);
      return;
    case GiNodeKind::Negation: {
      auto negated = std::move(node->left);
      auto every = EveryWord(negated.get(), value_mode);
      node = CGiNode::Operator(kGiOpFilterNot, std::move(every), std::move(negated));
      RewriteNegations(node->right, value_mode);
      return;
    }
    case GiNodeKind::Operator:
      break;
  }
  if (node->right && node->right->kind == GiNodeKind::Negation &&
      (node->op == kGiOpAnd || node->op == kGiOpFilter)) {
    node->op = node->op == kGiOpAnd ? kGiOpAndNot : kGiOpFilterNot;
    node->right = std::move(node->right->left);
  }
  RewriteNegations(node->left, value_mode);
  RewriteNegations(node->right, value_mode);
}

int32_t CountParts(const CGiNode* node) {
  if (!node) return 0;
  switch (node->kind) {
    case GiNodeKind::Condition: return 1;
    case GiNodeKind::Word:
    case GiNodeKind::Negation: return 0;
    case GiNodeKind::Operator: break;
  }
  switch (node->op) {
    case kGiOpFilter:
    case kGiOpFilterNot: return 0;
    case kGiOpAndNot: return CountParts(node->left.get());
    default: return CountParts(node->left.get()) + CountParts(node->right.get());
  }
}

// Whether a comparison operator stands outside phrases, at any depth of
// parentheses.
bool HasComparison(std::u16string_view text) {
  bool quoted = false;
  for (const char16_t c : text) {
    if (c == u'\'') quoted = !quoted;  // a doubled quote toggles twice
    if (!quoted && (c == u'=' || c == u'<' || c == u'>')) return true;
  }
  return false;
}

bool IsAsciiUpperEqual(std::u16string_view token, std::u16string_view keyword) {
  if (token.size() != keyword.size()) return false;
  for (std::size_t i = 0; i < token.size(); ++i) {
    char16_t c = token[i];
    if (c >= u'a' && c <= u'z') c = static_cast<char16_t>(c - u'a' + u'A');
    if (c != keyword[i]) return false;
  }
  return true;
}

std::vector<std::u16string_view> PlainTokens(std::u16string_view text) {
  std::vector<std::u16string_view> tokens;
  std::size_t i = 0;
  while (i < text.size()) {
    while (i < text.size() && text[i] == u' ') ++i;
    if (i == text.size()) break;
    const std::size_t start = i;
    bool quoted = false;
    for (; i < text.size(); ++i) {
      if (text[i] == u'"') quoted = !quoted;
      if (text[i] == u' ' && !quoted) break;
    }
    tokens.push_back(text.substr(start, i - start));
  }
  return tokens;
}

// The orders named in an ORDER BY list (ORDER.COLUMN items) reach file
// names when the result set attaches them.
void RequirePlainOrderNames(std::u16string_view order) {
  std::size_t start = 0;
  while (start < order.size()) {
    auto end = order.find(u',', start);
    if (end == std::u16string_view::npos) end = order.size();
    const std::u16string_view item = TrimBlanks(order.substr(start, end - start));
    const std::u16string_view column = item.substr(0, item.find_first_of(kGiBlanks));
    const auto dot = column.find(u'.');
    if (dot != std::u16string_view::npos) {
      RequirePlainName<CGiCmdTreeException>("order", Utf16ToUtf8(column.substr(0, dot)),
                                            "StartBuildTreeW");
    }
    start = end + 1;
  }
}

}  // namespace

CGiCmdTree::CGiCmdTree(std::string language_folder, GiFindexFactsSource facts)
    : language_folder_(std::move(language_folder)), facts_(std::move(facts)) {}

CGiCmdTree::~CGiCmdTree() = default;

void CGiCmdTree::SplitSqlW(std::u16string_view statement) {
  Guarded("SplitSqlW", [&] {
    std::u16string work(statement);
    work.push_back(u'#');
    std::size_t position = 0;
    std::u16string head = Cut(work, position, u'[');
    std::u16string condition(TrimBlanks(Cut(work, position, u']', false)));
    bool score = false;
    if (IsAsciiUpperEqual(condition, u"SCORE")) {
      score = true;
      head.append(u"SCORE");
      head.append(Cut(work, position, u'['));
      condition = std::u16string(TrimBlanks(Cut(work, position, u']', false)));
    }
    if (condition.empty()) {
      throw CGiCmdTreeException::Numbered(kErrorEmptyCondition, "SplitSqlW", nullptr);
    }
    // The tail is the rest of the statement: a "#" in it (a date literal)
    // must not cut the host's SQL short.
    std::u16string tail = position < work.size() ? work.substr(position, work.size() - 1 - position)
                                                 : std::u16string();
    StartBuildTreeW(ToUpper(condition));
    head_ = std::move(head);
    tail_ = std::move(tail);
    condition_ = std::move(condition);
    score_column_ = score;
  });
}

void CGiCmdTree::StartBuildTreeW(std::u16string_view condition) {
  Guarded("StartBuildTreeW", [&] {
    Trace(TraceLevel1.load(std::memory_order_relaxed), "GILIB.GiCmdTree.StartBuildTreeW",
          "Executing search query: %s", condition);
    std::u16string_view text = condition;
    std::u16string order;
    bool has_order = false;
    bool quoted = false;
    for (std::size_t i = 0; i < text.size(); ++i) {
      if (text[i] == u'\'') quoted = !quoted;
      if (!quoted && text.substr(i, 5) == u" ORDE") {
        const std::u16string_view rest = text.substr(i);
        const auto by = rest.find(u"BY");
        if (by != std::u16string_view::npos) order = std::u16string(TrimBlanks(rest.substr(by + 2)));
        has_order = true;
        text = text.substr(0, i);
        break;
      }
    }
    RequirePlainOrderNames(order);
    root_.reset();
    part_count_ = 0;
    if (TrimBlanks(text).empty()) {
      throw CGiCmdTreeException::Numbered(kErrorEmptyCondition, "StartBuildTreeW", nullptr);
    }
    auto root = BuildNode(text, false, 0);
    const int32_t parts = CountSearchParts(root.get());
    RewriteNegations(root, false);
    root_ = std::move(root);
    part_count_ = parts;
    order_ = std::move(order);
    has_order_ = has_order;
  });
}

std::unique_ptr<CGiNode> CGiCmdTree::BuildNode(std::u16string_view text, bool value_mode,
                                               int depth) {
  if (depth > kGiMaxConditionDepth) {
    throw CGiCmdTreeException::Text("Search condition nested too deeply", "StartBuildTreeW",
                                    nullptr);
  }
  const std::u16string inner = RemoveParenthesesW(TrimBlanks(text));
  GiSplit split = FindOperatorW(inner);
  if (!value_mode && split.code != kGiOpNone && split.code != kGiOpNot &&
      HasComparison(split.left) && !HasComparison(split.right)) {
    // ID='5' OR '7': the operator joins values of one condition.
    split.code = kGiOpNone;
  }
  if (split.code == kGiOpNone) {
    if (value_mode) {
      std::u16string word = UndoubleQuotes(StripQuotes(TrimBlanks(inner)));
      if (word.size() > kWordLimit) word.resize(Utf16CutLength(word, kWordCutLength));
      return CGiNode::Word(std::move(word));
    }
    auto node = std::make_unique<CGiNode>();
    node->kind = GiNodeKind::Condition;
    const bool rebuilt = FillCondition(*node, inner, depth);
    if (rebuilt) return std::move(node->left);
    return node;
  }
  if (split.code == kGiOpNot) {
    auto node = std::make_unique<CGiNode>();
    node->kind = GiNodeKind::Negation;
    node->op = kGiOpNot;
    node->left = BuildNode(split.right, value_mode, depth + 1);
    return node;
  }
  int32_t distance = 0;
  std::u16string_view right = split.right;
  if (split.code == kGiOpNear) {
    std::size_t digits = 0;
    while (digits < right.size() && right[digits] >= u'0' && right[digits] <= u'9') ++digits;
    if (digits > 5) {
      throw CGiCmdTreeException::Text("NEAR distance has more than 5 digits",
                                      "StartBuildTreeW", nullptr);
    }
    distance = kGiDefaultNearDistance;
    if (digits > 0) {
      distance = 0;
      for (std::size_t i = 0; i < digits; ++i) distance = distance * 10 + (right[i] - u'0');
    }
    right = right.substr(digits);
  }
  auto left_node = BuildNode(split.left, value_mode, depth + 1);
  auto right_node = BuildNode(right, value_mode, depth + 1);
  auto node = CGiNode::Operator(split.code, std::move(left_node), std::move(right_node));
  node->near_distance = distance;
  return node;
}

bool CGiCmdTree::FillCondition(CGiNode& node, std::u16string_view text, int depth) {
  const std::u16string masked = HideExpW(text);
  const GiComparison cmp = GetEQW(masked);
  const std::u16string name(TrimBlanks(text.substr(0, cmp.position)));
  if (name.size() > kGiMaxNodeText) {
    throw CGiCmdTreeException::Text("Findex name longer than %i characters: %s",
                                    "StartBuildTreeW", nullptr,
                                    static_cast<int>(kGiMaxNodeText), name.substr(0, 60));
  }
  RequirePlainName<CGiCmdTreeException>("findex", Utf16ToUtf8(name), "StartBuildTreeW");
  node.text = name;
  node.flags = cmp.flags;
  node.modifier = cmp.modifier;

  const std::u16string_view after = text.substr(cmp.position + cmp.length);
  std::u16string value = u"'";
  value.append(TrimBlanks(StripQuotes(TrimBlanks(after))));
  value.push_back(u'\'');

  if (cmp.flags & kGiCmpPlainQuery) {
    const std::u16string plain = UndoubleQuotes(StripQuotes(TrimBlanks(after)));
    node.left = BuildNode(ParsePlainQueryW(plain, name), false, depth + 1);
    return true;
  }

  const GiFindexFacts facts = facts_(name);
  const CSeparatorSet separators(facts.separators);
  if ((facts.language_options & CLanguage::kUseStopWords) && value.size() < kStopWordValueLimit) {
    Language().LoadLanguage(facts.language, true, false, false, false, false);
    value = RemoveStopWords(value, separators);
  }
  if (facts.findex_type == 2 || facts.findex_type == 4) {
    value = ReplacePhraseBlankW(value, separators);
  }
  node.left = BuildNode(value, true, depth + 1);
  return false;
}

CLanguage& CGiCmdTree::Language() {
  if (!language_) {
    language_ = defs_ ? std::make_unique<CLanguage>(*defs_)
                      : std::make_unique<CLanguage>(language_folder_);
  }
  return *language_;
}

std::u16string CGiCmdTree::RemoveStopWords(std::u16string_view value,
                                           const CSeparatorSet& separators) {
  std::u16string out;
  out.reserve(value.size());
  std::size_t start = 0;
  // Only words inside quotes are searched for: a word between quoted values is
  // an operator ('red' OR 'blue'), and dropping it as the stop word "or" would
  // change what is asked.
  bool quoted = false;
  for (std::size_t i = 0; i <= value.size(); ++i) {
    const bool at_end = i == value.size();
    if (!at_end && value[i] != u'\'' && !IsValueSeparatorAt(value, i, separators)) continue;
    const std::u16string_view word = value.substr(start, i - start);
    const bool stop = quoted && !word.empty() && language_->IsStopWord(word);
    if (!at_end && value[i] == u'\'') quoted = !quoted;
    if (!stop) {
      out.append(word);
      if (!at_end) out.push_back(value[i]);
    } else if (!at_end && value[i] == u'\'') {
      out.push_back(u'\'');  // the phrase stays closed
    }
    start = i + 1;
  }
  std::u16string wrapped = u"'";
  wrapped.append(TrimBlanks(StripQuotes(TrimBlanks(out))));
  wrapped.push_back(u'\'');
  return wrapped;
}

std::u16string CGiCmdTree::TreeToString() const {
  if (!root_) {
    throw CGiCmdTreeException::Text("Could not print statement. Statement has not been parsed",
                                    "TreeToString", nullptr);
  }
  std::u16string out;
  PrintNode(*root_, out);
  try {
    return RemoveParenthesesW(out);
  } catch (const CGiCmdTreeException&) {
    return out;  // words holding parentheses: print them as they stand
  }
}

std::u16string CGiCmdTree::FindFirstIndexW(const CGiNode& subtree) {
  const CGiNode* found = FirstCondition(subtree);
  if (!found) throw CGiCmdTreeException::General("FindFirstIndexW");
  return found->text;
}

int32_t CGiCmdTree::CountSearchParts(const CGiNode* tree) {
  return Guarded("CountSearchParts", [&] { return CountParts(tree); });
}

std::u16string CGiCmdTree::ParsePlainQueryW(std::u16string_view text,
                                            std::u16string_view findex_name) {
  return Guarded("ParsePlainQueryW", [&] {
    std::u16string out;
    // Whether the output ends with a condition (or a closed group), so a
    // following word needs an operator before it.
    bool after_operand = false;
    bool any_condition = false;
    for (std::u16string_view token : PlainTokens(text)) {
      std::u16string prefix;
      while (!token.empty() && token.front() == u'(') {
        prefix.push_back(u'(');
        token.remove_prefix(1);
      }
      std::u16string modifier;
      if (!token.empty() && (token.front() == u'~' || token.front() == u'%')) {
        modifier.push_back(token.front() == u'~' ? u'|' : u'^');
        token.remove_prefix(1);
        while (!token.empty() && token.front() >= u'0' && token.front() <= u'9') {
          modifier.push_back(token.front());
          token.remove_prefix(1);
        }
      }
      std::u16string suffix;
      while (!token.empty() && token.back() == u')') {
        suffix.push_back(u')');
        token.remove_suffix(1);
      }
      const bool is_not = IsAsciiUpperEqual(token, u"NOT");
      const bool is_operator = is_not || IsAsciiUpperEqual(token, u"AND") ||
                               IsAsciiUpperEqual(token, u"OR") ||
                               IsAsciiUpperEqual(token, u"NEAR") ||
                               (token.size() >= 5 && IsAsciiUpperEqual(token.substr(0, 5), u"NEAR/"));
      if (is_operator && modifier.empty()) {
        if (is_not && !after_operand) {
          // A leading NOT excludes from every word; after another operator
          // it negates the operand alone.
          out.append(prefix);
          if (!any_condition) {
            out.append(findex_name);
            out.append(u"='*' AND NOT ");
            any_condition = true;
          } else {
            out.append(u" NOT ");
          }
          out.append(suffix);
          after_operand = false;
          continue;
        }
        out.append(prefix);
        out.push_back(u' ');
        out.append(is_not ? std::u16string_view(u"AND NOT") : token);
        out.push_back(u' ');
        out.append(suffix);
        after_operand = false;
        continue;
      }
      if (after_operand) out.append(u" AND ");
      out.append(prefix);
      std::u16string_view word = token;
      if (word.size() >= 2 && word.front() == u'"' && word.back() == u'"') {
        word = word.substr(1, word.size() - 2);
      } else {
        if (!word.empty() && word.front() == u'"') word.remove_prefix(1);
        if (!word.empty() && word.back() == u'"') word.remove_suffix(1);
      }
      out.append(findex_name);
      out.push_back(u'=');
      out.append(modifier);
      out.push_back(u'\'');
      for (const char16_t c : word) {
        out.push_back(c);
        if (c == u'\'') out.push_back(u'\'');  // a quote inside a word stays in the word
      }
      out.push_back(u'\'');
      out.append(suffix);
      after_operand = true;
      any_condition = true;
    }
    return out;
  });
}

void CGiCmdTree::RebuildSql(std::u16string_view key_string, bool score_active,
                            std::u16string_view key_column) {
  Guarded("RebuildSql", [&] {
    std::u16string sql;
    if (key_string.empty() || key_string == u"()" || key_string == u"0;());") {
      sql = score_active ? ReplaceScoreColumn(head_, u"0 as SCORE,", u",0 as SCORE")
                         : ReplaceScoreColumn(head_, u"", u"");
      sql.append(u"1=2 ");
      sql.append(tail_);
    } else if (!score_active) {
      sql = ReplaceScoreColumn(head_, u"", u"");
      sql.append(key_column);
      sql.append(u" in ");
      sql.append(key_string);
      sql.push_back(u' ');
      sql.append(tail_);
    } else {
      std::vector<std::u16string_view> parts;
      std::size_t start = 0;
      while (start < key_string.size()) {
        auto end = key_string.find(u';', start);
        if (end == std::u16string_view::npos) end = key_string.size();
        parts.push_back(key_string.substr(start, end - start));
        start = end + 1;
      }
      if (parts.size() % 2 != 0) {
        throw CGiCmdTreeException::Text("Key string is not a list of scores and keys: %s",
                                        "RebuildSql", nullptr, key_string.substr(0, 60));
      }
      for (std::size_t i = 0; i < parts.size(); i += 2) {
        if (i > 0) sql.append(u" UNION ALL ");
        std::u16string score(parts[i]);
        score.append(u" as SCORE");
        sql.append(ReplaceScoreWord(head_, score));
        sql.append(key_column);
        sql.append(u" in ");
        sql.append(parts[i + 1]);
        sql.push_back(u' ');
        sql.append(tail_);
      }
    }
    condition_ = std::move(sql);
  });
}

std::u16string CGiCmdTree::RebuildOrderList(int mode) const {
  return Guarded("RebuildSql", [&] {
    if (mode == 0) return order_;
    const std::u16string upper = ToUpper(order_);
    std::u16string out;
    std::size_t start = 0;
    while (start <= upper.size()) {
      auto end = upper.find(u',', start);
      if (end == std::u16string::npos) end = upper.size();
      const std::u16string_view item = std::u16string_view(upper).substr(start, end - start);
      if (item.find(u"SCORE") == std::u16string_view::npos) {
        out.append(item);
        out.push_back(u',');
      }
      start = end + 1;
    }
    while (!out.empty() && out.back() == u',') out.pop_back();
    return out;
  });
}

}  // namespace qm
