// Ordering a large result set: 384,100 result rows (the key count of the
// word query "package" over the benchmark corpus) drawn from the keys of a
// 600,000-row table, ordered by score, by the columns of a type 1 order (an
// integer; a double and a date/time, two sort keys each) and of a type 2
// order (a text, ranks), then grouped and reversed. The orders are built at
// start from a SQLite database in a temporary folder, removed at the end.
//
//   result_order_bench [--rows N] [--results N] [--runs N]
//
// Each figure is the best of the runs: attaching (opening the order and
// reading its values for every row, first time only) and sorting, in ms,
// with result rows per second.
#include <sqlite3.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <random>
#include <stdexcept>
#include <string>
#include <vector>

#include "order_bench_root.h"
#include "base/exception.h"
#include "config/global_defs.h"
#include "format/items.h"
#include "format/order_info.h"
#include "index/pi_order.h"
#include "search/rowset_order.h"

namespace {

namespace fs = std::filesystem;
using Clock = std::chrono::steady_clock;

class DataRoot : public qm::bench::OrderBenchRoot {
 public:
  DataRoot() : OrderBenchRoot("result-order-bench") {}

  void AddRows(int64_t count) const {
    std::mt19937_64 random(7);
    char date[32];
    char label[32];
    InsertRows(1, count, [&](sqlite3_stmt* insert, int64_t) {
      sqlite3_bind_int64(insert, 2, static_cast<int64_t>(random() % 20000));
      sqlite3_bind_double(insert, 3, static_cast<double>(random() % 2000000) / 7.0 - 100000.0);
      std::snprintf(date, sizeof date, "%04d-%02d-%02d %02d:%02d:%02d",
                    static_cast<int>(1990 + random() % 35), static_cast<int>(1 + random() % 12),
                    static_cast<int>(1 + random() % 28), static_cast<int>(random() % 24),
                    static_cast<int>(random() % 60), static_cast<int>(random() % 60));
      sqlite3_bind_text(insert, 4, date, -1, SQLITE_TRANSIENT);
      std::snprintf(label, sizeof label, "word%05d", static_cast<int>(random() % 25000));
      sqlite3_bind_text(insert, 5, label, -1, SQLITE_TRANSIENT);
    });
  }
};

void BuildOrder(qm::CGlobalDefs& defs, const char* name, std::initializer_list<const char*> columns) {
  qm::COrderInfo d;
  d.OrderName = name;
  d.TableName = "t";
  d.KeyColumn = "id";
  for (const char* c : columns) d.Columns.push_back(qm::OrderColumn{c, {}});
  qm::CPiOrder order(defs);
  order.BuildOrderInt(d, true);
}

// Result rows (key, score): results keys of 1..rows, ascending, with scores.
qm::CItems ResultRows(int64_t rows, int64_t results) {
  qm::CColumnSet set;
  set.s = 1;
  qm::CItems items(set);
  items.AllocateMemory(static_cast<int32_t>(results + 1));
  items.InsertItem(std::vector<int32_t>{static_cast<int32_t>(results + 1), 0});
  std::mt19937_64 random(11);
  std::vector<int32_t> keys(static_cast<std::size_t>(rows));
  for (std::size_t i = 0; i < keys.size(); ++i) keys[i] = static_cast<int32_t>(i + 1);
  std::shuffle(keys.begin(), keys.end(), random);
  keys.resize(static_cast<std::size_t>(results));
  std::sort(keys.begin(), keys.end());
  for (const int32_t key : keys) {
    items.InsertItem(std::vector<int32_t>{key, static_cast<int32_t>(random() % 2000)});
  }
  return items;
}

double Ms(Clock::duration d) { return std::chrono::duration<double, std::milli>(d).count(); }

}  // namespace

int main(int argc, char** argv) {
  int64_t rows = 600000;
  int64_t results = 384100;
  int runs = 3;
  for (int i = 1; i + 1 < argc; i += 2) {
    const std::string flag = argv[i];
    const long long value = std::atoll(argv[i + 1]);
    if (flag == "--rows") rows = value;
    else if (flag == "--results") results = value;
    else if (flag == "--runs") runs = static_cast<int>(value);
  }
  results = std::min(results, rows);
  try {
    DataRoot root;
    root.AddRows(rows);
    qm::CGlobalDefs defs;
    defs.SetDataPath(root.Path());
    defs.SetConnectionString("Driver=SQLite3;Database=" + root.Database() + ";StepAPI=1", "bench");
    BuildOrder(defs, "T", {"n", "r", "d"});
    BuildOrder(defs, "L", {"label"});

    qm::RowsetOrderContext context;
    context.score_support = true;
    context.key_column = "id";
    context.part_count = 1;
    std::printf("%lld result rows of %lld keys, best of %d runs\n", static_cast<long long>(results),
                static_cast<long long>(rows), runs);
    std::printf("%-24s %10s %10s %14s\n", "order list", "attach ms", "sort ms", "rows/s sorted");
    for (const char* list : {"SCORE", "KEY DESC", "T.N", "T.R DESC", "T.D", "L.LABEL", "T.N, SCORE"}) {
      double best_attach = 1e30;
      double best_sort = 1e30;
      for (int run = 0; run < runs; ++run) {
        qm::CItems items = ResultRows(rows, results);
        qm::CGiRowsetOrder order(defs);
        order.Reset("id");
        const Clock::time_point start = Clock::now();
        order.SetOrder(items, list, true, context);
        const Clock::time_point attached = Clock::now();
        order.SortItems(items, context);
        const Clock::time_point sorted = Clock::now();
        best_attach = std::min(best_attach, Ms(attached - start));
        best_sort = std::min(best_sort, Ms(sorted - attached));
      }
      std::printf("%-24s %10.1f %10.1f %14.0f\n", list, best_attach, best_sort,
                  static_cast<double>(results) / (best_sort / 1000.0));
    }
    // Grouping and reversing the rows ordered by T.N.
    qm::CItems items = ResultRows(rows, results);
    qm::CGiRowsetOrder order(defs);
    order.Reset("id");
    order.SetOrder(items, "T.N", true, context);
    order.SortItems(items, context);
    Clock::time_point start = Clock::now();
    order.CollectItems(items);
    std::printf("CollectGroups on T.N: %.1f ms, %d groups\n", Ms(Clock::now() - start),
                order.GetTotalGroups());
    order.SetOrder(items, "REVERSE", true, context);
    start = Clock::now();
    order.SortItems(items, context);
    std::printf("REVERSE: %.1f ms\n", Ms(Clock::now() - start));
  } catch (const qm::CExceptionBase& e) {
    std::fprintf(stderr, "%s\n", e.GetFullTextUtf8(100).c_str());
    return 1;
  } catch (const std::exception& e) {
    std::fprintf(stderr, "%s\n", e.what());
    return 1;
  }
  return 0;
}
