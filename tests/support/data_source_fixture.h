// Tests through the command object on real data sources: SQLite always,
// PostgreSQL through the ANSI and the Unicode driver when the test services
// run (QM_TEST_PG_ANSI, QM_TEST_PG_UNICODE). Each test makes its own tables.
#pragma once

#include <gtest/gtest.h>
#include <unistd.h>

#include <chrono>
#include <filesystem>
#include <string>
#include <thread>
#include <vector>

#include "api/command_fixture.h"
#include "support/test_sources.h"

namespace qm::test {

// Waits until the command object's background job has ended.
inline void WaitForJob(APICommand& command) {
  int32_t progress = -1;
  for (int i = 0; i < 60000 && command.GetProgress(&progress) == S_OK && progress != 100; ++i) {
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
  ASSERT_EQ(progress, 100) << "the background job did not end";
}

class DataSourceTest : public CommandFixture, public ::testing::WithParamInterface<Source> {
 protected:
  void SetUp() override {
    CommandFixture::SetUp();
    // The language data of the data directory, as quillmere init lays it out.
    std::filesystem::copy(std::string(QM_SOURCE_DATA_DIR) + "Language", home_.Data() + "Language",
                          std::filesystem::copy_options::recursive);
    if (GetParam() == Source::SQLite) {
      connection_ = SqliteConnection();
    } else {
      connection_ = PostgresConnection(GetParam());
      if (connection_.empty()) {
        GTEST_SKIP() << PostgresVariable(GetParam()) << " is not set: scripts/test starts PostgreSQL";
      }
    }
    ASSERT_EQ(command_->SetDBConnectionStringEx(T(connection_), T("Books Source")), S_OK)
        << LastError();
    // Table names of their own: PostgreSQL is shared by the test processes.
    prefix_ = "e2e_" + std::to_string(getpid()) + "_";
  }

  void TearDown() override {
    if (!connection_.empty()) {
      for (const std::string& table : tables_) OnSource({"drop table " + table});
    }
    CommandFixture::TearDown();
  }

  // Runs statements on the test's data source.
  void OnSource(const std::vector<std::string>& statements) {
    CGlobalDefs defs = Defs();
    defs.SetConnectionString(connection_, "test");
    CShareDatabase database(defs);
    database.Connect();
    for (const auto& statement : statements) {
      int16_t columns = 0;
      database.ExecuteSql(statement, columns);
    }
    database.Disconnect();
  }

  // A table of this test, created with columns and filled with rows.
  std::string Table(const std::string& stem, const std::string& columns,
                    const std::vector<std::string>& rows = {}) {
    const std::string name = prefix_ + stem;
    std::vector<std::string> statements{"create table " + name + " (" + columns + ")"};
    for (const std::string& row : rows) {
      statements.push_back("insert into " + name + " values (" + row + ")");
    }
    OnSource(statements);
    tables_.push_back(name);
    return name;
  }

  // Inserts rows (each "value, value, ...") in batches.
  void Insert(const std::string& table, const std::vector<std::string>& rows) {
    std::vector<std::string> statements;
    std::string values;
    for (std::size_t i = 0; i < rows.size(); ++i) {
      values += (values.empty() ? "(" : ",(") + rows[i] + ")";
      if ((i + 1) % 200 == 0 || i + 1 == rows.size()) {
        statements.push_back("insert into " + table + " values " + values);
        values.clear();
      }
    }
    OnSource(statements);
  }

  // Rows id, "w<id>a w<id>b w<id>c": three distinct words each.
  static std::vector<std::string> WordRows(int32_t from, int32_t to) {
    std::vector<std::string> rows;
    for (int32_t id = from; id <= to; ++id) {
      const std::string w = (id < 0 ? "wm" : "w") + std::to_string(id < 0 ? -id : id);
      rows.push_back(std::to_string(id) + ", '" + w + "a " + w + "b " + w + "c'");
    }
    return rows;
  }

  std::string Info(const std::string& findex, int32_t value) {
    EXPECT_EQ(command_->SetCurrentObjectName(T(findex)), S_OK);
    BSTR text = u"untouched";
    EXPECT_EQ(command_->GetFindexInfo(value, &text), S_OK) << LastError();
    return Utf16ToUtf8(text);
  }

  std::string connection_;
  std::string prefix_;
  std::vector<std::string> tables_;
};

}  // namespace qm::test
