// Time and peak memory of order builds over 1,000,000 rows (by default) of a
// SQLite database made at start in a temporary folder and removed at the end:
// t(id INTEGER PRIMARY KEY, n INTEGER, r REAL, d TIMESTAMP, label TEXT), read
// through the SQLite ODBC driver.
//
//   order_build_bench [--rows N] [--runs N]
//
// Measured: a type 1 order over n, r, d (values per key); a type 2 order over
// label and n (about 50,000 distinct labels: sorted column files and ranks);
// then an update of each after 1% more rows were added. The row loop ends at
// progress 15; the rest is sorting (type 2), merging and writing. As the
// floor every build stands on, the same SELECT is also read alone through the
// engine's data access.
#include <sqlite3.h>
#include <sys/resource.h>

#include <atomic>
#include <cctype>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <random>
#include <stdexcept>
#include <string>
#include <thread>

#include "order_bench_root.h"
#include "index/pi_order.h"
#include "base/exception.h"
#include "config/global_defs.h"
#include "format/order_info.h"
#include "sources/share_database.h"

namespace {

namespace fs = std::filesystem;
using Clock = std::chrono::steady_clock;

double Seconds(Clock::duration d) { return std::chrono::duration<double>(d).count(); }

double PeakMegabytes() {
  rusage u{};
  getrusage(RUSAGE_SELF, &u);
  return static_cast<double>(u.ru_maxrss) / 1024.0;
}

// A data root with the PUBLIC group's folders, and the rows database.
class DataRoot : public qm::bench::OrderBenchRoot {
 public:
  DataRoot() : OrderBenchRoot("order-bench") {}

  // Adds rows with keys first .. first + count - 1.
  void AddRows(int64_t first, int64_t count) const {
    std::mt19937_64 random(static_cast<uint64_t>(first));
    char date[32];
    char label[32];
    InsertRows(first, count, [&](sqlite3_stmt* insert, int64_t key) {
      if (key % 50 == 0) {
        sqlite3_bind_null(insert, 2);  // some NULLs
      } else {
        sqlite3_bind_int64(insert, 2, static_cast<int32_t>(random() % 2000000) - 1000000);
      }
      sqlite3_bind_double(insert, 3, static_cast<double>(random() % 1000000) / 7.0);
      std::snprintf(date, sizeof date, "%04d-%02d-%02d %02d:%02d:%02d",
                    static_cast<int>(1990 + random() % 35), static_cast<int>(1 + random() % 12),
                    static_cast<int>(1 + random() % 28), static_cast<int>(random() % 24),
                    static_cast<int>(random() % 60), static_cast<int>(random() % 60));
      sqlite3_bind_text(insert, 4, date, -1, SQLITE_TRANSIENT);
      std::snprintf(label, sizeof label, "%s-word%05d", (random() % 2) ? "Alpha" : "beta",
                    static_cast<int>(random() % 25000));
      sqlite3_bind_text(insert, 5, label, -1, SQLITE_TRANSIENT);
    });
  }
};

struct Timing {
  double rows_s = 0;
  double rest_s = 0;
  int32_t keys = 0;
  int64_t bytes = 0;  // of every file of the order
};

qm::COrderInfo Definition(const char* name, std::initializer_list<const char*> columns) {
  qm::COrderInfo d;
  // Moved in rather than assigned from literals: GCC 12 warns falsely
  // (-Wrestrict) about the inlined literal assignments in Release builds.
  d.OrderName = std::string(name);
  d.TableName = std::string("t");
  d.KeyColumn = std::string("id");
  d.GeneralFlags = 1;  // ignore case
  d.IgnoreChars = std::u16string(u"-");
  for (const char* c : columns) d.Columns.push_back(qm::OrderColumn{c, {}});
  return d;
}

Timing Build(const DataRoot& root, qm::COrderInfo definition, bool rebuild) {
  qm::CGlobalDefs defs;
  defs.SetDataPath(root.Path());
  defs.SetConnectionString("Driver=SQLite3;Database=" + root.Database() + ";StepAPI=1", "bench");
  std::atomic<bool> done = false;
  Clock::time_point at15{};
  std::thread watch([&] {
    while (!done) {
      if (at15 == Clock::time_point{} && defs.GetProgress() >= 15) at15 = Clock::now();
      std::this_thread::sleep_for(std::chrono::milliseconds(2));
    }
  });
  const Clock::time_point start = Clock::now();
  try {
    qm::CPiOrder order(defs);
    order.BuildOrderInt(definition, rebuild);
  } catch (const qm::CExceptionBase& e) {
    done = true;
    watch.join();
    throw std::runtime_error(e.GetFullTextUtf8(100));
  }
  const Clock::time_point end = Clock::now();
  done = true;
  watch.join();
  if (at15 == Clock::time_point{}) at15 = end;
  Timing t;
  t.rows_s = Seconds(at15 - start);
  t.rest_s = Seconds(end - at15);
  t.keys = definition.Count;
  std::string prefix = definition.OrderName;
  for (char& c : prefix) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
  for (const auto& e : fs::directory_iterator(root.Path() + "Groups/PUBLIC/Orders/")) {
    const std::string file = e.path().filename().string();
    if (file.rfind(prefix + ".", 0) == 0 || file.rfind(prefix + "_", 0) == 0) {
      t.bytes += static_cast<int64_t>(e.file_size());
    }
  }
  return t;
}

// The SELECT of an order read alone: connect, execute, fetch and cache
// every row.
double ReadOnly(const DataRoot& root, const std::string& sql) {
  qm::CGlobalDefs defs;
  defs.SetDataPath(root.Path());
  defs.SetConnectionString("Driver=SQLite3;Database=" + root.Database() + ";StepAPI=1", "bench");
  const Clock::time_point start = Clock::now();
  qm::CShareDatabase db(defs);
  db.Connect();
  int16_t columns = 0;
  db.ExecuteSql(sql, columns);
  db.AllocateCache();
  while (db.IsRowAvailable()) {
    db.CacheColumns();
    if (db.MoveNext() != qm::CShareDatabase::kRowFetched) break;
  }
  return Seconds(Clock::now() - start);
}

void Print(const char* what, const Timing& t) {
  std::printf("%-22s %9d %10.2f %9.2f %9.2f %9.1f %9.1f\n", what, t.keys, t.rows_s, t.rest_s,
              t.rows_s + t.rest_s, static_cast<double>(t.bytes) / 1e6, PeakMegabytes());
}

}  // namespace

int main(int argc, char** argv) {
  int64_t rows = 1000000;
  int runs = 1;
  for (int i = 1; i < argc; ++i) {
    const std::string a = argv[i];
    if (a == "--rows" && i + 1 < argc) {
      rows = std::max<int64_t>(1, std::atoll(argv[++i]));
    } else if (a == "--runs" && i + 1 < argc) {
      runs = std::max(1, std::atoi(argv[++i]));
    } else {
      std::fprintf(stderr, "usage: order_build_bench [--rows N] [--runs N]\n");
      return 2;
    }
  }
  try {
    DataRoot root;
    const Clock::time_point made = Clock::now();
    root.AddRows(1, rows);
    std::printf("%lld rows made in %.2f s\n", static_cast<long long>(rows),
                Seconds(Clock::now() - made));
    std::printf("%-22s %9s %10s %9s %9s %9s %9s\n", "build", "keys", "row loop", "rest", "total s",
                "files MB", "peak MB");
    for (int r = 1; r <= runs; ++r) {
      std::printf("read alone: n,r,d %.2f s; label,n %.2f s\n",
                  ReadOnly(root, "select id,n,r,d from t"),
                  ReadOnly(root, "select id,label,n from t"));
      Print("type 1 (n, r, d)", Build(root, Definition("Values", {"n", "r", "d"}), true));
      Print("type 2 (label, n)", Build(root, Definition("Text", {"label", "n"}), true));
    }
    root.AddRows(rows + 1, rows / 100 + 1);
    Print("type 1 update +1%", Build(root, Definition("Values", {"n", "r", "d"}), false));
    Print("type 2 update +1%", Build(root, Definition("Text", {"label", "n"}), false));
  } catch (const std::exception& e) {
    std::fprintf(stderr, "order_build_bench: %s\n", e.what());
    return 1;
  }
  return 0;
}
