// Words per second through the splitter on real text: the package descriptions
// of the machine's package database (or the file named by QM_BENCH_TEXT), one
// value per stanza, read at start-up.
#include <benchmark/benchmark.h>

#include <string>
#include <vector>

#include "package_stanzas.h"
#include "platform/text_encoding.h"
#include "text/next_word.h"
#include "text/word_splitter.h"

namespace {

const std::vector<std::string>& Utf8Values() {
  static const std::vector<std::string> values = bench::PackageStanzas("word_split_bench");
  return values;
}

const std::vector<std::u16string>& Utf16Values() {
  static const std::vector<std::u16string> values = [] {
    std::vector<std::u16string> out;
    for (const auto& v : Utf8Values()) out.push_back(qm::Utf8ToUtf16(v));
    return out;
  }();
  return values;
}

template <class Values>
void SplitValues(benchmark::State& state, const Values& values, bool remove_html) {
  qm::CWordSplitter splitter(qm::CSeparatorSet(qm::DefaultSeparators()), remove_html);
  std::int64_t words = 0;
  std::int64_t bytes = 0;
  for (auto _ : state) {
    for (const auto& value : values) {
      std::int32_t position = 0;
      splitter.Split(value, position, [&](const qm::SplitWord& w) {
        benchmark::DoNotOptimize(w.form.data());
        ++words;
      });
      bytes += static_cast<std::int64_t>(value.size());
    }
  }
  state.counters["words/s"] = benchmark::Counter(static_cast<double>(words), benchmark::Counter::kIsRate);
  state.SetBytesProcessed(bytes);
}

void BM_SplitUtf8(benchmark::State& state) { SplitValues(state, Utf8Values(), false); }
void BM_SplitUtf16(benchmark::State& state) { SplitValues(state, Utf16Values(), false); }
void BM_SplitUtf8RemoveHtml(benchmark::State& state) { SplitValues(state, Utf8Values(), true); }

// NextWord alone over values already upper-cased and closed by a blank.
void BM_NextWordOnly(benchmark::State& state) {
  const qm::CSeparatorSet separators(qm::DefaultSeparators());
  std::vector<std::u16string> prepared;
  for (const auto& v : Utf16Values()) prepared.push_back(qm::ToUpper(std::u16string_view(v)) + u" ");
  qm::CWordBuffer word;
  std::int64_t words = 0;
  for (auto _ : state) {
    for (const auto& value : prepared) {
      std::u16string_view rest = value;
      while (qm::NextWord(rest, word, separators) != qm::NextWordCode::kNoMoreWords) ++words;
      benchmark::DoNotOptimize(word.View().data());
    }
  }
  state.counters["words/s"] = benchmark::Counter(static_cast<double>(words), benchmark::Counter::kIsRate);
}

BENCHMARK(BM_SplitUtf8)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_SplitUtf16)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_SplitUtf8RemoveHtml)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_NextWordOnly)->Unit(benchmark::kMillisecond);

}  // namespace

BENCHMARK_MAIN();
