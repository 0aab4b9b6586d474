// The storage hot paths: the key sort of item arrays (rows per second by
// width), filling a leaf in value order as the findex writer does, and the
// start and stop searches over a full leaf as a word lookup does.
#include <benchmark/benchmark.h>

#include <cstdio>
#include <random>
#include <string>
#include <vector>

#include "format/block.h"
#include "format/items.h"

namespace {

void BM_SortByKey(benchmark::State& state) {
  const auto rows = static_cast<int32_t>(state.range(0));
  const auto width = static_cast<int32_t>(state.range(1));
  std::mt19937 random(1);
  qm::CItems source(width);
  std::vector<int32_t> row(static_cast<std::size_t>(width));
  for (int32_t i = 0; i < rows; ++i) {
    row[0] = static_cast<int32_t>(random() % 100000);
    source.InsertItem(row);
  }
  for (auto _ : state) {
    state.PauseTiming();
    qm::CItems items = source;
    state.ResumeTiming();
    items.SortByKey();
    benchmark::DoNotOptimize(items.Row(0));
  }
  state.SetItemsProcessed(state.iterations() * rows);
}
BENCHMARK(BM_SortByKey)->Args({1 << 20, 1})->Args({1 << 20, 3})->Args({1 << 20, 5})
    ->Unit(benchmark::kMillisecond);

std::vector<std::string> Words(std::size_t n) {
  std::vector<std::string> words;
  char text[32];
  for (std::size_t i = 0; i < n; ++i) {
    std::snprintf(text, sizeof text, "WORD%06zu", i);
    words.emplace_back(text);
  }
  return words;
}

// Leaf rows arrive in value order; each goes in while the leaf has room.
void BM_FillLeafInOrder(benchmark::State& state) {
  const auto words = Words(1000);
  qm::CValue value;
  int64_t rows = 0;
  for (auto _ : state) {
    qm::CBlock leaf(64);
    for (std::size_t i = 0; i < words.size(); ++i) {
      value.SetText(words[i]);
      if (!leaf.IsFreeRowLeaf(value)) break;
      leaf.InsertRowLeaf(value, static_cast<int32_t>(i));
      ++rows;
    }
    benchmark::DoNotOptimize(leaf.GetUsed());
  }
  state.SetItemsProcessed(rows);
}
BENCHMARK(BM_FillLeafInOrder);

void BM_SearchFullLeaf(benchmark::State& state) {
  const auto words = Words(1000);
  qm::CBlock leaf(64);
  qm::CValue value;
  std::size_t held = 0;
  for (; held < words.size(); ++held) {
    value.SetText(words[held]);
    if (!leaf.IsFreeRowLeaf(value)) break;
    leaf.InsertRowLeaf(value, static_cast<int32_t>(held));
  }
  std::mt19937 random(2);
  qm::CValue key;
  for (auto _ : state) {
    key.SetText(words[random() % held]);
    benchmark::DoNotOptimize(leaf.GetRowStartId(key, key, 1, 0));
    benchmark::DoNotOptimize(leaf.GetRowStopId(key));
  }
  state.SetItemsProcessed(state.iterations());
  state.counters["rows"] = static_cast<double>(held);
}
BENCHMARK(BM_SearchFullLeaf);

}  // namespace

BENCHMARK_MAIN();
