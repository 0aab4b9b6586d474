// quillmere options get|set KIND: the group's default index and order options,
// printed as enum-name<TAB>text lines and changed by enum-name=value pairs.
#include <charconv>
#include <cstdio>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "command_registry.h"
#include "format/index_header.h"
#include "format/order_info.h"
#include "host_session.h"
#include "platform/text_encoding.h"

namespace qm::cli {
namespace {

constexpr const char* kUsage = "options get KIND [--stored NAME] | options set KIND NAME=VALUE...";

enum class ValueKind { Bit, Number, Text };

struct Option {
  const char* name;
  int32_t value;
  ValueKind kind;
};

using Getter = HRESULT (APICommand::*)(int32_t, VARIANT_BOOL, BSTR*);
// The values of one set, by option value: "1"/"0", decimal text, or text.
using Values = std::map<int32_t, std::string>;

struct OptionSet {
  const char* kind;
  Getter getter;
  bool index;  // saved with the index options, else with the order options
  std::vector<Option> options;
};

VARIANT_BOOL Flag(const Values& v, int32_t option) {
  return v.at(option) == "1" ? VARIANT_TRUE : VARIANT_FALSE;
}

int32_t Number(const Values& v, int32_t option) { return std::stoi(v.at(option)); }

// The separators and ignore characters as the getters show them, blanks
// written <SPACE>, <NEW_LINE>, <LINE_FEED>, <TAB>, back to their characters.
std::string DecodeBlanks(std::string text) {
  static const std::pair<const char*, char> kNames[] = {
      {"<SPACE>", ' '}, {"<NEW_LINE>", '\n'}, {"<LINE_FEED>", '\r'}, {"<TAB>", '\t'}};
  std::string out;
  for (std::size_t i = 0; i < text.size();) {
    bool replaced = false;
    for (const auto& [name, c] : kNames) {
      if (text.compare(i, std::char_traits<char>::length(name), name) == 0) {
        out += c;
        i += std::char_traits<char>::length(name);
        replaced = true;
        break;
      }
    }
    if (!replaced) out += text[i++];
  }
  return out;
}

const std::vector<OptionSet>& OptionSets() {
  static const std::vector<OptionSet> sets = {
      {"index-language",
       &APICommand::GetIndexLanguageOption,
       true,
       {{"iloLanguage", iloLanguage, ValueKind::Number},
        {"iloUseStemming", iloUseStemming, ValueKind::Bit},
        {"iloUsePhonetic", iloUsePhonetic, ValueKind::Bit},
        {"iloRemoveAccent", iloRemoveAccent, ValueKind::Bit},
        {"iloUseCharacterTranslation", iloUseCharacterTranslation, ValueKind::Bit},
        {"iloUseStopWords", iloUseStopWords, ValueKind::Bit}}},
      {"index-general",
       &APICommand::GetIndexGeneralOption,
       true,
       {{"igoIndexMaxSize", igoIndexMaxSize, ValueKind::Number},
        {"igoIndexStartValue", igoIndexStartValue, ValueKind::Number},
        {"igoSeparators", igoSeparators, ValueKind::Text},
        {"igoSupportScore", igoSupportScore, ValueKind::Bit},
        {"igoSupportPhrases", igoSupportPhrases, ValueKind::Bit},
        {"igoUseDefaultSeparators", igoUseDefaultSeparators, ValueKind::Bit},
        {"igoSaveDatabaseConnection", igoSaveDatabaseConnection, ValueKind::Bit},
        {"igoRemoveHtml", igoRemoveHtml, ValueKind::Bit},
        {"igoUseUnicode", igoUseUnicode, ValueKind::Bit}}},
      {"index-update",
       &APICommand::GetIndexUpdateOption,
       true,
       {{"iuoUpdateSupport", iuoUpdateSupport, ValueKind::Number},
        {"iuoUseDateTimeKey", iuoUseDateTimeKey, ValueKind::Bit},
        {"iuoUseDateTimeFraction", iuoUseDateTimeFraction, ValueKind::Bit}}},
      {"order-general",
       &APICommand::GetOrderGeneralOption,
       false,
       {{"ogoIgnoreChars", ogoIgnoreChars, ValueKind::Text},
        {"ogoIgnorreCase", ogoIgnorreCase, ValueKind::Bit},
        {"ogoSaveDatabaseConnection", ogoSaveDatabaseConnection, ValueKind::Bit}}},
      {"order-update",
       &APICommand::GetOrderUpdateOption,
       false,
       {{"ouoUpdateSupport", ouoUpdateSupport, ValueKind::Number},
        {"ouoUseDateTimeKey", ouoUseDateTimeKey, ValueKind::Bit},
        {"ouoUseDateTimeFraction", ouoUseDateTimeFraction, ValueKind::Bit}}},
  };
  return sets;
}

// Calls the setter of the set with every value.
HRESULT Apply(const OptionSet& set, HostSession& session, const Values& v) {
  APICommand& c = session.Command();
  const std::string kind = set.kind;
  if (kind == "index-language") {
    return c.SetIndexLanguageOptions(Number(v, iloLanguage), Flag(v, iloUseStemming),
                                     Flag(v, iloUsePhonetic), Flag(v, iloUseStopWords),
                                     Flag(v, iloRemoveAccent), Flag(v, iloUseCharacterTranslation));
  }
  if (kind == "index-general") {
    return c.SetIndexGeneralOptionsEx(
        Flag(v, igoSupportScore), Flag(v, igoSupportPhrases), Flag(v, igoRemoveHtml),
        session.Text(DecodeBlanks(v.at(igoSeparators))), Flag(v, igoUseDefaultSeparators),
        Flag(v, igoSaveDatabaseConnection), Number(v, igoIndexMaxSize),
        Number(v, igoIndexStartValue));
  }
  if (kind == "index-update") {
    return c.SetIndexUpdateOptions(Number(v, iuoUpdateSupport), Flag(v, iuoUseDateTimeKey),
                                   Flag(v, iuoUseDateTimeFraction));
  }
  if (kind == "order-general") {
    return c.SetOrderGeneralOptions(Flag(v, ogoSaveDatabaseConnection), Flag(v, ogoIgnorreCase),
                                    session.Text(v.at(ogoIgnoreChars)));
  }
  return c.SetOrderUpdateOptions(Number(v, ouoUpdateSupport), Flag(v, ouoUseDateTimeKey),
                                 Flag(v, ouoUseDateTimeFraction));
}

void PrintHelp() {
  std::printf(
      "usage: quillmere [GLOBAL OPTIONS] %s\n\n"
      "KIND is index-language, index-general, index-update, order-general or\n"
      "order-update. The host starts from the group's saved default options.\n\n"
      "  options get KIND               prints the current options of the kind, one line\n"
      "                                 each: enum-name<TAB>text\n"
      "  options get KIND --stored NAME prints the options stored with the findex NAME\n"
      "                                 (index kinds) or the order NAME (order kinds)\n"
      "  options set KIND NAME=VALUE... changes options of the kind, saves the group's\n"
      "                                 defaults and prints the new values\n\n"
      "NAME is an enum name as printed (igoSupportScore); a bit takes 1 or 0, a number\n"
      "a decimal integer, igoSeparators and ogoIgnoreChars a text in which <SPACE>,\n"
      "<NEW_LINE>, <LINE_FEED> and <TAB> stand for those characters in igoSeparators.\n"
      "igoUseUnicode is reported only and cannot be set.\n\n"
      "Values no build can use are refused and nothing is changed (exit status 2):\n"
      "iloLanguage outside 1 to 12, a negative igoIndexMaxSize, and an igoSeparators\n"
      "or ogoIgnoreChars too long for the header block of a findex or an order.\n",
      kUsage);
}

const OptionSet* FindSet(const std::string& kind) {
  for (const auto& set : OptionSets()) {
    if (kind == set.kind) return &set;
  }
  return nullptr;
}

// Reads every option of the set; false after printing the error.
bool Read(HostSession& session, const OptionSet& set, bool current, Values& values) {
  for (const Option& option : set.options) {
    BSTR text;
    if ((session.Command().*set.getter)(option.value, current ? VARIANT_TRUE : VARIANT_FALSE,
                                        &text) != S_OK) {
      session.Fail();
      return false;
    }
    values[option.value] = Utf16ToUtf8(text);
  }
  return true;
}

void Print(const OptionSet& set, const Values& values) {
  std::string out;
  for (const Option& option : set.options) {
    out += std::string(option.name) + "\t" + values.at(option.value) + "\n";
  }
  std::fputs(out.c_str(), stdout);
}

// Values that parse but that no build can use: saved, they would fail every
// later build of the group, or index other than asked.
std::optional<std::string> CheckRange(const OptionSet& set, const Option& option,
                                      const std::string& text) {
  const std::string kind = set.kind;
  if (kind == "index-language" && option.value == iloLanguage) {
    const int32_t n = std::stoi(text);
    if (n < lngDanish || n > lngOther) {
      return std::string("takes a language from 1 to 12 (1 Danish, 2 English, ... 12 Other)");
    }
  }
  if (kind == "index-general" && option.value == igoIndexMaxSize && std::stoi(text) < 0) {
    return std::string("takes 0 (no limit) or a positive number of 100,000-key units");
  }
  // Both texts are stored in the header block of every findex or order built.
  if (kind == "index-general" && option.value == igoSeparators) {
    CIndexHeader probe;
    probe.Separators = Utf8ToUtf16(DecodeBlanks(text));
    if (!probe.FitsHeaderBlock()) {
      return "is too long (" + std::to_string(probe.Separators.size()) +
             " characters) for the findex header, which holds the whole definition in 4,096 "
             "bytes";
    }
  }
  if (kind == "order-general" && option.value == ogoIgnoreChars) {
    COrderInfo probe;
    probe.IgnoreChars = Utf8ToUtf16(text);
    if (!probe.FitsHeaderBlock()) {
      return "is too long (" + std::to_string(probe.IgnoreChars.size()) +
             " characters) for the order header, which holds the whole definition in 4,096 bytes";
    }
  }
  return std::nullopt;
}

std::optional<std::string> CheckValue(const OptionSet& set, const Option& option,
                                      const std::string& text) {
  switch (option.kind) {
    case ValueKind::Bit:
      if (text != "0" && text != "1") return std::string("takes 1 or 0");
      return std::nullopt;
    case ValueKind::Number: {
      int32_t n = 0;
      const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), n);
      if (error != std::errc() || end != text.data() + text.size()) {
        return std::string("takes a decimal integer");
      }
      return CheckRange(set, option, text);
    }
    case ValueKind::Text: return CheckRange(set, option, text);
  }
  return std::nullopt;
}

int RunOptions(const GlobalOptions& global, const std::vector<std::string>& args) {
  HostSession session("options");
  if (!args.empty() && IsHelpFlag(args[0])) {
    PrintHelp();
    return kExitOk;
  }
  if (args.size() < 2 || (args[0] != "get" && args[0] != "set")) {
    return session.Usage("expected get or set and an option kind", kUsage);
  }
  const OptionSet* set = FindSet(args[1]);
  if (set == nullptr) return session.Usage("unknown option kind: " + args[1], kUsage);

  if (args[0] == "get") {
    std::optional<std::string> stored;
    if (args.size() == 4 && args[2] == "--stored") {
      stored = args[3];
    } else if (args.size() != 2) {
      return session.Usage("options get takes only --stored NAME", kUsage);
    }
    if (!session.Open(global)) return kExitError;
    if (stored && !(set->index ? session.RequireFindex(*stored) : session.RequireOrder(*stored))) {
      return kExitError;
    }
    if (stored && session.Command().SetCurrentObjectName(session.Text(*stored)) != S_OK) {
      return session.Fail();
    }
    Values values;
    if (!Read(session, *set, !stored, values)) return kExitError;
    Print(*set, values);
    return kExitOk;
  }

  if (args.size() < 3) return session.Usage("options set needs NAME=VALUE pairs", kUsage);
  std::map<int32_t, std::string> changes;
  for (std::size_t i = 2; i < args.size(); ++i) {
    const auto eq = args[i].find('=');
    const std::string name = args[i].substr(0, eq);
    const Option* found = nullptr;
    for (const Option& option : set->options) {
      if (name == option.name) found = &option;
    }
    if (eq == std::string::npos || found == nullptr) {
      return session.Usage("not an option of " + std::string(set->kind) + ": " + args[i], kUsage);
    }
    if (found->value == igoUseUnicode && set->getter == &APICommand::GetIndexGeneralOption) {
      return session.Usage("igoUseUnicode is reported only and cannot be set", kUsage);
    }
    const std::string value = args[i].substr(eq + 1);
    if (const auto problem = CheckValue(*set, *found, value)) {
      return session.Usage(name + " " + *problem, kUsage);
    }
    changes[found->value] = value;
  }
  if (!session.Open(global)) return kExitError;
  Values values;
  if (!Read(session, *set, true, values)) return kExitError;
  for (const auto& [option, value] : changes) values[option] = value;
  if (Apply(*set, session, values) != S_OK) return session.Fail();
  APICommand& command = session.Command();
  if ((set->index ? command.SaveDefaultIndexOptions() : command.SaveDefaultOrderOptions()) !=
      S_OK) {
    return session.Fail();
  }
  if (!Read(session, *set, true, values)) return kExitError;
  Print(*set, values);
  return kExitOk;
}

const CommandRegistration kOptions{
    {"options", kUsage, "show or change the group's default index and order options", RunOptions}};

}  // namespace
}  // namespace qm::cli
