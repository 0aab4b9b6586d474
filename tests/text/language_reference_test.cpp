// Our Double Metaphone, phonet engine and stemming against the recorded output
// of independent implementations (see fixtures/README.md), and their
// properties beyond the reference tables: characters no rule can name, odd
// rule files, and arbitrary input.
#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <random>
#include <string>
#include <vector>

#include "platform/text_encoding.h"
#include "text/character_table.h"
#include "text/double_metaphone.h"
#include "text/language.h"
#include "text/language_test_support.h"
#include "text/phonet.h"

namespace qm::test {
namespace {

// Collects mismatches; reports the first hundred with their count.
struct Mismatches {
  std::vector<std::string> lines;
  void Add(const std::string& line) { lines.push_back(line); }
  std::size_t Count() const { return lines.size(); }
  std::string Report() const {
    std::string s;
    for (std::size_t i = 0; i < lines.size() && i < 100; ++i) s += lines[i] + "\n";
    return s;
  }
};

TEST(DoubleMetaphoneReference, PrimaryCodesEqualTheReferenceOnEveryWord) {
  const auto rows = ReadTable(FixturePath("double_metaphone/en-double-metaphone.tsv"));
  ASSERT_GT(rows.size(), 30000u);
  Mismatches bad;
  std::u16string code;
  bool saw_long_code = false;
  for (const auto& row : rows) {
    ASSERT_EQ(row.size(), 3u);
    text::DoubleMetaphonePrimary(ToUpper(Utf8ToUtf16(row[0])), code);
    const std::string got = Utf16ToUtf8(code);
    if (got != row[1]) bad.Add(row[0] + ": got " + got + ", expected " + row[1]);
    saw_long_code = saw_long_code || got.size() > 4;
  }
  EXPECT_EQ(bad.Count(), 0u) << bad.Report();
  EXPECT_TRUE(saw_long_code);
}

// --- phonet ---

bool IsLatin1Letter(char16_t c) {
  return (c >= u'A' && c <= u'Z') || (c >= u'a' && c <= u'z') ||
         (c >= 0xC0 && c <= 0xFF && c != 0xD7 && c != 0xF7);
}

const text::CharacterTable& ShippedTable() {
  static const text::CharacterTable table = [] {
    text::CharacterTable t;
    EXPECT_TRUE(text::CharacterTable::Parse(
        ReadFile(ShippedLanguageFolder() + "General/latin1.tbl"), t));
    return t;
  }();
  return table;
}

// The word as the reference engine sees it: non-letters dropped, accents
// removed through our shipped plain map (unless the rules keep them), upper
// case; the code may hold as many characters as the word had.
struct PreparedWord {
  std::u16string word;
  std::size_t cap = 0;
};

PreparedWord Prepare(const std::string& utf8, bool remove_accents) {
  const std::u16string in = Utf8ToUtf16(utf8);
  PreparedWord p;
  p.cap = in.size();
  for (const char16_t c : in) {
    if (!IsLatin1Letter(c)) continue;
    if (remove_accents) {
      p.word.push_back(ShippedTable().Plain()[c]);
    } else {
      const char32_t up = ToUpperCodePoint(c);
      p.word.push_back(up <= 0xFF ? static_cast<char16_t>(up) : c);
    }
  }
  return p;
}

void ExpectCodes(const text::PhonetRules& rules, const std::vector<std::vector<std::string>>& rows,
                 const std::string& what) {
  Mismatches bad;
  std::u16string code;
  std::u16string work;
  for (const auto& row : rows) {
    ASSERT_GE(row.size(), 1u) << what;
    const std::string expected = row.size() > 1 ? row[1] : "";
    const PreparedWord p = Prepare(row[0], rules.RemoveAccents());
    rules.Encode(p.word, p.cap, code, work);
    const std::string got = Utf16ToUtf8(code);
    if (got != expected) bad.Add(what + " " + row[0] + ": got " + got + ", expected " + expected);
  }
  EXPECT_EQ(bad.Count(), 0u) << bad.Report();
}

std::vector<std::string> FeatureNames() {
  std::vector<std::string> names;
  for (const auto& entry : std::filesystem::directory_iterator(FixturePath("phonet/features"))) {
    const std::string name = entry.path().filename().string();
    if (name.ends_with("_phonet.dat")) names.push_back(name.substr(0, name.size() - 11));
  }
  std::sort(names.begin(), names.end());
  return names;
}

TEST(PhonetReference, EveryFeatureFixtureGivesTheReferenceCodes) {
  const auto names = FeatureNames();
  ASSERT_EQ(names.size(), 28u);
  for (const auto& name : names) {
    const auto rules = text::PhonetRules::Parse(ReadFile(FixturePath("phonet/features/" + name + "_phonet.dat")));
    const auto rows = ReadTable(FixturePath("phonet/features/" + name + ".expected.tsv"));
    ASSERT_FALSE(rows.empty()) << name;
    ExpectCodes(rules, rows, name);
  }
}

TEST(PhonetReference, RuleFilesOfSevenLanguagesGiveTheReferenceCodes) {
  struct Case {
    const char* samples;
    const char* rules;
    bool keep_accents;
  };
  const Case cases[] = {
      {"da-phonet.tsv", "da_phonet.dat", false},
      {"de-phonet.tsv", "de_phonet.dat", false},
      {"de-phonet-keep-accents.tsv", "de_phonet.dat", true},
      {"en-phonet.tsv", "en_phonet.dat", false},
      {"fr-phonet.tsv", "fr_phonet.dat", false},
      {"nb-phonet.tsv", "nb_phonet.dat", false},
      {"nn-phonet.tsv", "nn_phonet.dat", false},
      {"sv-phonet.tsv", "sv_phonet.dat", false},
  };
  for (const Case& c : cases) {
    std::string bytes = ReadFile(FixturePath(std::string("phonet/rules/") + c.rules));
    if (c.keep_accents) bytes += "\nremove_accents 0\n";
    const auto rules = text::PhonetRules::Parse(bytes);
    EXPECT_EQ(rules.RemoveAccents(), !c.keep_accents);
    const auto rows = ReadTable(FixturePath(std::string("phonet/samples/") + c.samples));
    ASSERT_GT(rows.size(), 9000u) << c.samples;
    ExpectCodes(rules, rows, c.samples);
  }
}

// --- stemming, through the language object as the indexer uses it ---

TEST(StemmingReference, EveryLanguageStemsLikeTheReference) {
  struct Case {
    const char* file;
    int32_t language;
  };
  const Case cases[] = {
      {"stem-da-danish.tsv", lngDanish},         {"stem-en-english.tsv", lngEnglish},
      {"stem-fr-french.tsv", lngFrench},         {"stem-es-spanish.tsv", lngSpanish},
      {"stem-pt-portuguese.tsv", lngPortuguese}, {"stem-it-italian.tsv", lngItalian},
      {"stem-de-german.tsv", lngGerman},         {"stem-nl-dutch.tsv", lngDutch},
      {"stem-sv-swedish.tsv", lngSwedish},       {"stem-no-norwegian.tsv", lngNorwegian},
      {"stem-ru-russian.tsv", lngRussian},
  };
  CLanguage language(ShippedLanguageFolder());
  for (const Case& c : cases) {
    language.LoadLanguage(c.language, false, true, false, false, false);
    const auto rows = ReadTable(FixturePath(std::string("stemming/") + c.file));
    ASSERT_GT(rows.size(), 900u) << c.file;
    Mismatches bad;
    for (const auto& row : rows) {
      ASSERT_EQ(row.size(), 2u) << c.file;
      // Words reach the language object upper-cased by the word splitter.
      const std::string got = language.Normalise(std::string_view(ToUpper(row[0])));
      const std::string expected = ToUpper(row[1]);
      if (got != expected) bad.Add(std::string(c.file) + " " + row[0] + ": got " + got + ", expected " + expected);
    }
    EXPECT_EQ(bad.Count(), 0u) << bad.Report();
  }
}

// --- properties ---

// Rules and words from a small alphabet so that patterns often match: every
// marker, groups, broken rules, rewrites and restarts.
TEST(Phonet, ArbitraryRulesAndWordsAlwaysEndWithABoundedCode) {
  std::mt19937 random(3);
  const std::string pattern_chars = "ABCABCAB()-<^$0123456789*";
  for (int file = 0; file < 150; ++file) {
    std::string bytes = file % 2 ? "followup 0\n" : "collapse_result 1\n";
    const int count = 1 + static_cast<int>(random() % 20);
    for (int r = 0; r < count; ++r) {
      std::string pattern(1, "ABC*"[random() % 4]);
      const int length = static_cast<int>(random() % 7);
      for (int i = 0; i < length; ++i) pattern += pattern_chars[random() % pattern_chars.size()];
      std::string replacement;
      const int rlength = static_cast<int>(random() % 5);
      for (int i = 0; i < rlength; ++i) replacement += "ABC*X"[random() % 5];
      bytes += pattern + " " + (replacement.empty() ? "_" : replacement) + "\n";
    }
    const auto rules = text::PhonetRules::Parse(bytes);
    for (int w = 0; w < 30; ++w) {
      std::u16string word;
      const int length = static_cast<int>(random() % 12);
      for (int i = 0; i < length; ++i) word += u"ABCABCЖ*"[random() % 8];
      std::u16string out;
      std::u16string work;
      rules.Encode(word, out, work);
      // Each step consumes a character; only restarts and characters beyond
      // Latin-1 may pass the length cap, once each.
      EXPECT_LE(out.size(), 2 * word.size()) << bytes << Utf16ToUtf8(word);
    }
  }
}

}  // namespace
}  // namespace qm::test
