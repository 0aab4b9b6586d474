// Words per second through the whole per-value routine of a build (split,
// stop words, normalisation) for each language option set, on real text: the
// package descriptions of the machine's package database (or the file named
// by QM_BENCH_TEXT), one value per stanza.
#include <benchmark/benchmark.h>

#include <string>
#include <vector>

#include "package_stanzas.h"
#include "text/language.h"
#include "text/word_pipeline.h"

namespace {

const std::vector<std::string>& Values() {
  static const std::vector<std::string> values = bench::PackageStanzas("word_pipeline_bench");
  return values;
}

void Pipeline(benchmark::State& state, int32_t language, int32_t flags) {
  qm::WordPipelineOptions options;
  options.language = language;
  options.language_flags = flags;
  options.general_flags = qm::WordPipelineOptions::kAddDefaultSeparators;
  qm::CWordPipeline pipeline(std::string(QM_SOURCE_DATA_DIR) + "Language/", options);
  std::int64_t considered = 0;
  std::int64_t written = 0;
  for (auto _ : state) {
    for (const auto& value : Values()) {
      std::int32_t position = 0;
      pipeline.ConsideredWords(value, position, [&](const qm::SplitWord& w) {
        benchmark::DoNotOptimize(w.form.data());
        ++considered;
        written += w.Written() ? 1 : 0;
      });
    }
  }
  state.counters["words/s"] =
      benchmark::Counter(static_cast<double>(considered), benchmark::Counter::kIsRate);
  state.counters["written"] = static_cast<double>(written) / static_cast<double>(considered);
}

using qm::CLanguage;

BENCHMARK_CAPTURE(Pipeline, none, qm::lngEnglish, 0)->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(Pipeline, stop_words, qm::lngEnglish, CLanguage::kUseStopWords)
    ->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(Pipeline, defaults_stop_accents, qm::lngEnglish, 20)->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(Pipeline, stemming, qm::lngEnglish, CLanguage::kUseStemming)
    ->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(Pipeline, double_metaphone, qm::lngEnglish, CLanguage::kUsePhonetic)
    ->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(Pipeline, english_all, qm::lngEnglish, 31)->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(Pipeline, german_all, qm::lngGerman, 31)->Unit(benchmark::kMillisecond);

}  // namespace

BENCHMARK_MAIN();
