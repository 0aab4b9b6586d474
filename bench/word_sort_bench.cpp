// Time and peak memory of the word sort alone (CPiSort::SortFindexTable) over
// a corpus database: docs(id INTEGER PRIMARY KEY, title TEXT, body TEXT), as
// made by make_corpus.py, read through the SQLite ODBC driver, findex over
// title and body with key id and the default options (phrases on, English
// stop words). Phases are timed from the progress values: the row loop ends
// at 15, level one at 20, the merge passes at the end.
//
//   word_sort_bench --corpus FILE [--runs N] [--fts5]
//
// The corpus may also come from QM_BENCH_CORPUS. Without one the program says
// so and exits 0 (machines without the corpus). --fts5 also builds an SQLite
// FTS5 index (positions, contentless) over the same rows, as the reference
// the findex build is measured against.
#include <sqlite3.h>
#include <sys/resource.h>

#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <filesystem>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "format/sort_entry.h"
#include "index/word_sort.h"
#include "format/column_set.h"
#include "base/exception.h"
#include "config/global_defs.h"
#include "format/index_header.h"
#include "format/mfile.h"

namespace {

namespace fs = std::filesystem;
using Clock = std::chrono::steady_clock;

double Seconds(Clock::duration d) { return std::chrono::duration<double>(d).count(); }

double CpuSeconds() {
  timespec t{};
  clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &t);
  return static_cast<double>(t.tv_sec) + static_cast<double>(t.tv_nsec) / 1e9;
}

double PeakMegabytes() {
  rusage u{};
  getrusage(RUSAGE_SELF, &u);
  return static_cast<double>(u.ru_maxrss) / 1024.0;
}

// A data root with the PUBLIC group's work folders and the shipped language data.
class DataRoot {
 public:
  DataRoot() {
    char pattern[] = "/tmp/qm-wordsort-bench.XXXXXX";
    if (mkdtemp(pattern) == nullptr) throw std::runtime_error("cannot make a temporary folder");
    path_ = std::string(pattern) + "/";
    fs::create_directories(path_ + "Groups/PUBLIC/Config");
    fs::create_directories(path_ + "Groups/PUBLIC/WorkData");
    fs::copy(std::string(QM_SOURCE_DATA_DIR) + "Language", path_ + "Language",
             fs::copy_options::recursive);
  }
  ~DataRoot() {
    std::error_code ignored;
    fs::remove_all(path_, ignored);
  }
  const std::string& Path() const { return path_; }

 private:
  std::string path_;
};

struct SortRun {
  double rows_s = 0, level_one_s = 0, merge_s = 0, total_s = 0, cpu_s = 0;
  int64_t rows = 0, entries = 0, sorted_bytes = 0;
  int32_t type = 0;
};

SortRun RunSort(const std::string& corpus, const DataRoot& root) {
  qm::CGlobalDefs defs;
  defs.SetDataPath(root.Path());
  defs.SetConnectionString("Driver=SQLite3;Database=" + corpus + ";StepAPI=1", "corpus");
  qm::CIndexHeader definition;  // default options
  definition.IndexName = "Docs";
  definition.TableName = "docs";
  definition.KeyColumn = "id";
  definition.Columns = {{"title", {}}, {"body", {}}};

  SortRun run;
  std::atomic<bool> done = false;
  Clock::time_point at15{}, at20{};
  const Clock::time_point start = Clock::now();
  const double cpu_start = CpuSeconds();
  std::thread watch([&] {
    while (!done) {
      const int32_t p = defs.GetProgress();
      if (p >= 15 && at15 == Clock::time_point{}) at15 = Clock::now();
      if (p >= 20 && at20 == Clock::time_point{}) at20 = Clock::now();
      std::this_thread::sleep_for(std::chrono::milliseconds(2));
    }
  });
  qm::MFile sorted;
  try {
    qm::CPiSort sort(defs);
    sort.SortFindexTable(definition, sorted);
  } catch (const qm::CExceptionBase& e) {
    done = true;
    watch.join();
    throw std::runtime_error(e.GetFullTextUtf8(100));
  }
  const Clock::time_point end = Clock::now();
  run.cpu_s = CpuSeconds() - cpu_start;
  done = true;
  watch.join();
  if (at15 == Clock::time_point{}) at15 = end;
  if (at20 == Clock::time_point{}) at20 = end;
  run.rows_s = Seconds(at15 - start);
  run.level_one_s = Seconds(at20 - at15);
  run.merge_s = Seconds(end - at20);
  run.total_s = Seconds(end - start);
  run.rows = definition.KeyCount;
  run.type = definition.FindexType;
  run.sorted_bytes = sorted.FileSize(false);
  const qm::SortEntryLayout layout(qm::CColumnSet::FromGeneralFlags(definition.GeneralFlags).Width(),
                                   static_cast<qm::VALUE_TYPE>(definition.FindexType));
  std::vector<uint8_t> entry;
  while (layout.Read(sorted, entry, 0) != 0) ++run.entries;
  return run;
}

void CheckSqlite(int rc, sqlite3* db, const char* what) {
  if (rc != SQLITE_OK && rc != SQLITE_DONE) {
    throw std::runtime_error(std::string(what) + ": " + sqlite3_errmsg(db));
  }
}

// Seconds to build a contentless FTS5 index with positions over the corpus rows.
double RunFts5(const std::string& corpus, const DataRoot& root) {
  sqlite3* db = nullptr;
  const std::string path = root.Path() + "fts5.db";
  CheckSqlite(sqlite3_open(path.c_str(), &db), db, "open");
  const Clock::time_point start = Clock::now();
  const std::string sql =
      "ATTACH DATABASE '" + corpus + "' AS src;"
      "CREATE VIRTUAL TABLE f USING fts5(title, body, content='');"
      "BEGIN; INSERT INTO f(rowid, title, body) SELECT id, title, body FROM src.docs; COMMIT;";
  CheckSqlite(sqlite3_exec(db, sql.c_str(), nullptr, nullptr, nullptr), db, "fts5 build");
  const double seconds = Seconds(Clock::now() - start);
  sqlite3_close(db);
  fs::remove(path);
  return seconds;
}

}  // namespace

int main(int argc, char** argv) {
  std::string corpus = std::getenv("QM_BENCH_CORPUS") ? std::getenv("QM_BENCH_CORPUS") : "";
  int runs = 1;
  bool fts5 = false;
  for (int i = 1; i < argc; ++i) {
    const std::string a = argv[i];
    if (a == "--corpus" && i + 1 < argc) {
      corpus = argv[++i];
    } else if (a == "--runs" && i + 1 < argc) {
      runs = std::max(1, std::atoi(argv[++i]));
    } else if (a == "--fts5") {
      fts5 = true;
    } else {
      std::fprintf(stderr, "usage: word_sort_bench --corpus FILE [--runs N] [--fts5]\n");
      return 2;
    }
  }
  if (corpus.empty() || !fs::exists(corpus)) {
    std::printf("no corpus (--corpus FILE or QM_BENCH_CORPUS): nothing measured\n");
    return 0;
  }
  try {
    const DataRoot root;
    const double text_mb = static_cast<double>(fs::file_size(corpus)) / 1e6;
    std::printf("corpus %s (%.1f MB file)\n", corpus.c_str(), text_mb);
    std::printf("%-4s %8s %10s %9s %9s %9s %9s %8s %10s %9s\n", "run", "rows", "entries",
                "row loop", "level 1", "merges", "total s", "cpu s", "sorted MB", "peak MB");
    for (int r = 1; r <= runs; ++r) {
      const SortRun s = RunSort(corpus, root);
      std::printf("%-4d %8lld %10lld %9.2f %9.2f %9.2f %9.2f %8.2f %10.1f %9.1f\n", r,
                  static_cast<long long>(s.rows), static_cast<long long>(s.entries), s.rows_s,
                  s.level_one_s, s.merge_s, s.total_s, s.cpu_s,
                  static_cast<double>(s.sorted_bytes) / 1e6, PeakMegabytes());
    }
    if (fts5) std::printf("FTS5 (positions, contentless) build: %.2f s\n", RunFts5(corpus, root));
  } catch (const std::exception& e) {
    std::fprintf(stderr, "word_sort_bench: %s\n", e.what());
    return 1;
  }
  return 0;
}
