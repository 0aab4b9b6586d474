// The data sources the build tests run on: SQLite through its ODBC driver
// always, the PostgreSQL server of scripts/test through its ANSI and its
// Unicode driver when the test services run (QM_TEST_PG_ANSI,
// QM_TEST_PG_UNICODE). And the fixture of the tests that read rows with the
// engine's settings alone, without the command object.
#pragma once

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <string>
#include <utility>

#include "base/error_messages.h"
#include "support/sorted_file_reader.h"
#include "sources/share_database.h"

namespace qm::test {

enum class Source { SQLite, PostgresAnsi, PostgresUnicode };

inline std::string SourceName(const ::testing::TestParamInfo<Source>& info) {
  switch (info.param) {
    case Source::SQLite: return "SQLite";
    case Source::PostgresAnsi: return "PostgresAnsi";
    default: return "PostgresUnicode";
  }
}

// The environment variable holding a PostgreSQL source's connection string.
inline const char* PostgresVariable(Source source) {
  return source == Source::PostgresAnsi ? "QM_TEST_PG_ANSI" : "QM_TEST_PG_UNICODE";
}

// Empty when the test services do not run.
inline std::string PostgresConnection(Source source) {
  const char* value = std::getenv(PostgresVariable(source));
  return value == nullptr ? std::string() : std::string(value);
}

// A data root whose settings connect to the source, and tables of the test's
// own on it.
class SourceRowsTest : public ::testing::TestWithParam<Source> {
 protected:
  // table_prefix: what the tables of this test program's fixture start with.
  explicit SourceRowsTest(std::string table_prefix) : prefix_(std::move(table_prefix)) {}

  void SetUp() override {
    LoadErrorMessagesFromFile(std::string(QM_SOURCE_DATA_DIR) + "System/mrvconf.ini");
    if (GetParam() == Source::SQLite) {
      home_.Defs().SetConnectionString(
          "Driver=SQLite3;Database=" + home_.Data() + "rows.db;StepAPI=1", "test");
      return;
    }
    const std::string connection = PostgresConnection(GetParam());
    if (connection.empty()) {
      GTEST_SKIP() << PostgresVariable(GetParam())
                   << " is not set: run through scripts/test, which starts PostgreSQL";
    }
    home_.Defs().SetConnectionString(connection, "test");
  }

  // A table name no other test process uses at the same time.
  std::string Table(const char* columns) {
    static int counter = 0;
    const std::string name = prefix_ + std::to_string(getpid()) + "_" + std::to_string(++counter);
    Run("CREATE TABLE " + name + " (" + columns + ")");
    return name;
  }

  void Run(const std::string& sql) {
    CShareDatabase db(home_.Defs());
    db.Connect();
    int16_t n = 0;
    db.ExecuteSql(sql, n);
  }

  SortHome home_;

 private:
  std::string prefix_;
};

}  // namespace qm::test
