// Words per second through the language steps, for each option set, on real
// text: the licences in /usr/share/common-licenses and the package descriptions
// of `apt-cache dumpavail`, or the file named by QM_BENCH_TEXT.
#include <benchmark/benchmark.h>
#include <dirent.h>
#include <unicode/uchar.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iostream>
#include <sstream>
#include <string>
#include <vector>

#include "platform/text_encoding.h"
#include "text/language.h"

namespace {

std::string ReadAll(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  std::ostringstream s;
  s << in.rdbuf();
  return s.str();
}

std::string CorpusText() {
  if (const char* file = std::getenv("QM_BENCH_TEXT")) return ReadAll(file);
  std::string text;
  const std::string licences = "/usr/share/common-licenses/";
  if (DIR* dir = ::opendir(licences.c_str())) {
    while (const dirent* e = ::readdir(dir)) {
      if (e->d_name[0] != '.') text += ReadAll(licences + e->d_name);
    }
    ::closedir(dir);
  }
  if (FILE* pipe = ::popen("apt-cache dumpavail 2>/dev/null", "r")) {
    char line[4096];
    while (std::fgets(line, sizeof line, pipe)) {
      if (std::string_view(line).starts_with("Description:")) text += line + 12;
    }
    ::pclose(pipe);
  }
  return text;
}

// The words of the text, upper-cased, as the word splitter hands them on.
const std::vector<std::u16string>& Words() {
  static const std::vector<std::u16string> words = [] {
    std::vector<std::u16string> out;
    const std::u16string text = qm::ToUpper(qm::Utf8ToUtf16(CorpusText()));
    std::u16string word;
    for (const char16_t c : text) {
      if (u_isalnum(c)) {
        word.push_back(c);
      } else if (!word.empty()) {
        out.push_back(word);
        word.clear();
      }
    }
    std::cerr << "normalise_bench: " << out.size() << " words\n";
    return out;
  }();
  return words;
}

void Normalise(benchmark::State& state, int32_t language, int32_t options) {
  const auto& words = Words();
  qm::CLanguage lang(std::string(QM_SOURCE_DATA_DIR) + "Language/");
  lang.LoadLanguage(language, options);
  const bool stop_words = (options & qm::CLanguage::kUseStopWords) != 0;
  std::u16string out;
  std::size_t kept = 0;
  for (auto _ : state) {
    for (const auto& word : words) {
      if (stop_words && lang.IsStopWord(word)) continue;
      lang.Normalise(word, out);
      kept += out.size();
    }
  }
  benchmark::DoNotOptimize(kept);
  state.SetItemsProcessed(static_cast<int64_t>(state.iterations() * words.size()));
}

using qm::CLanguage;
constexpr int32_t kAll = 31;

BENCHMARK_CAPTURE(Normalise, english_none, qm::lngEnglish, 0);
BENCHMARK_CAPTURE(Normalise, english_stop_words, qm::lngEnglish, CLanguage::kUseStopWords);
BENCHMARK_CAPTURE(Normalise, english_accents, qm::lngEnglish, CLanguage::kRemoveAccents);
BENCHMARK_CAPTURE(Normalise, english_stemming, qm::lngEnglish, CLanguage::kUseStemming);
BENCHMARK_CAPTURE(Normalise, english_translation, qm::lngEnglish,
                  CLanguage::kUseCharacterTranslation);
BENCHMARK_CAPTURE(Normalise, english_double_metaphone, qm::lngEnglish, CLanguage::kUsePhonetic);
BENCHMARK_CAPTURE(Normalise, english_all, qm::lngEnglish, kAll);
BENCHMARK_CAPTURE(Normalise, german_translation, qm::lngGerman,
                  CLanguage::kUseCharacterTranslation);
BENCHMARK_CAPTURE(Normalise, german_phonet, qm::lngGerman, CLanguage::kUsePhonetic);
BENCHMARK_CAPTURE(Normalise, german_all, qm::lngGerman, kAll);
BENCHMARK_CAPTURE(Normalise, dutch_sound_map, qm::lngDutch, CLanguage::kUsePhonetic);
BENCHMARK_CAPTURE(Normalise, russian_stemming, qm::lngRussian, CLanguage::kUseStemming);

}  // namespace

BENCHMARK_MAIN();
