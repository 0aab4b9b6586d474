// The second half of a findex build: a sorted entry file to word tree and
// postings. Entries per second for text findexes with positions and scores,
// over a vocabulary whose word frequencies fall off like a natural text's.
#include <benchmark/benchmark.h>

#include <cstdio>
#include <filesystem>
#include <string>
#include <vector>

#include "index/findex_files_writer.h"
#include "format/mfile.h"

namespace {

namespace fs = std::filesystem;

struct SortedFile {
  std::string folder;
  int64_t entries = 0;
  int64_t bytes = 0;
};

// distinct words; word i has about top / (i + 1) entries, keys ascending.
SortedFile MakeSortedFile(int32_t distinct, int32_t top) {
  SortedFile file;
  file.folder =
      (fs::temp_directory_path() / ("findex-bench-" + std::to_string(distinct))).string() + "/";
  fs::create_directories(file.folder);
  qm::MFile out;
  out.OpenFile(file.folder + "sorted", qm::MFile::kCreate);
  qm::CValue value(qm::VALUE_TYPE::AsciiString);
  char word[32];
  for (int32_t i = 0; i < distinct; ++i) {
    std::snprintf(word, sizeof word, "w%07d", i);
    value.SetText(word);
    const int32_t count = std::max(1, top / (i + 1));
    for (int32_t n = 0; n < count; ++n) {
      const int32_t row[3] = {n * 7 + 1, 1 + n % 3, n % 500 + 1};
      out.WriteItemRow(row);
      out.WriteValue(value);
      ++file.entries;
    }
  }
  out.MCommit();
  file.bytes = out.FileSize();
  out.Close();
  return file;
}

void BM_WriteFindexFiles(benchmark::State& state) {
  const SortedFile file = MakeSortedFile(static_cast<int32_t>(state.range(0)), 200000);
  for (auto _ : state) {
    qm::MFile sorted;
    sorted.OpenFile(file.folder + "sorted", qm::MFile::kReadOnly);
    qm::CIndexHeader header;
    header.IndexName = "Bench";
    header.GeneralFlags = 3;
    header.FindexType = 2;
    const auto counts = qm::WriteFindexFiles(header, sorted, file.folder + "b.sdx",
                                             file.folder + "b.fst", qm::FindexLimits::Current());
    benchmark::DoNotOptimize(counts.blocks);
  }
  state.counters["entries/s"] = benchmark::Counter(static_cast<double>(file.entries),
                                                   benchmark::Counter::kIsIterationInvariantRate);
  state.SetBytesProcessed(state.iterations() * file.bytes);
  fs::remove_all(file.folder);
}
BENCHMARK(BM_WriteFindexFiles)
    ->Arg(10000)
    ->Arg(500000)
    ->Unit(benchmark::kMillisecond)
    ->Iterations(3);

}  // namespace

BENCHMARK_MAIN();
