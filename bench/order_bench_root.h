// What the order benchmarks build on: a temporary data root with the PUBLIC
// group's folders, removed at the end, and in it the SQLite rows database
// rows.db with the table t (id, n, r, d, label) that each benchmark fills with
// rows of its own making.
#pragma once

#include <sqlite3.h>
#include <stdlib.h>

#include <cstdint>
#include <filesystem>
#include <functional>
#include <stdexcept>
#include <string>
#include <system_error>

namespace qm::bench {

inline void Check(int rc, sqlite3* db, const char* what) {
  if (rc != SQLITE_OK && rc != SQLITE_DONE && rc != SQLITE_ROW) {
    throw std::runtime_error(std::string(what) + ": " + sqlite3_errmsg(db));
  }
}

class OrderBenchRoot {
 public:
  explicit OrderBenchRoot(const std::string& name) {
    std::string pattern = "/tmp/qm-" + name + ".XXXXXX";
    if (mkdtemp(pattern.data()) == nullptr) {
      throw std::runtime_error("cannot make a temporary folder");
    }
    path_ = pattern + "/";
    for (const char* sub :
         {"Groups/PUBLIC/Config", "Groups/PUBLIC/WorkData", "Groups/PUBLIC/Orders"}) {
      std::filesystem::create_directories(path_ + sub);
    }
  }
  ~OrderBenchRoot() {
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
  }
  OrderBenchRoot(const OrderBenchRoot&) = delete;
  OrderBenchRoot& operator=(const OrderBenchRoot&) = delete;

  const std::string& Path() const { return path_; }
  std::string Database() const { return path_ + "rows.db"; }

  // Inserts the rows with keys first .. first + count - 1 in one transaction;
  // bind(insert, key) binds the row's columns 2 to 5 (n, r, d, label).
  void InsertRows(int64_t first, int64_t count,
                  const std::function<void(sqlite3_stmt*, int64_t)>& bind) const {
    sqlite3* db = nullptr;
    Check(sqlite3_open(Database().c_str(), &db), db, "open");
    Check(sqlite3_exec(db,
                       "CREATE TABLE IF NOT EXISTS t (id INTEGER PRIMARY KEY, n INTEGER, r REAL, "
                       "d TIMESTAMP, label TEXT); BEGIN;",
                       nullptr, nullptr, nullptr),
          db, "create");
    sqlite3_stmt* insert = nullptr;
    Check(sqlite3_prepare_v2(db, "INSERT INTO t VALUES (?, ?, ?, ?, ?)", -1, &insert, nullptr), db,
          "prepare");
    for (int64_t key = first; key < first + count; ++key) {
      sqlite3_bind_int64(insert, 1, key);
      bind(insert, key);
      Check(sqlite3_step(insert), db, "insert");
      sqlite3_reset(insert);
    }
    sqlite3_finalize(insert);
    Check(sqlite3_exec(db, "COMMIT;", nullptr, nullptr, nullptr), db, "commit");
    sqlite3_close(db);
  }

 private:
  std::string path_;
};

}  // namespace qm::bench
