// Rows per second reading (integer key, ~300 bytes of text) rows from SQLite:
// through CShareDatabase with its column cache, through a plain ODBC loop over
// the same driver, and through the native SQLite library, in one run.
//
//   odbc_read_bench [--rows N] [--runs R] [--dir FOLDER] [--only native|plain|engine]
//
// The database is generated in a temporary folder and removed at the end. Each
// run reads every row once with each reader, in turn. The table shows the
// medians of wall time and of the process's processor time; the comparison
// uses the best processor time of each reader, the measure least disturbed by
// other work on a shared machine. The engine's reader should stay within 1.3
// times the plain ODBC loop; the exit status is 1 when it does not.
#include <sql.h>
#include <sqlext.h>
#include <sqlite3.h>

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <filesystem>
#include <functional>
#include <memory>
#include <random>
#include <stdexcept>
#include <string>
#include <vector>

#include "base/exception.h"
#include "config/global_defs.h"
#include "sources/share_database.h"

namespace {

namespace fs = std::filesystem;

constexpr double kAllowedRatio = 1.3;
constexpr std::size_t kTextBytes = 300;

// What a reader saw: rows and a checksum over keys and text, equal for all readers.
struct Tally {
  uint64_t rows = 0;
  uint64_t sum = 0;

  void Add(int64_t key, const char* text, std::size_t length) {
    ++rows;
    sum = sum * 1000003u + static_cast<uint64_t>(key) * 31u + length;
    if (length > 0)
      sum += static_cast<unsigned char>(text[0]) + static_cast<unsigned char>(text[length - 1]);
  }
  bool operator==(const Tally&) const = default;
};

void Check(bool ok, const std::string& what) {
  if (!ok) throw std::runtime_error(what);
}

void CheckSqlite(int rc, sqlite3* db, const char* what) {
  if (rc != SQLITE_OK && rc != SQLITE_DONE && rc != SQLITE_ROW) {
    throw std::runtime_error(std::string(what) + ": " + sqlite3_errmsg(db));
  }
}

// A text of kTextBytes of words, different for every key.
std::string RowText(std::mt19937& random) {
  static const char* const kWords[] = {"river",  "fish",   "stone",  "north", "garden",  "letter",
                                       "copper", "window", "silver", "maple", "harbour", "quiet"};
  std::string text;
  while (text.size() < kTextBytes) {
    text += kWords[random() % std::size(kWords)];
    text += ' ';
  }
  text.resize(kTextBytes);
  return text;
}

void Generate(const std::string& path, int rows) {
  sqlite3* db = nullptr;
  CheckSqlite(sqlite3_open(path.c_str(), &db), db, "open");
  std::unique_ptr<sqlite3, decltype(&sqlite3_close)> owner(db, sqlite3_close);
  CheckSqlite(sqlite3_exec(db,
                           "PRAGMA journal_mode=OFF; PRAGMA synchronous=OFF;"
                           "CREATE TABLE big (id INTEGER PRIMARY KEY, txt TEXT); BEGIN;",
                           nullptr, nullptr, nullptr),
              db, "create");
  sqlite3_stmt* insert = nullptr;
  CheckSqlite(sqlite3_prepare_v2(db, "INSERT INTO big VALUES (?, ?)", -1, &insert, nullptr), db,
              "prepare");
  std::mt19937 random(42);
  for (int id = 1; id <= rows; ++id) {
    const std::string text = RowText(random);
    sqlite3_bind_int(insert, 1, id);
    sqlite3_bind_text(insert, 2, text.data(), static_cast<int>(text.size()), SQLITE_TRANSIENT);
    CheckSqlite(sqlite3_step(insert), db, "insert");
    sqlite3_reset(insert);
  }
  sqlite3_finalize(insert);
  CheckSqlite(sqlite3_exec(db, "COMMIT;", nullptr, nullptr, nullptr), db, "commit");
}

Tally ReadNative(const std::string& path) {
  sqlite3* db = nullptr;
  CheckSqlite(sqlite3_open_v2(path.c_str(), &db, SQLITE_OPEN_READONLY, nullptr), db, "open");
  std::unique_ptr<sqlite3, decltype(&sqlite3_close)> owner(db, sqlite3_close);
  sqlite3_stmt* select = nullptr;
  CheckSqlite(sqlite3_prepare_v2(db, "SELECT id, txt FROM big", -1, &select, nullptr), db,
              "prepare");
  Tally tally;
  char buffer[1024];
  int rc;
  while ((rc = sqlite3_step(select)) == SQLITE_ROW) {
    const int key = sqlite3_column_int(select, 0);
    const auto* text = sqlite3_column_text(select, 1);
    const std::size_t length =
        std::min<std::size_t>(sqlite3_column_bytes(select, 1), sizeof buffer);
    std::memcpy(buffer, text, length);
    tally.Add(key, buffer, length);
  }
  CheckSqlite(rc, db, "step");
  sqlite3_finalize(select);
  return tally;
}

// The loop anyone would write against the ODBC API: fetch, then one
// SQLGetData per column into a fixed buffer.
Tally ReadPlainOdbc(const std::string& connection) {
  SQLHENV env = SQL_NULL_HENV;
  SQLHDBC dbc = SQL_NULL_HDBC;
  SQLHSTMT stmt = SQL_NULL_HSTMT;
  Check(SQL_SUCCEEDED(SQLAllocHandle(SQL_HANDLE_ENV, SQL_NULL_HANDLE, &env)), "env");
  SQLSetEnvAttr(env, SQL_ATTR_ODBC_VERSION, reinterpret_cast<SQLPOINTER>(SQL_OV_ODBC3), 0);
  Check(SQL_SUCCEEDED(SQLAllocHandle(SQL_HANDLE_DBC, env, &dbc)), "dbc");
  Check(SQL_SUCCEEDED(SQLDriverConnect(
            dbc, nullptr, reinterpret_cast<SQLCHAR*>(const_cast<char*>(connection.c_str())),
            SQL_NTS, nullptr, 0, nullptr, SQL_DRIVER_NOPROMPT)),
        "connect");
  Check(SQL_SUCCEEDED(SQLAllocHandle(SQL_HANDLE_STMT, dbc, &stmt)), "stmt");
  Check(
      SQL_SUCCEEDED(SQLExecDirect(
          stmt, reinterpret_cast<SQLCHAR*>(const_cast<char*>("SELECT id, txt FROM big")), SQL_NTS)),
      "execute");
  Tally tally;
  char buffer[1024];
  SQLRETURN rc;
  while (SQL_SUCCEEDED(rc = SQLFetch(stmt))) {
    SQLINTEGER key = 0;
    SQLLEN key_indicator = 0;
    SQLLEN text_indicator = 0;
    Check(SQL_SUCCEEDED(SQLGetData(stmt, 1, SQL_C_SLONG, &key, 0, &key_indicator)), "key");
    Check(SQL_SUCCEEDED(SQLGetData(stmt, 2, SQL_C_CHAR, buffer, sizeof buffer, &text_indicator)),
          "text");
    const std::size_t length =
        text_indicator < 0 ? 0 : std::min<std::size_t>(text_indicator, sizeof buffer - 1);
    tally.Add(key, buffer, length);
  }
  Check(rc == SQL_NO_DATA, "fetch");
  SQLFreeHandle(SQL_HANDLE_STMT, stmt);
  SQLDisconnect(dbc);
  SQLFreeHandle(SQL_HANDLE_DBC, dbc);
  SQLFreeHandle(SQL_HANDLE_ENV, env);
  return tally;
}

// The engine's reader as index building uses it: cache the row, take the
// key as an integer and the text as narrow text from the cache.
Tally ReadEngine(const std::string& connection) {
  qm::CGlobalDefs defs;
  defs.SetConnectionString(connection, "bench");
  qm::CShareDatabase db(defs);
  db.Connect();
  int16_t columns = 0;
  db.ExecuteSql("SELECT id, txt FROM big", columns);
  db.AllocateCache();
  Tally tally;
  qm::CValue key;
  qm::CValue text;
  do {
    db.CacheColumns();
    db.GetColumnValueFromCache(1, qm::VALUE_TYPE::Integer, key);
    db.GetColumnValueFromCache(2, qm::VALUE_TYPE::AsciiString, text);
    tally.Add(key.GetInteger(), text.Narrow().data(), text.Narrow().size());
    db.CleanCacheColumns();
  } while (db.MoveNext() == qm::CShareDatabase::kRowFetched);
  db.Disconnect();
  return tally;
}

struct Reader {
  std::string key;
  const char* name;
  std::function<Tally()> read;
  std::vector<double> seconds;      // wall time
  std::vector<double> cpu_seconds;  // processor time of this process
  Tally tally;
};

double Median(std::vector<double> v) {
  std::sort(v.begin(), v.end());
  return v[v.size() / 2];
}

int Run(int rows, int runs, fs::path folder, const std::string& only) {
  fs::create_directories(folder);
  struct RemoveFolder {
    fs::path path;
    ~RemoveFolder() {
      std::error_code ec;
      fs::remove_all(path, ec);
    }
  } remove_folder{folder};
  const std::string path = (folder / "bench.db").string();
  const std::string connection = "Driver=SQLite3;Database=" + path + ";StepAPI=1;NoCreat=1";

  auto start = std::chrono::steady_clock::now();
  Generate(path, rows);
  std::printf("generated %d rows of (integer, %zu bytes of text) in %.2f s: %s (%.0f MB)\n", rows,
              kTextBytes,
              std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count(),
              path.c_str(), static_cast<double>(fs::file_size(path)) / 1e6);

  std::vector<Reader> readers = {
      {"native", "native SQLite library", [&] { return ReadNative(path); }, {}, {}, {}},
      {"plain", "plain ODBC loop", [&] { return ReadPlainOdbc(connection); }, {}, {}, {}},
      {"engine", "CShareDatabase + cache", [&] { return ReadEngine(connection); }, {}, {}, {}},
  };
  if (!only.empty()) {
    // One reader alone, for a profiler.
    std::erase_if(readers, [&](const Reader& r) { return r.key != only; });
    if (readers.empty()) throw std::runtime_error("no reader named " + only);
  }
  for (int run = 0; run < runs; ++run) {
    for (auto& r : readers) {
      start = std::chrono::steady_clock::now();
      const std::clock_t cpu_start = std::clock();
      const Tally t = r.read();
      r.cpu_seconds.push_back(static_cast<double>(std::clock() - cpu_start) / CLOCKS_PER_SEC);
      r.seconds.push_back(
          std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count());
      if (run > 0 && !(t == r.tally)) throw std::runtime_error(std::string(r.name) + " changed");
      r.tally = t;
    }
  }
  std::printf("\n%-24s %10s %12s %10s %12s\n", "reader", "wall s", "rows/s", "cpu s", "rows/cpu s");
  for (const auto& r : readers) {
    const double wall = Median(r.seconds);
    const double cpu = Median(r.cpu_seconds);
    std::printf("%-24s %10.3f %12.0f %10.3f %12.0f\n", r.name, wall,
                static_cast<double>(rows) / wall, cpu, static_cast<double>(rows) / cpu);
  }
  if (readers.size() < 3) return 0;
  for (const auto& r : readers) {
    if (r.tally.rows != static_cast<uint64_t>(rows) || !(r.tally == readers[0].tally)) {
      std::printf("\n%s read other data (%llu rows)\n", r.name,
                  static_cast<unsigned long long>(r.tally.rows));
      return 2;
    }
  }
  auto best = [](const std::vector<double>& v) { return *std::min_element(v.begin(), v.end()); };
  const Reader& native = readers[0];
  const Reader& plain = readers[1];
  const Reader& engine = readers[2];
  const double ratio = best(engine.cpu_seconds) / best(plain.cpu_seconds);
  std::printf(
      "\nengine / plain ODBC: %.3f best processor time (%.3f median processor, %.3f median "
      "wall); allowed %.1f: %s\n",
      ratio, Median(engine.cpu_seconds) / Median(plain.cpu_seconds),
      Median(engine.seconds) / Median(plain.seconds), kAllowedRatio,
      ratio <= kAllowedRatio ? "within" : "TOO SLOW");
  std::printf("plain ODBC / native: %.3f best processor time (%.3f median wall)\n",
              best(plain.cpu_seconds) / best(native.cpu_seconds),
              Median(plain.seconds) / Median(native.seconds));
  return ratio <= kAllowedRatio ? 0 : 1;
}

}  // namespace

int main(int argc, char** argv) {
  int rows = 1000000;
  int runs = 3;
  std::string only;
  fs::path folder =
      fs::temp_directory_path() / ("qm_odbc_bench_" + std::to_string(std::random_device{}()));
  for (int i = 1; i + 1 < argc; i += 2) {
    const std::string option = argv[i];
    if (option == "--rows") {
      rows = std::max(1, std::atoi(argv[i + 1]));
    } else if (option == "--runs") {
      runs = std::max(1, std::atoi(argv[i + 1]));
    } else if (option == "--only") {
      only = argv[i + 1];
    } else if (option == "--dir") {
      folder = fs::path(argv[i + 1]) / ("qm_odbc_bench_" + std::to_string(std::random_device{}()));
    } else {
      std::fprintf(stderr,
                   "usage: %s [--rows N] [--runs R] [--dir FOLDER] [--only native|plain|engine]\n",
                   argv[0]);
      return 2;
    }
  }
  try {
    return Run(rows, runs, folder, only);
  } catch (qm::CExceptionBase& e) {
    std::fprintf(stderr, "engine error: %s\n", e.GetFullTextUtf8(100).c_str());
  } catch (const std::exception& e) {
    std::fprintf(stderr, "error: %s\n", e.what());
  }
  return 2;
}
