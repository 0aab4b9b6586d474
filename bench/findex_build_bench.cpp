// A whole findex build through the command object, against SQLite FTS5 as the
// reference. The corpus is a database made by make_corpus.py:
// docs(id INTEGER PRIMARY KEY, title TEXT, body TEXT). The findex is
//   CREATE FINDEX Docs ON TABLE docs COLUMNS title,body KEY id
// with the default options (phrases on, English stop words), read through the
// SQLite ODBC driver; the reference is a contentless FTS5 table with positions,
// fts5(title, body, content=''), filled from the same file.
//
//   findex_build_bench [--corpus FILE]... [--runs N] [--no-fts5] [--phases]
//
// The corpus may also come from QM_BENCH_CORPUS (several files separated by
// ':'). Without one the program says so and exits 0 (machines without the
// corpus). Every build runs in a child process of its own, so its peak memory
// (maximum resident set) and CPU time are its own. --phases builds the same
// findex once more from its two halves, the word sort (CPiSort) and the
// writer (CPiFIndex::BuildFromSorted), as a build does, to time its phases:
// the row loop (rows read, their text split on the splitting thread and
// handed to the sorting thread, which sorts and writes runs beside it), then
// the k-way merge after the row loop and the writer beside it (the merge ends
// with its last entry taken), and the writer's finishing after the merge. The sort's memory budget
// is sort_memory_mb of the configuration store (MORVIL_SORT_MEMORY_MB).
#include <sqlite3.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <map>
#include <memory>
#include <sstream>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "index/findex_writer.h"
#include "index/word_sort.h"
#include "platform/text_encoding.h"
#include "quillmere/api_command.h"
#include "base/exception.h"
#include "config/global_defs.h"
#include "format/index_header.h"
#include "format/mfile.h"

namespace {

namespace fs = std::filesystem;
using Clock = std::chrono::steady_clock;
using qm::APICommand;
using qm::BSTR;
using qm::S_OK;

double Seconds(Clock::duration d) { return std::chrono::duration<double>(d).count(); }

// A data root with the PUBLIC group's folders and the shipped language data,
// removed with the object.
class DataRoot {
 public:
  DataRoot() {
    char pattern[] = "/tmp/qm-findex-bench.XXXXXX";
    if (mkdtemp(pattern) == nullptr) throw std::runtime_error("cannot make a temporary folder");
    path_ = std::string(pattern) + "/";
    for (const char* folder : {"Indexes", "Config", "WorkData"}) {
      fs::create_directories(path_ + "Groups/PUBLIC/" + folder);
    }
    fs::copy(std::string(QM_SOURCE_DATA_DIR) + "Language", path_ + "Language",
             fs::copy_options::recursive);
  }
  ~DataRoot() {
    std::error_code ignored;
    fs::remove_all(path_, ignored);
  }
  DataRoot(const DataRoot&) = delete;
  DataRoot& operator=(const DataRoot&) = delete;
  const std::string& Path() const { return path_; }
  std::string Indexes() const { return path_ + "Groups/PUBLIC/Indexes/"; }

 private:
  std::string path_;
};

// What a child reports: name=value pairs.
using Report = std::map<std::string, double>;

std::string Format(const Report& report) {
  std::ostringstream out;
  out.precision(17);  // counts of millions stay whole
  for (const auto& [name, value] : report) out << name << '=' << value << '\n';
  return out.str();
}

Report Parse(const std::string& text) {
  Report report;
  std::istringstream in(text);
  std::string line;
  while (std::getline(in, line)) {
    const auto at = line.find('=');
    if (at != std::string::npos) report[line.substr(0, at)] = std::stod(line.substr(at + 1));
  }
  return report;
}

// Runs work in a child process; its report, with the child's peak memory
// (MB) and CPU seconds added. A failing child's message is raised.
template <class Work>
Report InChild(Work&& work) {
  int fds[2];
  if (pipe(fds) != 0) throw std::runtime_error("pipe failed");
  std::fflush(nullptr);
  const pid_t pid = fork();
  if (pid < 0) throw std::runtime_error("fork failed");
  if (pid == 0) {
    close(fds[0]);
    std::string text;
    int status = 0;
    try {
      text = Format(work());
    } catch (const std::exception& e) {
      text = std::string("error: ") + e.what();
      status = 1;
    }
    for (std::size_t done = 0; done < text.size();) {
      const ssize_t n = write(fds[1], text.data() + done, text.size() - done);
      if (n <= 0) break;
      done += static_cast<std::size_t>(n);
    }
    close(fds[1]);
    _exit(status);
  }
  close(fds[1]);
  std::string text;
  char buffer[4096];
  for (ssize_t n; (n = read(fds[0], buffer, sizeof buffer)) > 0;) {
    text.append(buffer, static_cast<std::size_t>(n));
  }
  close(fds[0]);
  int status = 0;
  rusage usage{};
  if (wait4(pid, &status, 0, &usage) != pid) throw std::runtime_error("wait4 failed");
  if (!WIFEXITED(status) || WEXITSTATUS(status) != 0) {
    throw std::runtime_error(text.empty() ? "the child process failed" : text);
  }
  Report report = Parse(text);
  report["peak_mb"] = static_cast<double>(usage.ru_maxrss) / 1024.0;
  report["cpu_s"] = static_cast<double>(usage.ru_utime.tv_sec + usage.ru_stime.tv_sec) +
                    static_cast<double>(usage.ru_utime.tv_usec + usage.ru_stime.tv_usec) / 1e6;
  return report;
}

void CheckSqlite(int rc, sqlite3* db, const char* what) {
  if (rc != SQLITE_OK && rc != SQLITE_DONE && rc != SQLITE_ROW) {
    throw std::runtime_error(std::string(what) + ": " + sqlite3_errmsg(db));
  }
}

// Rows and bytes of text (title and body, as stored) of the corpus.
std::pair<int64_t, double> CorpusSize(const std::string& corpus) {
  sqlite3* db = nullptr;
  std::unique_ptr<sqlite3, decltype(&sqlite3_close)> owner(nullptr, sqlite3_close);
  CheckSqlite(sqlite3_open_v2(corpus.c_str(), &db, SQLITE_OPEN_READONLY, nullptr), db, "open");
  owner.reset(db);
  sqlite3_stmt* statement = nullptr;
  CheckSqlite(sqlite3_prepare_v2(db,
                                 "SELECT count(*), total(length(CAST(title AS BLOB))) + "
                                 "total(length(CAST(body AS BLOB))) FROM docs",
                                 -1, &statement, nullptr),
              db, "prepare");
  CheckSqlite(sqlite3_step(statement), db, "count");
  const auto rows = static_cast<int64_t>(sqlite3_column_int64(statement, 0));
  const double bytes = sqlite3_column_double(statement, 1);
  sqlite3_finalize(statement);
  return {rows, bytes};
}

std::string Text(const BSTR& text) { return qm::Utf16ToUtf8(text); }

std::string Connection(const std::string& corpus) {
  return "Driver=SQLite3;Database=" + corpus + ";StepAPI=1;NoCreat=1;";
}

// One findex build through the command object.
Report BuildFindex(const std::string& corpus) {
  const DataRoot root;
  APICommand command;
  const BSTR path = qm::Utf8ToUtf16(root.Path());
  const BSTR connection = qm::Utf8ToUtf16(Connection(corpus));
  const BSTR name = u"corpus";
  const BSTR statement = u"CREATE FINDEX Docs ON TABLE docs COLUMNS title,body KEY id";
  if (command.SetDataPath(&path) != S_OK ||
      command.SetDBConnectionStringEx(&connection, &name) != S_OK) {
    throw std::runtime_error("cannot set up the command object");
  }
  const Clock::time_point start = Clock::now();
  if (command.ExecuteEx(&statement, -1) != S_OK) {
    qm::ErrorInfo info;
    throw std::runtime_error(qm::GetErrorInfo(info) ? Text(info.Description) : "ExecuteEx failed");
  }
  const Clock::time_point end = Clock::now();
  BSTR words;
  const BSTR object = u"Docs";
  command.SetCurrentObjectName(&object);
  command.GetFindexInfo(qm::idxWordCount, &words);
  BSTR distinct;
  command.GetFindexInfo(qm::idxDistinctWordCount, &distinct);
  return {{"total_s", Seconds(end - start)},
          {"words", std::stod(Text(words))},
          {"distinct", std::stod(Text(distinct))},
          {"index_mb", static_cast<double>(fs::file_size(root.Indexes() + "DOCS.sdx") +
                                           fs::file_size(root.Indexes() + "DOCS.fst")) /
                           1e6}};
}

// The same findex from its two halves, each timed: the word sort reports its
// row loop (with runs sorted on the second thread beside it), the sorting
// thread's own time on runs, and the merge after the row loop.
Report BuildFindexByPhases(const std::string& corpus) {
  const DataRoot root;
  qm::CGlobalDefs defs;
  defs.SetDataPath(root.Path());
  defs.SetConnectionString(Connection(corpus), "corpus");
  qm::CIndexHeader definition;  // the default options
  definition.IndexName = "Docs";
  definition.TableName = "docs";
  definition.KeyColumn = "id";
  definition.Columns = {{"title", {}}, {"body", {}}};

  Clock::time_point start, sorted_at, written_at;
  qm::CPiSort sort(defs);
  try {
    start = Clock::now();
    sort.SortFindexRows(definition);
    sorted_at = Clock::now();
    qm::CPiFIndex(defs).BuildFromSorted(definition, sort.Merged(), true);
    written_at = Clock::now();
  } catch (const qm::CExceptionBase& e) {
    throw std::runtime_error(e.GetFullTextUtf8(100));
  }
  const qm::CPiSort::Phases& phases = sort.LastPhases();
  return {{"rows_s", phases.row_loop},
          {"runs_s", phases.runs},
          {"run_count", static_cast<double>(phases.run_count)},
          {"merges_s", phases.merge},
          {"writer_s", Seconds(written_at - sorted_at)},
          {"total_s", Seconds(written_at - start)},
          {"words", static_cast<double>(definition.WordCount)}};
}

// The reference: a contentless FTS5 table with positions over the same rows.
Report BuildFts5(const std::string& corpus) {
  const DataRoot root;
  const std::string path = root.Path() + "fts5.db";
  sqlite3* db = nullptr;
  std::unique_ptr<sqlite3, decltype(&sqlite3_close)> owner(nullptr, sqlite3_close);
  CheckSqlite(sqlite3_open(path.c_str(), &db), db, "open");
  owner.reset(db);
  const Clock::time_point start = Clock::now();
  const std::string sql =
      "ATTACH DATABASE '" + corpus + "' AS src;"
      "CREATE VIRTUAL TABLE f USING fts5(title, body, content='');"
      "BEGIN; INSERT INTO f(rowid, title, body) SELECT id, title, body FROM src.docs; COMMIT;";
  sqlite3_extended_result_codes(db, 1);
  CheckSqlite(sqlite3_exec(db, sql.c_str(), nullptr, nullptr, nullptr), db, "fts5 build");
  const double seconds = Seconds(Clock::now() - start);
  owner.reset();
  return {{"total_s", seconds}, {"index_mb", static_cast<double>(fs::file_size(path)) / 1e6}};
}

std::string LoadAverage() {
  std::ifstream in("/proc/loadavg");
  std::string one, five, fifteen;
  in >> one >> five >> fifteen;
  return one + " " + five + " " + fifteen;
}

}  // namespace

int main(int argc, char** argv) {
  std::vector<std::string> corpora;
  if (const char* env = std::getenv("QM_BENCH_CORPUS"); env != nullptr && *env != '\0') {
    std::istringstream in(env);
    for (std::string file; std::getline(in, file, ':');) {
      if (!file.empty()) corpora.push_back(file);
    }
  }
  int runs = 1;
  bool fts5 = true;
  bool phases = false;
  bool from_flags = false;
  for (int i = 1; i < argc; ++i) {
    const std::string a = argv[i];
    if (a == "--corpus" && i + 1 < argc) {
      if (!from_flags) corpora.clear();
      from_flags = true;
      corpora.emplace_back(argv[++i]);
    } else if (a == "--runs" && i + 1 < argc) {
      runs = std::max(1, std::atoi(argv[++i]));
    } else if (a == "--no-fts5") {
      fts5 = false;
    } else if (a == "--phases") {
      phases = true;
    } else {
      std::fprintf(stderr,
                   "usage: findex_build_bench [--corpus FILE]... [--runs N] [--no-fts5] "
                   "[--phases]\n");
      return 2;
    }
  }
  if (corpora.empty()) {
    std::printf("no corpus (--corpus FILE or QM_BENCH_CORPUS): nothing measured\n");
    return 0;
  }
  try {
    // The path goes into SQL and a connection string as it is.
    for (const auto& corpus : corpora) {
      if (!fs::exists(corpus)) throw std::runtime_error("no such corpus: " + corpus);
      if (corpus.find_first_of("';{}") != std::string::npos) {
        throw std::runtime_error("corpus paths with ', ;, { or } are not taken: " + corpus);
      }
    }
    std::printf("load average at start: %s (%u cores)\n", LoadAverage().c_str(),
                std::thread::hardware_concurrency());
    for (const auto& corpus : corpora) {
      const auto [rows, bytes] = CorpusSize(corpus);
      const double text_mb = bytes / 1e6;
      std::printf("\n%s: %lld rows, %.1f MB of text\n", corpus.c_str(), static_cast<long long>(rows),
                  text_mb);
      std::printf("%-7s %3s %8s %7s %7s %8s %9s %7s\n", "build", "run", "total s", "cpu s", "MB/s",
                  "peak MB", "index MB", "x FTS5");
      for (int r = 1; r <= runs; ++r) {
        double reference = 0;
        if (fts5) {
          const Report f = InChild([&] { return BuildFts5(corpus); });
          reference = f.at("total_s");
          std::printf("%-7s %3d %8.2f %7.2f %7.1f %8.1f %9.1f\n", "FTS5", r, reference,
                      f.at("cpu_s"), text_mb / reference, f.at("peak_mb"), f.at("index_mb"));
        }
        const Report q = InChild([&] { return BuildFindex(corpus); });
        const double total = q.at("total_s");
        std::printf("%-7s %3d %8.2f %7.2f %7.1f %8.1f %9.1f", "findex", r, total, q.at("cpu_s"),
                    text_mb / total, q.at("peak_mb"), q.at("index_mb"));
        if (reference > 0) std::printf(" %7.2f", total / reference);
        std::printf("\n");
        if (r == 1) {
          std::printf("        %.0f words written, %.0f distinct\n", q.at("words"),
                      q.at("distinct"));
        }
        if (phases) {
          const Report p = InChild([&] { return BuildFindexByPhases(corpus); });
          std::printf(
              "phases  %3d %8.2f %7.2f %8.1f  row loop %.2f (runs beside it %.2f, %.0f runs), "
              "merge %.2f with the writer beside it, writer %.2f s\n",
              r, p.at("total_s"), p.at("cpu_s"), p.at("peak_mb"), p.at("rows_s"), p.at("runs_s"),
              p.at("run_count"), p.at("merges_s"), p.at("writer_s"));
          if (p.at("words") != q.at("words")) {
            throw std::runtime_error("the phase build wrote another number of words");
          }
        }
      }
    }
    std::printf("\nload average at end: %s\n", LoadAverage().c_str());
  } catch (const std::exception& e) {
    std::fprintf(stderr, "findex_build_bench: %s\n", e.what());
    return 1;
  }
  return 0;
}
