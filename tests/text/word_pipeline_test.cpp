// The word pipeline of a findex: its options choose the separators, the markup
// removal and the language steps, and every word it writes carries the form
// the language object gives.
#include <gtest/gtest.h>

#include <cstdlib>
#include <string>
#include <vector>

#include "platform/text_encoding.h"
#include "config/global_defs.h"
#include "format/index_header.h"
#include "text/language.h"
#include "text/language_test_support.h"
#include "text/word_pipeline.h"

namespace qm::test {
namespace {

WordPipelineOptions Options(int32_t language, int32_t language_flags,
                            int32_t general_flags = WordPipelineOptions::kAddDefaultSeparators,
                            std::u16string separators = {}) {
  WordPipelineOptions o;
  o.language = language;
  o.language_flags = language_flags;
  o.general_flags = general_flags;
  o.separators = std::move(separators);
  return o;
}

// "position:FORM" for every written word, blank-separated.
std::string Written(CWordPipeline& pipeline, std::string_view text, std::int32_t position = 0) {
  std::string out;
  pipeline.WrittenWords(text, position, [&](const SplitWord& w) {
    out += (out.empty() ? "" : " ") + std::to_string(w.position) + ":" + Utf16ToUtf8(w.form);
  });
  return out;
}

const char* const kText =
    "The rivers were running quickly; Thompson's knights read the Märchen. "
    "Élan, naïve façade! Über große Straßen und die Häuser. Вода и течёт быстро.";

TEST(WordPipeline, WordsGetTheFormsOfTheLanguageObjectForEveryStepSet) {
  struct Case {
    int32_t language;
    int32_t flags;
  };
  const std::vector<Case> cases = {
      {lngEnglish, CLanguage::kUseStemming}, {lngEnglish, 31}, {lngGerman, 31},
      {lngDutch, CLanguage::kUsePhonetic | 4}, {lngRussian, 17}, {lngOther, CLanguage::kUseStopWords | 8},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(std::to_string(c.language) + "/" + std::to_string(c.flags));
    CWordPipeline pipeline(ShippedLanguageFolder(), Options(c.language, c.flags));
    ASSERT_NE(pipeline.Language(), nullptr);
    EXPECT_EQ(pipeline.Language()->GetOptions(), c.flags);
    CLanguage reference(ShippedLanguageFolder());
    reference.LoadLanguage(c.language, c.flags);

    std::int32_t position = 0;
    int considered = 0;
    int dropped = 0;
    std::u16string form;
    pipeline.ConsideredWords(std::string(kText), position, [&](const SplitWord& w) {
      ++considered;
      const std::u16string expected =
          reference.IsStopWord(w.cut) ? u"" : reference.Normalise(w.cut);
      EXPECT_EQ(Utf16ToUtf8(w.form), Utf16ToUtf8(expected)) << Utf16ToUtf8(w.cut);
      // A search word normalised alone meets the indexed form.
      pipeline.Form(w.cut, form);
      EXPECT_EQ(form, w.form);
      dropped += w.Written() ? 0 : 1;
    });
    EXPECT_EQ(considered, 24);
    // Stop words are on in these sets, and the text holds some of each language.
    if ((c.flags & CLanguage::kUseStopWords) != 0 && c.language != lngOther) {
      EXPECT_GT(dropped, 0);
    }
  }
}

TEST(WordPipeline, OptionBitsAreReadAsTheFindexStoresThem) {
  // The flags of a fresh findex: stop words and accents; phrases, default separators.
  CIndexHeader header;
  CWordPipeline defaults(ShippedLanguageFolder(), WordPipelineOptions::FromHeader(header));
  EXPECT_EQ(Written(defaults, "The élan of <b>rivers</b>"), "1:ELAN 2:B 3:RIVERS 4:B");

  header.GeneralFlags = 16 | 1 | 2 | 8 | 32;  // HTML removal; no default separators
  header.Separators = u"<SPACE>%047";
  header.LanguageFlags = 0;
  CWordPipeline markup(ShippedLanguageFolder(), WordPipelineOptions::FromHeader(header));
  EXPECT_EQ(Written(markup, "The élan/of <b>rivers</b>, run."), "1:THE 2:ÉLAN 3:OF 4:RIVERS, 5:RUN.");

  header.GeneralFlags = 4;
  header.LanguageFlags = CLanguage::kUseStemming;
  CWordPipeline both(ShippedLanguageFolder(), WordPipelineOptions::FromHeader(header));
  EXPECT_EQ(Written(both, "rivers,run"), "1:RIVER 2:RUN");
}

TEST(WordPipeline, LanguageDataComesFromTheSettingsAndOnlyForLanguageSteps) {
  ConfiguredHome home;
  const std::string language = home.Data() + "Language/";
  WriteFile(language + "General/latin1.tbl", ReadFile(ShippedLanguageFolder() + "General/latin1.tbl"));
  WriteFile(language + "English/info.txt", "latin1.tbl 1\n");
  WriteFile(language + "English/stop.txt", Utf16LeFile(u"rivers"));
  CGlobalDefs defs;
  CWordPipeline configured(defs, Options(lngEnglish, CLanguage::kUseStopWords));
  EXPECT_EQ(configured.Language()->GetLanguageFolder(), language);
  EXPECT_EQ(Written(configured, "the rivers"), "1:THE");

  // No step: words as cut, with no data path and whatever language number.
  unsetenv("MORVIL_PATH");
  CWordPipeline plain(defs, Options(99, 0));
  EXPECT_EQ(plain.Language(), nullptr);
  EXPECT_EQ(Written(plain, "the \xC3\xA9lan"), "1:THE 2:\xC3\x89LAN");
  const std::string text = FailureText([&] { CWordPipeline p(defs, Options(lngEnglish, CLanguage::kUseStopWords)); });
  EXPECT_TRUE(Contains(text, "Data path is not set (Module:STDFUN,Method:GetFullDataPath)")) << text;
  EXPECT_TRUE(Contains(text, "(Module:Language,Method:CLanguage)")) << text;
}

}  // namespace
}  // namespace qm::test
