// A configured home and data directory with the PUBLIC group laid out, an
// APICommand on it, an SQLite database in the group's DataStore folder, and
// helpers to pass texts and read back errors and trace lines.
#pragma once

#include <gtest/gtest.h>

#include <deque>
#include <filesystem>
#include <string>
#include <string_view>
#include <vector>

#include "base/error_messages.h"
#include "platform/text_encoding.h"
#include "quillmere/api_command.h"
#include "config/global_defs.h"
#include "sources/share_database.h"
#include "support/test_support.h"

namespace qm::test {

class CommandFixture : public ::testing::Test {
 protected:
  static constexpr const char* kGroupFolders[] = {"Indexes",  "Orders",    "Config",
                                                  "WorkData", "DataStore", "Definitions"};

  void SetUp() override {
    LayOutGroup("PUBLIC");
    // Level 1 so the engine's own trace lines can be checked.
    WriteFile(home_.Home() + "Log/traceStat.log", "TRACE LEVEL 1\r\n");
    command_ = std::make_unique<APICommand>();
    ASSERT_EQ(command_->SetDataPath(T(Utf8ToUtf16(home_.Data()))), S_OK);
  }

  void TearDown() override { command_.reset(); }

  // The shipped language data in the data directory (what searches and
  // builds with language steps read).
  void UseShippedLanguages() {
    std::filesystem::copy(std::string(QM_SOURCE_DATA_DIR) + "Language", home_.Data() + "Language",
                          std::filesystem::copy_options::recursive);
  }
  // The shipped table of numbered error messages.
  static void UseShippedMessages() {
    ASSERT_TRUE(LoadErrorMessagesFromFile(std::string(QM_SOURCE_DATA_DIR) + "System/mrvconf.ini"));
  }

  void LayOutGroup(const std::string& group) {
    for (const char* folder : kGroupFolders) {
      std::filesystem::create_directories(GroupFolder(group) + folder);
    }
  }

  std::string GroupFolder(const std::string& group = "PUBLIC") const {
    return home_.Data() + "Groups/" + group + "/";
  }
  std::string IndexFolder() const { return GroupFolder() + "Indexes/"; }
  std::string ConfigFolder() const { return GroupFolder() + "Config/"; }

  // A text argument that stays valid for the test.
  const BSTR* T(std::u16string_view text) {
    texts_.emplace_back(text);
    return &texts_.back();
  }
  const BSTR* T(std::string_view utf8) { return T(std::u16string_view(Utf8ToUtf16(utf8))); }
  const BSTR* T(const char* utf8) { return T(std::string_view(utf8)); }

  // The calling thread's error information left by the last failing call, as
  // UTF-8 with "\r\n" between the messages ("" when there is none).
  static std::string LastError() {
    ErrorInfo info;
    if (!GetErrorInfo(info)) return {};
    return Utf16ToUtf8(info.Description);
  }

  // Runs a statement blocking; returns "" on success, else the error text.
  std::string Run(std::string_view statement) {
    const HRESULT hr = command_->ExecuteEx(T(statement), VARIANT_TRUE);
    if (hr == S_OK) return {};
    EXPECT_EQ(hr, DISP_E_EXCEPTION);
    return LastError();
  }

  std::string ErrorMsg() {
    BSTR text;
    EXPECT_EQ(command_->GetErrorMsg(&text), S_OK);
    return Utf16ToUtf8(text);
  }
  int32_t ErrorNumber() {
    int32_t n = -7;
    EXPECT_EQ(command_->GetErrorNumber(&n), S_OK);
    return n;
  }
  int32_t Progress() {
    int32_t n = -7;
    EXPECT_EQ(command_->GetProgress(&n), S_OK);
    return n;
  }

  // The SQLite database of the tests, in the group's DataStore folder.
  std::string DatabaseFile() const { return GroupFolder() + "DataStore/test.db"; }
  std::string SqliteConnection() const {
    return "Driver=SQLite3;Database=" + DatabaseFile() + ";StepAPI=1;";
  }
  void UseSqlite() {
    ASSERT_EQ(command_->SetDBConnectionStringEx(T(SqliteConnection()), T("test")), S_OK)
        << LastError();
  }
  // Runs SQL statements on the test database directly.
  void Sql(const std::vector<std::string>& statements) {
    CGlobalDefs defs;
    defs.SetDataPath(home_.Data());
    defs.SetConnectionString(SqliteConnection(), "test");
    CShareDatabase database(defs);
    database.Connect();
    for (const auto& statement : statements) {
      int16_t columns = 0;
      database.ExecuteSql(statement, columns);
    }
    database.Disconnect();
  }

  // Settings on the test's data directory and the PUBLIC group.
  CGlobalDefs Defs() const {
    CGlobalDefs defs;
    defs.SetDataPath(home_.Data());
    return defs;
  }

  // Every trace line written so far, all modules.
  std::string TraceText() const {
    std::string all;
    for (const auto& entry : std::filesystem::directory_iterator(home_.Home() + "Log/")) {
      if (entry.path().filename() != "traceStat.log") all += ReadFile(entry.path().string());
    }
    return all;
  }

  ConfiguredHome home_;
  std::unique_ptr<APICommand> command_;
  std::deque<BSTR> texts_;
};

}  // namespace qm::test
