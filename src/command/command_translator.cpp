#include "command/command_translator.h"

#include <algorithm>
#include <limits>
#include <optional>

#include "base/error_numbers.h"
#include "command/findex_column_parser.h"
#include "command/order_column_parser.h"
#include "command/quoted_text.h"
#include "command/statement_mask.h"
#include "command/statement_words.h"
#include "platform/text_encoding.h"
#include "base/exception_family.h"
#include "base/trace.h"

namespace qm {

namespace {

constexpr const char* kTranslateW = "TranslateW";
constexpr std::string_view kTagSplit = "PILIB.cmd.SplitStrW";
constexpr std::string_view kTagTranslate = "PILIB.cmd.TranslateW";

// Numbered errors of the command language.

CPiCmdException Numbered(int32_t number) {
  return CPiCmdException::Numbered(number, kTranslateW, nullptr);
}

CPiCmdException TextError(std::string_view text) {
  return CPiCmdException::Text(text, kTranslateW, nullptr);
}

std::string Narrow(std::u16string_view text) { return Utf16ToUtf8(text); }

// Reads optional leading blanks and sign, then decimal digits up to the first
// other character, in 64 bits; nullopt when the value leaves the 32-bit range.
std::optional<int32_t> ParseKeyValue(std::u16string_view word) {
  std::size_t i = 0;
  while (i < word.size() && (word[i] == u' ' || word[i] == u'\t')) ++i;
  bool negative = false;
  if (i < word.size() && (word[i] == u'+' || word[i] == u'-')) negative = word[i++] == u'-';
  constexpr int64_t kLimit = int64_t{1} << 40;  // far outside 32 bits; stops growth
  int64_t value = 0;
  for (; i < word.size() && word[i] >= u'0' && word[i] <= u'9'; ++i) {
    value = std::min(value * 10 + (word[i] - u'0'), kLimit);
  }
  if (negative) value = -value;
  if (value < std::numeric_limits<int32_t>::min() || value > std::numeric_limits<int32_t>::max()) {
    return std::nullopt;
  }
  return static_cast<int32_t>(value);
}

}  // namespace

void RequireNameWithoutSpaces(std::u16string_view name, std::string_view message,
                              const char* method) {
  if (std::any_of(name.begin(), name.end(), IsBlank)) {
    throw CPiCmdException::Text(message, method, nullptr);
  }
}

PiCmd::PiCmd(CIndexHeader& findex, COrderInfo& order, ConnectionSettings& connection,
             const IndexOptions& index_options, const OrderOptions& order_options)
    : findex_(findex),
      order_(order),
      connection_(connection),
      index_options_(index_options),
      order_options_(order_options) {
  words_.reserve(kMaxWords);
}

void PiCmd::SplitStrW(std::u16string_view statement) {
  Guard<CPiCmdException, CPiCmdUnknownException>("SplitStrW",
                                                 [&] { Split(statement, "SplitStrW"); });
}

void PiCmd::Split(std::u16string_view statement, const char* method) {
  const StatementSplit split = SplitStatement(statement);
  // The statement is refused whole: cutting it would change its meaning.
  if (split.words.size() > kMaxWords) {
    throw CPiCmdException::Text(
        "Statement has too many words: %i words found, at most %i are allowed", method, nullptr,
        split.words.size(), kMaxWords);
  }
  const bool connect = !split.words.empty() &&
                       ToUpper(statement.substr(split.words[0].begin,
                                                split.words[0].end - split.words[0].begin)) ==
                           u"CONNECT";
  if (TraceLevel3) {
    Trace(true, kTagSplit, "Spliting. Statement: %s", Narrow(MaskStatementForTrace(statement)));
  }
  words_.clear();
  for (std::size_t i = 0; i < split.words.size(); ++i) {
    const WordSpan span = split.words[i];
    words_.emplace_back(statement.substr(span.begin, span.end - span.begin));
    if (TraceLevel3) {
      const std::u16string shown =
          connect && i == 3 ? std::u16string(kMaskedSecret) : MaskWordForTrace(words_.back());
      Trace(true, kTagSplit, "Spliting. Word: %s", Narrow(shown));
    }
  }
  unterminated_quote_ = split.unterminated_quote;
}

void PiCmd::TranslateW(std::u16string_view statement) {
  Guard<CPiCmdException, CPiCmdUnknownException>(kTranslateW, [&] { Translate(statement); });
}

bool PiCmd::IsKeyword(std::size_t i, std::u16string_view keyword) const {
  return i < words_.size() && ToUpper(words_[i]) == keyword;
}

void PiCmd::RequireWord(std::size_t i) const {
  if (i >= words_.size()) throw Numbered(kErrCommandSyntax);
}

void PiCmd::Translate(std::u16string_view statement) {
  rebuild_ = 0;
  create_ = 0;
  cmd_type_ = kCmdNotRecognised;
  delete_key_value_ = 0;
  pass_through_sql_.clear();
  words_.clear();
  unterminated_quote_ = false;
  index_options_.CopyTo(findex_);
  order_options_.CopyTo(order_);

  const std::u16string normalized = NormalizeStatement(statement);
  Split(normalized, kTranslateW);
  if (TraceLevel1) {
    Trace(true, kTagTranslate, "Translating. Statement: %s, Words: %i",
          Narrow(MaskStatementForTrace(normalized)), words_.size());
  }
  if (words_.empty()) throw Numbered(kErrNoCommand);

  const bool create_or_update = IsKeyword(0, u"CREATE") || IsKeyword(0, u"UPDATE");
  // The pass-through SQL goes to the data source as written; its quotes are
  // the data source's business.
  if (unterminated_quote_ && !(create_or_update && IsKeyword(1, u"INDEX"))) {
    throw Numbered(kErrCommandSyntax);
  }
  if (create_or_update) {
    TranslateCreateOrUpdate(statement);
  } else if (IsKeyword(0, u"DROP")) {
    TranslateDrop();
  } else if (IsKeyword(0, u"CONNECT")) {
    TranslateConnect();
  } else if (IsKeyword(0, u"SET")) {
    TranslateSet();
  } else if (IsKeyword(0, u"DELETE")) {
    TranslateDelete();
  } else {
    if (TraceLevel1) {
      Trace(true, kTagTranslate, "Could not find command. Statement: %s, Words: %i",
            Narrow(MaskStatementForTrace(normalized)), words_.size());
    }
    throw TextError("Unknown command");
  }
}

void PiCmd::TranslateCreateOrUpdate(std::u16string_view statement) {
  const int16_t create = IsKeyword(0, u"CREATE") ? 1 : 0;
  create_ = create;
  rebuild_ = create;
  RequireWord(1);
  if (IsKeyword(1, u"FINDEX")) {
    TranslateFindex();
  } else if (IsKeyword(1, u"ORDER")) {
    TranslateOrder();
  } else if (IsKeyword(1, u"INDEX")) {
    pass_through_sql_ = std::u16string(statement);
    cmd_type_ = kCmdPassThroughSql;
  }
  // Anything else stays unrecognised and is refused when executed.
}

PiCmd::DefinitionWords PiCmd::ReadDefinitionWords() {
  DefinitionWords words;
  RequireWord(4);
  if (!IsKeyword(4, u"TABLE")) throw TextError("Expected keyword <TABLE>");
  RequireWord(5);
  words.table = words_[5];
  RequireWord(6);
  if (!IsKeyword(6, u"COLUMNS")) throw TextError("Expected keyword <COLUMNS>");

  const std::size_t n = words_.size();
  std::size_t key_at = 7;
  while (key_at < n && !IsKeyword(key_at, u"KEY")) ++key_at;
  if (key_at + 1 >= n) throw Numbered(kErrCommandSyntax);  // no KEY, or nothing after it
  for (std::size_t i = 7; i < key_at; ++i) words.columns += words_[i];
  words.key = words_[key_at + 1];

  const std::size_t extra = n - (key_at + 2);
  if (extra > 1 || (extra == 1 && !IsKeyword(n - 1, u"REBUILD"))) {
    throw Numbered(kErrExtraWords);
  }
  if (extra == 1) rebuild_ = 1;
  return words;
}

// The opening FINDEX and ORDER definitions share: NAME alone or NAME REBUILD
// take the stored definition (stored_type); NAME ON TABLE ... KEY ... reads a
// new one into definition and returns its words. not_on makes the error for
// anything else after the name.
template <class Definition, class NotOn>
std::optional<PiCmd::DefinitionWords> PiCmd::ReadDefinitionOpening(
    Definition& definition, std::string& name, std::string_view spaces_message,
    int32_t stored_type, NotOn not_on) {
  RequireWord(2);
  RequireNameWithoutSpaces(words_[2], spaces_message, kTranslateW);
  name = Narrow(words_[2]);
  const std::size_t n = words_.size();
  if (n == 3 || IsKeyword(3, u"REBUILD")) {
    if (n != 3) {
      if (n != 4) throw Numbered(kErrCommandSyntax);
      rebuild_ = 1;
    }
    cmd_type_ = stored_type;
    return std::nullopt;
  }
  if (!IsKeyword(3, u"ON")) throw not_on();

  DefinitionWords words = ReadDefinitionWords();
  definition.TableName = Narrow(words.table);
  definition.SqlUsedAsTable = 0;
  definition.SqlSelect.clear();
  definition.KeyColumn = Narrow(words.key);
  return words;
}

void PiCmd::TranslateFindex() {
  const auto words = ReadDefinitionOpening(findex_, findex_.IndexName, kSpacesInIndexName,
                                           kCmdFindexStored,
                                           [] { return Numbered(kErrOnOrRebuild); });
  if (!words) return;
  ParseFindexColumns(words->columns, findex_.Columns, kTranslateW);
  cmd_type_ = kCmdFindexDefined;
}

void PiCmd::TranslateOrder() {
  const auto words = ReadDefinitionOpening(order_, order_.OrderName, kSpacesInOrderName,
                                           kCmdOrderStored,
                                           [] { return TextError("Expected keyword <ON>"); });
  if (!words) return;
  ParseOrderColumns(words->columns, order_.Columns, kTranslateW);
  cmd_type_ = kCmdOrderDefined;
}

void PiCmd::TranslateDrop() {
  RequireWord(1);
  if (IsKeyword(1, u"FINDEX")) {
    RequireWord(2);
    findex_.IndexName = Narrow(words_[2]);
    cmd_type_ = kCmdDropFindex;
  } else if (IsKeyword(1, u"ORDER")) {
    RequireWord(2);
    order_.OrderName = Narrow(words_[2]);
    cmd_type_ = kCmdDropOrder;
  }
  // DROP of anything else stays unrecognised; extra words are ignored.
}

void PiCmd::TranslateConnect() {
  RequireWord(1);
  auto optional_value = [this](std::size_t i) {
    if (i >= words_.size() || IsKeyword(i, u"EMPTY")) return std::string();
    return Narrow(UnquoteValue(words_[i]));
  };
  connection_.Dsn = Narrow(UnquoteValue(words_[1]));
  connection_.UserId = optional_value(2);
  connection_.Password = optional_value(3);
  connection_.Mode = ConnectionMode::Dsn;
  connection_.IsSet = true;
  cmd_type_ = kCmdConnect;
}

void PiCmd::TranslateSet() {
  RequireWord(1);
  RequireWord(2);
  const bool group = IsKeyword(1, u"GROUP");
  if (!group && !IsKeyword(1, u"CONNECTIONSTRING")) throw Numbered(kErrCommandSyntax);
  // A value with blanks must be quoted; the words after an unquoted one would
  // otherwise be lost without notice.
  if (words_.size() > 3) throw Numbered(kErrExtraWords);
  if (group) {
    connection_.Group = Narrow(words_[2]);
    cmd_type_ = kCmdSetGroup;
  } else {
    connection_.ConnectionString = Narrow(UnquoteValue(words_[2]));
    connection_.DisplayName.clear();
    connection_.Mode = ConnectionMode::ConnectionString;
    connection_.IsSet = true;
    cmd_type_ = kCmdSetConnectionString;
  }
}

void PiCmd::TranslateDelete() {
  RequireWord(1);
  if (!IsKeyword(1, u"FROM")) throw Numbered(kErrCommandSyntax);
  RequireWord(2);
  if (!IsKeyword(2, u"FINDEX")) throw Numbered(kErrCommandSyntax);
  RequireWord(3);
  findex_.IndexName = Narrow(words_[3]);
  RequireWord(4);
  const std::optional<int32_t> key = ParseKeyValue(words_[4]);
  if (!key || *key == 0) throw Numbered(kErrDeleteKey);
  if (words_.size() != 5) throw Numbered(kErrExtraWords);
  delete_key_value_ = *key;
  cmd_type_ = kCmdDeleteKey;
}

}  // namespace qm
