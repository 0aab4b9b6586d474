// The language object: loading and its failures, the order of the steps, stop
// words, character translations, accent removal and the phonetic codes.
#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <string>
#include <vector>

#include "platform/text_encoding.h"
#include "text/character_table.h"
#include "text/double_metaphone.h"
#include "text/language.h"
#include "text/language_test_support.h"

namespace qm::test {
namespace {

std::string N(CLanguage& language, const std::u16string& word) {
  return Utf16ToUtf8(language.Normalise(std::u16string_view(word)));
}

TEST(Language, ShippedStopWordsAreUpperCasedAndTestedOnTheWordAsCut) {
  CLanguage language(ShippedLanguageFolder());
  language.LoadLanguage(lngEnglish, CLanguage::kUseStopWords | CLanguage::kUseStemming);
  EXPECT_TRUE(language.IsStopWord(u"THE"));
  EXPECT_FALSE(language.IsStopWord(u"the"));
  // OWNED is no stop word, so it is kept, though its stem OWN is one.
  EXPECT_FALSE(language.IsStopWord(u"OWNED"));
  EXPECT_EQ(N(language, u"OWNED"), "OWN");
  EXPECT_TRUE(language.IsStopWord(u"OWN"));
}

TEST(Language, UnknownLanguagesAndStepsOtherLanguagesCannotTakeAreRefused) {
  CLanguage language(ShippedLanguageFolder());
  language.LoadLanguage(lngEnglish, CLanguage::kUseStopWords);
  EXPECT_TRUE(Contains(FailureText([&] { language.LoadLanguage(0, 0); }),
                       "Unknown language 0 (Module:Language,Method:LoadLanguage)"));
  EXPECT_FALSE(language.IsLoaded());
  EXPECT_FALSE(language.IsStopWord(u"THE"));
  const std::pair<int32_t, std::string> other[] = {
      {CLanguage::kUseStemming,
       "Stemming is only supported for specific languages, not for other languages "
       "(Module:Language,Method:InitializeStemming)"},
      {CLanguage::kUsePhonetic,
       "Phonetic search is only supported for specific languages, not for other languages "
       "(Module:Language,Method:InitializePhonetic)"},
      {CLanguage::kRemoveAccents,
       "Accents can only be removed for specific languages, not for other languages. Use "
       "custom character translation instead. (Module:Language,Method:LoadLanguage)"}};
  for (const auto& [option, text] : other) {
    EXPECT_TRUE(Contains(FailureText([&] { language.LoadLanguage(lngOther, option); }), text)) << option;
    EXPECT_FALSE(language.IsLoaded());
  }
}

TEST(Language, ConfigurationIsRememberedOnlyAfterACompleteLoad) {
  LanguageFolder folder;
  folder.WriteMinimal("Other");
  folder.WriteUtf16("Other", "lang.txt", u"A - B\n");
  CLanguage language(folder.Path());
  language.LoadLanguage(lngOther, false, false, false, false, true);
  EXPECT_EQ(N(language, u"CAT"), "CBT");

  // Same configuration: nothing is read again, so a broken file goes unnoticed.
  folder.WriteUtf16("Other", "lang.txt", u"A\n");
  language.LoadLanguage(lngOther, false, false, false, false, true);
  EXPECT_EQ(N(language, u"CAT"), "CBT");

  // Dropping translation and taking it back reads the file and fails.
  language.LoadLanguage(lngOther, false, false, false, false, false);
  EXPECT_EQ(N(language, u"CAT"), "CAT");
  EXPECT_TRUE(Contains(FailureText([&] { language.LoadLanguage(lngOther, 8); }),
                       "Error parsing file (Module:Language,Method:LoadCharacterTranslations)"));
  EXPECT_FALSE(language.IsLoaded());
  EXPECT_EQ(N(language, u"CAT"), "CAT");

  // The failed configuration was not remembered: the same call loads again.
  folder.WriteUtf16("Other", "lang.txt", u"A - E\n");
  language.LoadLanguage(lngOther, 8);
  EXPECT_EQ(N(language, u"CAT"), "CET");
}

TEST(Language, MissingFilesAreReportedByTheFileLayer) {
  LanguageFolder folder;
  CLanguage language(folder.Path());
  std::string text = FailureText([&] { language.LoadLanguage(lngDutch, 0); });
  EXPECT_TRUE(Contains(text, "Dutch/info.txt (Module:WinFile,Method:OpenWinFile)")) << text;
  EXPECT_TRUE(Contains(text, "(Module:Language,Method:LoadLanguage)")) << text;

  folder.Write("Dutch", "info.txt", "missing.tbl 1\n");
  text = FailureText([&] { language.LoadLanguage(lngDutch, 0); });
  EXPECT_TRUE(Contains(text, "General/missing.tbl (Module:WinFile,Method:OpenWinFile)")) << text;
  EXPECT_FALSE(language.IsLoaded());
}

TEST(Language, MalformedInfoFilesAndCharacterTablesAreParseErrors) {
  LanguageFolder folder;
  folder.WriteMinimal("Dutch");
  CLanguage language(folder.Path());
  const auto expect_parse_error = [&](const std::string& what) {
    const std::string text = FailureText([&] { language.LoadLanguage(lngDutch, 0); });
    EXPECT_TRUE(Contains(text, "Error parsing file (Module:Language,Method:LoadLanguage)"))
        << what << ": " << text;
  };
  for (const char* info : {"", "latin1.tbl", "latin1.tbl 1x"}) {
    folder.Write("Dutch", "info.txt", info);
    expect_parse_error(std::string("info.txt '") + info + "'");
  }
  folder.Write("Dutch", "info.txt", "bad.tbl 1");
  const std::string good = ReadFile(ShippedLanguageFolder() + "General/latin1.tbl");
  std::string row255 = good.substr(0, good.rfind('\n', good.size() - 2) + 1);
  const std::vector<std::pair<std::string, std::string>> tables = {
      {"empty", ""},
      {"255 rows", row255},
      {"257 rows", good + "1 2 3 4 5 6 7 8\n"},
      {"a number above 255", good.substr(0, good.size() - 4) + "256\n"},
      {"a word", "x" + good.substr(good.find(' '))},
  };
  for (const auto& [what, bytes] : tables) {
    folder.Write("General", "bad.tbl", bytes);
    expect_parse_error(what);
  }
}

// Exactly 2,048 decimal numbers from 0 to 255, split as the table reader splits.
bool IsWellFormedTable(const std::string& bytes) {
  std::size_t count = 0;
  std::size_t i = 0;
  while (i < bytes.size()) {
    while (i < bytes.size() && std::string(" \n\r\f\t").find(bytes[i]) != std::string::npos) ++i;
    if (i == bytes.size()) break;
    std::string token;
    while (i < bytes.size() && std::string(" \n\r\f\t").find(bytes[i]) == std::string::npos) {
      token += bytes[i++];
    }
    if (token.find_first_not_of("0123456789") != std::string::npos || std::stoul(token.substr(0, 9)) > 255) {
      return false;
    }
    ++count;
  }
  return count == 2048;
}

TEST(Language, TruncatedAndRandomCharacterTablesNeverLoadHalfway) {
  const std::string good = ReadFile(ShippedLanguageFolder() + "General/latin1.tbl");
  std::mt19937 random(7);
  std::vector<std::string> inputs;
  for (int n = 0; n < 200; ++n) inputs.push_back(good.substr(0, random() % good.size()));
  for (std::size_t cut = good.size() - 12; cut <= good.size(); ++cut) inputs.push_back(good.substr(0, cut));
  for (int n = 0; n < 200; ++n) {
    std::string bytes = good;
    for (int k = 0; k < 3; ++k) bytes[random() % bytes.size()] = static_cast<char>(random() % 256);
    inputs.push_back(bytes);
  }
  for (int n = 0; n < 100; ++n) {
    std::string bytes(random() % 9000, ' ');
    for (char& c : bytes) c = "0123456789 \n"[random() % 12];
    inputs.push_back(bytes);
  }
  int loaded = 0;
  for (const auto& bytes : inputs) {
    text::CharacterTable table;
    const bool ok = text::CharacterTable::Parse(bytes, table);
    EXPECT_EQ(ok, IsWellFormedTable(bytes));
    loaded += ok;
  }
  EXPECT_GT(loaded, 0);  // the whole table and cuts inside its last blank or number
}

TEST(Language, RandomAndTruncatedLanguageFilesLoadOrGiveParseErrors) {
  LanguageFolder folder;
  folder.WriteMinimal("German", 2);
  const std::string real_rules = ReadFile(ShippedLanguageFolder() + "German/1.dat");
  const std::string real_stops = ReadFile(ShippedLanguageFolder() + "German/stop.txt");
  std::mt19937 random(11);
  int loads = 0;
  int failures = 0;
  const auto random_bytes = [&](std::size_t n) {
    std::string s(n, '\0');
    for (char& c : s) c = static_cast<char>(random() % 256);
    return s;
  };
  for (int n = 0; n < 150; ++n) {
    const std::string junk = random_bytes(random() % 600);
    folder.Write("German", "1.dat", n % 2 ? junk : real_rules.substr(0, random() % real_rules.size()) + junk.substr(0, 20));
    folder.Write("German", "stop.txt", n % 3 ? junk : real_stops.substr(0, random() % real_stops.size()));
    folder.Write("German", "lang.txt", n % 5 ? Utf16LeFile(u"A - B\n") : junk);
    CLanguage language(folder.Path());
    const std::string text = FailureText([&] {
      language.LoadLanguage(lngGerman, n % 2 ? 31 : 30);
    });
    if (!text.empty()) {
      EXPECT_TRUE(Contains(text, "Error parsing file")) << text;
      ++failures;
      continue;
    }
    ++loads;
    for (const char16_t* word : {u"SCHMIDT", u"", u"ÄÖÜ", u"ЖУК"}) {
      const std::u16string code = language.Normalise(std::u16string_view(word));
      EXPECT_LE(code.size(), std::u16string_view(word).size() * 3 + 8);
    }
  }
  EXPECT_GT(loads, 10);
  EXPECT_GT(failures, 10);
}

// --- character translation ---

class Translation : public ::testing::Test {
 protected:
  std::string Translate(const std::u16string& lines, const std::u16string& word) {
    folder_.WriteUtf16("Other", "lang.txt", lines);
    CLanguage language(folder_.Path());
    language.LoadLanguage(lngOther, CLanguage::kUseCharacterTranslation);
    return N(language, word);
  }
  void SetUp() override { folder_.WriteMinimal("Other"); }
  LanguageFolder folder_;
};

TEST_F(Translation, PairsOperatorsDeletionsAndTheLengthLimit) {
  const std::u16string two_token = u"\r\nX - Y\r\n\r\nP Q\r\nA = B\n  \nC D\n";
  const std::u16string growing = u"A - AA\nB - C\n";
  struct Case {
    std::u16string lines, word;
    std::string expected;
  };
  const Case cases[] = {
      // "=" adds the reverse pair after the forward one; "-" goes one way.
      {u"AE = Ä\n", u"MÄRCHEN", "MAERCHEN"},
      {u"AE - Ä\n", u"MAERCHEN", "MÄRCHEN"},
      // Two-token lines repeat the previous operator.
      {two_token, u"PCD", "QCC"},  // (C,D) then (D,C)
      {two_token, u"XA", "YA"},    // (X,Y), (A,B), (B,A)
      // "#" deletes and never becomes a from text.
      {u"H - #\n", u"THOMAS", "TOMAS"},
      {u"Z = #\n", u"ZOO", "OO"},
      // A result that would reach 200 characters is skipped; one replacement may still fit.
      {growing, std::u16string(100, u'A'), std::string(100, 'A')},
      {growing, std::u16string(120, u'A') + u"B", std::string(120, 'A') + "C"},
  };
  for (const Case& c : cases) EXPECT_EQ(Translate(c.lines, c.word), c.expected) << Utf16ToUtf8(c.lines);
}

TEST_F(Translation, MalformedLinesAreParseErrors) {
  const std::vector<std::u16string> files = {u"A\n", u"A -\n", u"A - B C\n", u"A - B\nC\n"};
  for (const auto& lines : files) {
    folder_.WriteUtf16("Other", "lang.txt", lines);
    CLanguage language(folder_.Path());
    const std::string text = FailureText([&] { language.LoadLanguage(lngOther, 8); });
    EXPECT_TRUE(Contains(text, "Error parsing file (Module:Language,Method:LoadCharacterTranslations)"))
        << Utf16ToUtf8(lines) << ": " << text;
  }
  folder_.Write("Other", "lang.txt", Utf16LeFile(u"A - B\n") + "x");  // odd byte count
  CLanguage language(folder_.Path());
  EXPECT_TRUE(Contains(FailureText([&] { language.LoadLanguage(lngOther, 8); }),
                       "Error parsing file"));
}

// --- stop words ---

TEST(StopWords, TokensBetweenBlanksAndLineEndsUpperCasedAndCutTo199) {
  const std::u16string long_word(250, u'Q');
  LanguageFolder folder;
  folder.WriteMinimal("Other");
  folder.WriteUtf16("Other", "stop.txt", u"the\r\nThe AND\tor été straße ЖУК\n\n" + long_word + u" x");
  CLanguage language(folder.Path());
  language.LoadLanguage(lngOther, CLanguage::kUseStopWords);
  using Words = std::vector<std::u16string>;
  for (const auto& word : Words{u"THE", u"AND\tOR", u"ÉTÉ", u"ЖУК", long_word.substr(0, 199)}) {
    EXPECT_TRUE(language.IsStopWord(word)) << Utf16ToUtf8(word);
  }
  for (const auto& word : Words{u"", u"the", u"THES", u"AND", u"жук", long_word}) {
    EXPECT_FALSE(language.IsStopWord(word)) << Utf16ToUtf8(word);
  }
}

TEST(Normalise, ShippedAccentRemovalSoundMapsAndPhoneticCodes) {
  struct Case {
    int32_t language, options;
    std::u16string word;
    std::string expected;
  };
  const Case cases[] = {
      // Accent removal leaves characters beyond Latin-1 alone (Ā's low byte is 0).
      {lngGerman, CLanguage::kRemoveAccents, u"ÇÀÉÎÕÜÝÿ", "CAEIOUYY"},
      {lngGerman, CLanguage::kRemoveAccents, u"ÆØßÞ", "ÆØßÞ"},
      {lngGerman, CLanguage::kRemoveAccents, u"CAFÉ\u0416\u0100", "CAFE\u0416\u0100"},
      // The sound map groups letters and leaves other scripts alone.
      {lngDutch, CLanguage::kUsePhonetic, u"THOMAS", "TONAS"},
      {lngDutch, CLanguage::kUsePhonetic, u"R2D2", "R2T2"},
      {lngDutch, CLanguage::kUsePhonetic, u"ÇA'Ñ", "SAN"},
      // English codes are not cut to four characters; German ones come from the rule file.
      {lngEnglish, CLanguage::kUsePhonetic, u"INTERNATIONALISATION", "ANTRNXNLSXN"},
      {lngGerman, CLanguage::kUsePhonetic, u"SCHMIDT", "ZNIT"},
      {lngGerman, CLanguage::kUsePhonetic | CLanguage::kRemoveAccents, u"MÜLLER", "NULA"},
  };
  CLanguage language(ShippedLanguageFolder());
  EXPECT_EQ(N(language, u"MÜLLER"), "MÜLLER");  // an unloaded object passes words through
  for (const Case& c : cases) {
    language.LoadLanguage(c.language, c.options);
    EXPECT_EQ(N(language, c.word), c.expected) << c.language << " " << c.options;
  }
  language.LoadLanguage(lngGerman, CLanguage::kRemoveAccents);
  EXPECT_EQ(language.Normalise(std::string_view("STRAẞE Ö")), "STRAẞE O");
}

TEST(Normalise, StepsRunAsAccentsStemmingTranslationPhonetic) {
  LanguageFolder folder;
  folder.WriteMinimal("German");
  folder.WriteUtf16("German", "lang.txt", u"HAUS - HOUSE\n");
  CLanguage german(folder.Path());
  german.LoadLanguage(lngGerman, false, true, false, true, true);
  EXPECT_EQ(N(german, u"HÄUSER"), "HOUSE");  // HAUSER, then HAUS, then HOUSE

  folder.WriteMinimal("Dutch", 1);
  folder.WriteUtf16("Dutch", "lang.txt", u"PH - F\n");
  folder.Write("Dutch", "1.dat", "version 1\n");
  CLanguage dutch(folder.Path());
  dutch.LoadLanguage(lngDutch, false, false, true, false, true);
  EXPECT_EQ(N(dutch, u"PHILIPS"), "FILIBS");  // translated before the sound map
}

TEST(Language, EveryShippedLanguageLoadsWithItsSteps) {
  CLanguage language(ShippedLanguageFolder());
  for (int32_t id = lngDanish; id <= lngRussian; ++id) {
    SCOPED_TRACE(id);
    language.LoadLanguage(id, true, true, true, true, true);
    EXPECT_TRUE(language.IsLoaded());
    EXPECT_EQ(language.GetLanguage(), id);
    EXPECT_EQ(language.GetOptions(), 31);
    EXPECT_FALSE(language.Normalise(std::u16string_view(u"INFORMATION")).empty());
  }
  language.LoadLanguage(lngOther, true, false, false, false, true);
  EXPECT_TRUE(language.IsLoaded());
  EXPECT_EQ(language.GetOptions(), CLanguage::kUseStopWords | CLanguage::kUseCharacterTranslation);
}

}  // namespace
}  // namespace qm::test
