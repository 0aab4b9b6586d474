// Searches to a complete key array, against SQLite FTS5 over the same rows.
// The corpus is a database made by make_corpus.py:
// docs(id INTEGER PRIMARY KEY, title TEXT, body TEXT). The findex is
//   CREATE FINDEX Docs ON TABLE docs COLUMNS title,body KEY id
// with phrases on and stop words off (every word indexed, as in the
// reference), read through the SQLite ODBC driver; the reference is a
// contentless FTS5 table with positions, fts5(title, body, content='').
//
//   search_bench --corpus FILE [--work DIR] [benchmark flags]
//
// The corpus may also come from QM_BENCH_CORPUS. Both indexes are built once
// into the work folder (default: a folder beside the corpus named after it)
// and reused by later runs. Each query is timed from the statement to the
// key array: parsing, lookups, merges and deleted keys for the findex;
// stepping every row id of a MATCH for FTS5. At the end the ratios
// findex / FTS5 are printed with the key counts of both.
//
// The search object's runs go end to end through APISearch: Execute, then the
// key string (GetRawKeyString) or the SQL (GetSql), then Close. Ordering runs
// take the word query "package" and order its keys by an order column
// (CREATE ORDER Titles ... COLUMNS title) and by score (a second findex,
// Scored, built with score support), against FTS5 ordering the same MATCH by
// the title of a join with the corpus and by its rank.
#include <benchmark/benchmark.h>
#include <sqlite3.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <map>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include "base/exception.h"
#include "config/global_defs.h"
#include "platform/text_encoding.h"
#include "quillmere/api_command.h"
#include "quillmere/api_search.h"
#include "search/cmd_tree.h"
#include "search/gi_tree_rowset.h"

namespace {

namespace fs = std::filesystem;

struct Query {
  const char* name;
  const char* condition;  // inside the brackets of a search statement
  const char* match;      // FTS5 MATCH expression
};

const Query kQueries[] = {
    {"package", "DOCS='package'", "package"},
    {"lib*", "DOCS='lib*'", "lib*"},
    {"python AND library", "DOCS='python' AND DOCS='library'", "python AND library"},
    {"python OR perl", "DOCS='python' OR DOCS='perl'", "python OR perl"},
    {"\"command line\"", "DOCS='command line'", "\"command line\""},
    {"\"this package\"", "DOCS='this package'", "\"this package\""},
    {"client NEAR/3 server", "DOCS='client' NEAR/3 DOCS='server'", "NEAR(client server, 3)"},
};

std::string g_work;
std::string g_fts5;
std::string g_corpus;
std::map<std::string, int64_t> g_keys;  // "findex/name" or "fts5/name" -> keys found

void CheckSqlite(int rc, sqlite3* db, const char* what) {
  if (rc != SQLITE_OK && rc != SQLITE_DONE && rc != SQLITE_ROW) {
    throw std::runtime_error(std::string(what) + ": " + sqlite3_errmsg(db));
  }
}

void Require(qm::HRESULT hr, const char* what) {
  if (hr == qm::S_OK) return;
  qm::ErrorInfo info;
  throw std::runtime_error(std::string(what) + ": " +
                           (qm::GetErrorInfo(info) ? qm::Utf16ToUtf8(info.Description) : "failed"));
}

// Builds what is missing: Docs (no scores), Scored (scores) and the order Titles.
void BuildFindex(const std::string& corpus) {
  for (const char* folder : {"Indexes", "Orders", "Config", "WorkData"}) {
    fs::create_directories(g_work + "Groups/PUBLIC/" + folder);
  }
  if (!fs::exists(g_work + "Language")) {
    fs::copy(std::string(QM_SOURCE_DATA_DIR) + "Language", g_work + "Language",
             fs::copy_options::recursive);
  }
  qm::APICommand command;
  const qm::BSTR path = qm::Utf8ToUtf16(g_work);
  const qm::BSTR connection =
      qm::Utf8ToUtf16("Driver=SQLite3;Database=" + corpus + ";StepAPI=1;NoCreat=1;");
  const qm::BSTR name = u"corpus";
  Require(command.SetDataPath(&path), "data path");
  Require(command.SetDBConnectionStringEx(&connection, &name), "connection");
  // Phrases on; stop words off, accents stripped as by default.
  Require(command.SetIndexLanguageOptions(2, 0, 0, 0, -1, 0), "language options");
  const auto build = [&](const char* file, const char16_t* statement, bool scores) {
    if (fs::exists(g_work + "Groups/PUBLIC/" + file)) return;
    std::printf("building %s in %s ...\n", file, g_work.c_str());
    Require(command.SetIndexGeneralOptions(scores ? -1 : 0, -1, 0, nullptr, -1, -1), "options");
    const qm::BSTR text = statement;
    Require(command.ExecuteEx(&text, -1), file);
  };
  build("Indexes/DOCS.fst", u"CREATE FINDEX Docs ON TABLE docs COLUMNS title,body KEY id", false);
  build("Indexes/SCORED.fst", u"CREATE FINDEX Scored ON TABLE docs COLUMNS title,body KEY id",
        true);
  build("Orders/TITLES.srt", u"CREATE ORDER Titles ON TABLE docs COLUMNS title KEY id", false);
}

void BuildFts5(const std::string& corpus) {
  g_fts5 = g_work + "fts5.db";
  if (fs::exists(g_fts5)) return;
  std::printf("building the FTS5 reference ...\n");
  sqlite3* db = nullptr;
  std::unique_ptr<sqlite3, decltype(&sqlite3_close)> owner(nullptr, sqlite3_close);
  CheckSqlite(sqlite3_open(g_fts5.c_str(), &db), db, "open");
  owner.reset(db);
  const std::string sql =
      "ATTACH DATABASE '" + corpus +
      "' AS src;"
      "CREATE VIRTUAL TABLE f USING fts5(title, body, content='');"
      "BEGIN; INSERT INTO f(rowid, title, body) SELECT id, title, body FROM src.docs; COMMIT;";
  CheckSqlite(sqlite3_exec(db, sql.c_str(), nullptr, nullptr, nullptr), db, "fts5 build");
}

void Findex(benchmark::State& state, const Query& query) {
  qm::CGlobalDefs defs;
  defs.SetDataPath(g_work);
  const std::u16string statement =
      qm::Utf8ToUtf16(std::string("SELECT ID FROM DOCS WHERE [") + query.condition + "]");
  int64_t keys = 0;
  for (auto _ : state) {
    try {
      qm::CGiTreeRowset rowset(defs);
      rowset.Commands().Add(std::make_unique<qm::CGiCmdTree>(defs)).SplitSqlW(statement);
      rowset.StartRowset(1, false);
      keys = rowset.GetTotal();
      benchmark::DoNotOptimize(rowset.Result().Row(0));
    } catch (const qm::CExceptionBase& e) {
      state.SkipWithError(e.GetFullTextUtf8(100).c_str());
      return;
    }
  }
  state.counters["keys"] = static_cast<double>(keys);
  g_keys[std::string("findex/") + query.name] = keys;
}

// Steps every row id that sql gives (its ?1 bound to match) on the FTS5
// reference, the corpus attached as src; name keys the key count.
void RunFts5(benchmark::State& state, const char* sql, const char* match, const std::string& name) {
  sqlite3* db = nullptr;
  std::unique_ptr<sqlite3, decltype(&sqlite3_close)> owner(nullptr, sqlite3_close);
  CheckSqlite(sqlite3_open_v2(g_fts5.c_str(), &db, SQLITE_OPEN_READONLY, nullptr), db, "open");
  owner.reset(db);
  CheckSqlite(sqlite3_exec(db, ("ATTACH DATABASE '" + g_corpus + "' AS src").c_str(), nullptr,
                           nullptr, nullptr),
              db, "attach");
  sqlite3_stmt* statement = nullptr;
  CheckSqlite(sqlite3_prepare_v2(db, sql, -1, &statement, nullptr), db, "prepare");
  std::vector<int64_t> keys;
  for (auto _ : state) {
    keys.clear();
    sqlite3_bind_text(statement, 1, match, -1, SQLITE_STATIC);
    while (sqlite3_step(statement) == SQLITE_ROW)
      keys.push_back(sqlite3_column_int64(statement, 0));
    sqlite3_reset(statement);
    benchmark::DoNotOptimize(keys.data());
  }
  sqlite3_finalize(statement);
  state.counters["keys"] = static_cast<double>(keys.size());
  g_keys[name] = static_cast<int64_t>(keys.size());
}

void Fts5(benchmark::State& state, const Query& query) {
  RunFts5(state, "SELECT rowid FROM f WHERE f MATCH ?1", query.match,
          std::string("fts5/") + query.name);
}

// The search object end to end: output 0 the key string, 1 the SQL.
void Api(benchmark::State& state, const Query& query, int output) {
  qm::APISearch search;
  const qm::BSTR path = qm::Utf8ToUtf16(g_work);
  const qm::BSTR statement =
      qm::Utf8ToUtf16(std::string("SELECT ID FROM DOCS WHERE [") + query.condition + "]");
  int32_t keys = 0;
  std::size_t length = 0;
  try {
    Require(search.SetDataPath(&path), "data path");
    for (auto _ : state) {
      qm::BSTR text;
      Require(search.Execute(&statement), query.name);
      Require(output == 0 ? search.GetRawKeyString(0, 0, &text) : search.GetSql(0, 0, &text),
              "result");
      Require(search.GetTotal(&keys), "total");
      Require(search.Close(), "close");
      length = text.size();
      benchmark::DoNotOptimize(text.data());
    }
  } catch (const std::exception& e) {
    state.SkipWithError(e.what());
    return;
  }
  state.counters["keys"] = keys;
  state.counters["chars"] = static_cast<double>(length);
  state.counters["keys/s"] = benchmark::Counter(static_cast<double>(keys) * state.iterations(),
                                                benchmark::Counter::kIsRate);
}

// "package" ordered by the search object: by the order Titles, or by score.
void ApiOrdered(benchmark::State& state, bool by_score) {
  qm::APISearch search;
  const qm::BSTR path = qm::Utf8ToUtf16(g_work);
  const qm::BSTR statement = by_score ? u"SELECT ID FROM DOCS WHERE [SCORED='package']"
                                      : u"SELECT ID FROM DOCS WHERE [DOCS='package']";
  const qm::BSTR order = by_score ? u"SCORE DESC" : u"TITLES.TITLE ASC";
  int32_t keys = 0;
  try {
    Require(search.SetDataPath(&path), "data path");
    for (auto _ : state) {
      qm::BSTR text;
      Require(search.Execute(&statement), "package");
      Require(search.OrderBy(&order), "order");
      Require(search.GetRawKeyString(0, 0, &text), "keys");
      Require(search.GetTotal(&keys), "total");
      Require(search.Close(), "close");
      benchmark::DoNotOptimize(text.data());
    }
  } catch (const std::exception& e) {
    state.SkipWithError(e.what());
    return;
  }
  state.counters["keys"] = keys;
  g_keys[by_score ? "api/order score" : "api/order title"] = keys;
}

// FTS5 ordering the same keys: by the corpus's title, or by rank.
void Fts5Ordered(benchmark::State& state, bool by_rank) {
  RunFts5(state,
          by_rank ? "SELECT rowid FROM f WHERE f MATCH ?1 ORDER BY rank"
                  : "SELECT d.id FROM f JOIN src.docs d ON d.id = f.rowid "
                    "WHERE f MATCH ?1 ORDER BY d.title",
          "package", by_rank ? "fts5/order score" : "fts5/order title");
}

// Collects the mean real time of every run by benchmark name.
class RatioReporter : public benchmark::ConsoleReporter {
 public:
  void ReportRuns(const std::vector<Run>& runs) override {
    for (const Run& run : runs) {
      if (run.run_type == Run::RT_Iteration && !run.error_occurred) {
        times_[run.benchmark_name()] = run.GetAdjustedRealTime();
      }
    }
    ConsoleReporter::ReportRuns(runs);
  }
  double Time(const std::string& name) const {
    const auto it = times_.find(name);
    return it == times_.end() ? 0 : it->second;
  }

 private:
  std::map<std::string, double> times_;
};

}  // namespace

int main(int argc, char** argv) {
  std::string corpus;
  if (const char* env = std::getenv("QM_BENCH_CORPUS"); env != nullptr) corpus = env;
  std::vector<char*> rest{argv[0]};
  for (int i = 1; i < argc; ++i) {
    const std::string a = argv[i];
    if (a == "--corpus" && i + 1 < argc) {
      corpus = argv[++i];
    } else if (a == "--work" && i + 1 < argc) {
      g_work = argv[++i];
    } else {
      rest.push_back(argv[i]);
    }
  }
  if (corpus.empty()) {
    std::printf("no corpus (--corpus FILE or QM_BENCH_CORPUS): nothing measured\n");
    return 0;
  }
  if (corpus.find_first_of("';{}") != std::string::npos || !fs::exists(corpus)) {
    std::fprintf(stderr, "search_bench: no usable corpus at %s\n", corpus.c_str());
    return 1;
  }
  g_corpus = corpus;
  if (g_work.empty()) g_work = fs::path(corpus).replace_extension("").string() + "-search";
  if (g_work.back() != '/') g_work += '/';
  try {
    fs::create_directories(g_work);
    BuildFindex(corpus);
    BuildFts5(corpus);
  } catch (const std::exception& e) {
    std::fprintf(stderr, "search_bench: %s\n", e.what());
    return 1;
  }
  for (const Query& query : kQueries) {
    benchmark::RegisterBenchmark((std::string("findex/") + query.name).c_str(), Findex, query)
        ->Unit(benchmark::kMillisecond);
    benchmark::RegisterBenchmark((std::string("fts5/") + query.name).c_str(), Fts5, query)
        ->Unit(benchmark::kMillisecond);
    benchmark::RegisterBenchmark((std::string("api-keys/") + query.name).c_str(), Api, query, 0)
        ->Unit(benchmark::kMillisecond);
    benchmark::RegisterBenchmark((std::string("api-sql/") + query.name).c_str(), Api, query, 1)
        ->Unit(benchmark::kMillisecond);
  }
  benchmark::RegisterBenchmark("api/order title", ApiOrdered, false)->Unit(benchmark::kMillisecond);
  benchmark::RegisterBenchmark("fts5/order title", Fts5Ordered, false)
      ->Unit(benchmark::kMillisecond);
  benchmark::RegisterBenchmark("api/order score", ApiOrdered, true)->Unit(benchmark::kMillisecond);
  benchmark::RegisterBenchmark("fts5/order score", Fts5Ordered, true)
      ->Unit(benchmark::kMillisecond);
  int rest_count = static_cast<int>(rest.size());
  benchmark::Initialize(&rest_count, rest.data());
  RatioReporter reporter;
  benchmark::RunSpecifiedBenchmarks(&reporter);
  benchmark::Shutdown();

  std::printf("\n%-24s %12s %12s %8s %10s %10s\n", "query", "findex ms", "FTS5 ms", "ratio", "keys",
              "FTS5 keys");
  for (const Query& query : kQueries) {
    const double mine = reporter.Time(std::string("findex/") + query.name);
    const double theirs = reporter.Time(std::string("fts5/") + query.name);
    std::printf("%-24s %12.3f %12.3f %8.2f %10lld %10lld\n", query.name, mine, theirs,
                theirs > 0 ? mine / theirs : 0.0,
                static_cast<long long>(g_keys[std::string("findex/") + query.name]),
                static_cast<long long>(g_keys[std::string("fts5/") + query.name]));
  }
  std::printf("\n%-24s %12s %12s %12s %8s %8s\n", "search object", "keys ms", "SQL ms", "FTS5 ms",
              "keys/FTS5", "SQL/FTS5");
  for (const Query& query : kQueries) {
    const double keys = reporter.Time(std::string("api-keys/") + query.name);
    const double sql = reporter.Time(std::string("api-sql/") + query.name);
    const double theirs = reporter.Time(std::string("fts5/") + query.name);
    std::printf("%-24s %12.3f %12.3f %12.3f %8.2f %8.2f\n", query.name, keys, sql, theirs,
                theirs > 0 ? keys / theirs : 0.0, theirs > 0 ? sql / theirs : 0.0);
  }
  for (const char* what : {"order title", "order score"}) {
    const double mine = reporter.Time(std::string("api/") + what);
    const double theirs = reporter.Time(std::string("fts5/") + what);
    std::printf("%-24s %12.3f %12s %12.3f %8.2f   keys %lld / FTS5 %lld\n", what, mine, "", theirs,
                theirs > 0 ? mine / theirs : 0.0,
                static_cast<long long>(g_keys[std::string("api/") + what]),
                static_cast<long long>(g_keys[std::string("fts5/") + what]));
  }
  return 0;
}
