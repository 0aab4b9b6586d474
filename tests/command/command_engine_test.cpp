// The command engine through the command object: background jobs and their
// progress and errors, the group and data path rules, connections,
// pass-through SQL, and names that must never reach a file path.
#include <gtest/gtest.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <thread>

#include "support/data_source_fixture.h"
#include "command/command_locks.h"
#include "command/command_type.h"
#include "locks/lock_manager.h"

namespace qm {
namespace {

namespace fs = std::filesystem;
using test::CommandFixture;

class CommandEngineTest : public CommandFixture {
 protected:
  static bool Contains(const std::string& text, std::string_view part) {
    return text.find(part) != std::string::npos;
  }
};

TEST_F(CommandEngineTest, BackgroundJobIsVisibleBeforeExecuteReturnsAndReportsOnce) {
  EXPECT_EQ(Progress(), 100) << "no job yet";

  // Hold the findex's CREATE lock so the job waits where the test can see it.
  CLockManager create_lock(home_.Data(), CommandLockName(kCmdFindexStored, "BOOKS"));
  create_lock.LockWriter();
  ASSERT_EQ(command_->ExecuteEx(T("UPDATE FINDEX Books"), 0), S_OK);
  EXPECT_EQ(Progress(), 0);
  EXPECT_EQ(ErrorNumber(), 0);
  create_lock.UnlockWriter();
  test::WaitForJob(*command_);

  // The findex does not exist: the job failed and says why, once.
  EXPECT_EQ(ErrorNumber(), 1);
  const std::string message = ErrorMsg();
  EXPECT_FALSE(message.empty());
  EXPECT_EQ(ErrorMsg(), "");
  EXPECT_EQ(ErrorNumber(), 1) << "reading the message leaves the flag";

  // A job that succeeds sets the flag back (SET GROUP on the job's own copy).
  ASSERT_EQ(command_->ExecuteEx(T("SET GROUP PUBLIC"), 0), S_OK);
  test::WaitForJob(*command_);
  EXPECT_EQ(ErrorNumber(), 0);
  EXPECT_EQ(ErrorMsg(), "");
}

TEST_F(CommandEngineTest, AnEndingJobLeavesTheProgressOfALaterOne) {
  CLockManager first(home_.Data(), CommandLockName(kCmdFindexStored, "FIRST"));
  CLockManager second(home_.Data(), CommandLockName(kCmdFindexStored, "SECOND"));
  first.LockWriter();
  second.LockWriter();
  ASSERT_EQ(command_->Execute(T("UPDATE FINDEX First")), S_OK);
  ASSERT_EQ(command_->Execute(T("UPDATE FINDEX Second")), S_OK);
  first.UnlockWriter();
  // The first job fails (no such findex); the second still runs and is shown.
  for (int i = 0; i < 60000 && ErrorNumber() == 0; ++i) {
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
  ASSERT_EQ(ErrorNumber(), 1);
  for (int i = 0; i < 50; ++i) {
    ASSERT_EQ(Progress(), 0);
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
  second.UnlockWriter();
  test::WaitForJob(*command_);
}

TEST_F(CommandEngineTest, BackgroundTranslationErrorsAndConcurrentJobs) {
  ASSERT_EQ(command_->Execute(T("CREATE FINDEX Books ON TABLE t COLUMNS a KEY")), S_OK);
  test::WaitForJob(*command_);
  EXPECT_EQ(ErrorNumber(), 1);
  EXPECT_TRUE(Contains(ErrorMsg(), "a word is missing")) << "error 13 of the translator";

  // Several jobs at once: each ends, and the object's destruction waits for
  // every one of them.
  for (int i = 0; i < 6; ++i) {
    ASSERT_EQ(command_->Execute(T(i % 2 ? "SET GROUP PUBLIC" : "DROP THING x")), S_OK);
  }
  command_.reset();
  command_ = std::make_unique<APICommand>();
  EXPECT_EQ(Progress(), 100);
}

TEST_F(CommandEngineTest, GroupAndDataPathRules) {
  const std::string missing_path = home_.Data() + "no/such/folder";
  EXPECT_EQ(command_->SetDataPath(T(missing_path)), DISP_E_EXCEPTION);
  EXPECT_EQ(LastError(), "Data path does not exist: " + missing_path +
                             " (Module:PiStartPoint,Method:SetDataPath)\r\n");

  // FindexExist sets the group: option files now go to its Config folder.
  LayOutGroup("OTHER");
  VARIANT_BOOL exists = 3;
  ASSERT_EQ(command_->FindexExist(T("Books"), T("Other"), &exists), S_OK);
  EXPECT_EQ(exists, VARIANT_FALSE);
  ASSERT_EQ(command_->SaveDefaultOrderOptions(), S_OK);
  EXPECT_TRUE(fs::exists(GroupFolder("OTHER") + "Config/ogo.dat"));
  EXPECT_FALSE(fs::exists(ConfigFolder() + "ogo.dat"));

  // A background SET GROUP changes only the job's copy: the engine keeps a
  // valid data path, and an update gets as far as looking for the findex.
  ASSERT_EQ(command_->Execute(T("SET GROUP Nowhere")), S_OK);
  test::WaitForJob(*command_);
  EXPECT_EQ(ErrorNumber(), 1);
  std::string text = Run("UPDATE FINDEX Books");
  EXPECT_FALSE(Contains(text, "group folder does not exist")) << text;
  EXPECT_FALSE(text.empty());

  // A blocking one to a missing group clears the data path for good: even a
  // group that exists does not bring it back.
  text = Run("SET GROUP Nowhere");
  EXPECT_TRUE(Contains(text, "group folder does not exist")) << text;
  LayOutGroup("LATER");
  EXPECT_EQ(Run("SET GROUP Later"), "");
  text = Run("CREATE FINDEX Books ON TABLE t COLUMNS a KEY id");
  EXPECT_TRUE(Contains(text, "group folder does not exist")) << text;
}

TEST_F(CommandEngineTest, ConnectionsAreTestedWhenSet) {
  const std::string bad_dsn = Run("CONNECT NoSuchDsn someone secret");
  EXPECT_TRUE(Contains(bad_dsn, "Could not connect to the database with the given connection"))
      << bad_dsn;
  EXPECT_EQ(Run("SET CONNECTIONSTRING \"" + SqliteConnection() + "\""), "");

  EXPECT_EQ(command_->ConnectToDatabase(T("NoSuchDsn"), T("u"), T("p")), DISP_E_EXCEPTION);
  EXPECT_TRUE(Contains(LastError(), "Check the DSN, user name and password")) << LastError();
  VARIANT_BOOL works = 5;
  ASSERT_EQ(command_->TestDBConnection(&works), S_OK);
  EXPECT_EQ(works, VARIANT_FALSE);
  UseSqlite();
  ASSERT_EQ(command_->TestDBConnection(&works), S_OK);
  EXPECT_EQ(works, VARIANT_TRUE);

  // The password never reaches the trace log.
  EXPECT_TRUE(Contains(TraceText(), "Executing Statement: CONNECT NoSuchDsn someone ****"));
  EXPECT_FALSE(Contains(TraceText(), "secret"));
}

TEST_F(CommandEngineTest, CreateIndexGoesToTheDataSource) {
  for (const char* variable : {"", "QM_TEST_PG_ANSI", "QM_TEST_PG_UNICODE"}) {
    SCOPED_TRACE(variable);
    const char* pg = *variable ? std::getenv(variable) : nullptr;
    if (*variable && (pg == nullptr || *pg == '\0')) GTEST_SKIP() << variable << " is not set";
    const std::string connection = pg ? pg : SqliteConnection();
    const std::string table = "engine_books_" + std::to_string(getpid());
    CGlobalDefs defs;
    defs.SetConnectionString(connection, "test");
    CShareDatabase database(defs);
    database.Connect();
    int16_t columns = 0;
    database.ExecuteSql("create table " + table + " (id integer, title varchar(80))", columns);

    EXPECT_EQ(Run("SET CONNECTIONSTRING \"" + connection + "\""), "");
    const std::string create = "CREATE INDEX " + table + "_title ON " + table + " (title)";
    EXPECT_EQ(Run(create), "");
    // A second index of the same name is the data source's error.
    EXPECT_TRUE(Contains(Run(create), table + "_title"));
    EXPECT_FALSE(Run("CREATE INDEX broken ON no_table (x)").empty());
    database.ExecuteSql("drop table " + table, columns);
    database.Disconnect();
  }
}

TEST_F(CommandEngineTest, NamesThatCouldLeaveTheirFolderAreRefused) {
  // Files that a drop of "../X" would reach from the index folder.
  test::WriteFile(GroupFolder() + "X.sdx", "keep");
  test::WriteFile(GroupFolder() + "X.fst", "keep");
  for (const char* statement :
       {"DROP FINDEX ../X", "UPDATE FINDEX a\\b", "CREATE FINDEX x\x01y ON TABLE t COLUMNS c KEY k",
        "DROP ORDER ../X", "DELETE FROM FINDEX ../X 17", "SET GROUP ../PUBLIC"}) {
    const std::string text = Run(statement);
    EXPECT_TRUE(Contains(text, "name \"")) << statement << ": " << text;
    EXPECT_TRUE(Contains(text, "a name must not")) << statement << ": " << text;
  }
  EXPECT_EQ(command_->DropFindex(T("x\ny")), DISP_E_EXCEPTION);
  VARIANT_BOOL exists = 3;
  EXPECT_EQ(command_->FindexExist(T("X"), T(".."), &exists), DISP_E_EXCEPTION);
  ASSERT_EQ(command_->SetCurrentObjectName(T("../X")), S_OK);
  BSTR text;
  EXPECT_EQ(command_->GetFindexInfo(idxKeyName, &text), DISP_E_EXCEPTION);
  EXPECT_EQ(test::ReadFile(GroupFolder() + "X.sdx"), "keep");
  EXPECT_EQ(test::ReadFile(GroupFolder() + "X.fst"), "keep");

  // Add-on names belong to add-ons; a long name is refused whole.
  EXPECT_TRUE(Contains(Run("CREATE FINDEX Books_add_1 ON TABLE t COLUMNS c KEY k"), "_ADD_"));
  EXPECT_EQ(command_->CreateFindex(T("B_ADD_2"), T("select 1"), T("c"), T("k")), DISP_E_EXCEPTION);
  EXPECT_TRUE(Contains(LastError(), "_ADD_"));
  EXPECT_TRUE(Contains(Run("UPDATE FINDEX " + std::string(200, 'n')), "at most 199 characters"));
  EXPECT_TRUE(fs::is_empty(IndexFolder()));
}

TEST_F(CommandEngineTest, DefinitionsThatDoNotFitTheHeaderAreRefusedBeforeAnyWork) {
  const std::string long_select =
      "select id, t from books where t <> '" + std::string(4100, 'x') + "'";
  EXPECT_EQ(command_->CreateFindex(T("Books"), T(long_select), T("t"), T("id")), DISP_E_EXCEPTION);
  EXPECT_TRUE(Contains(LastError(), "definition is too long")) << LastError();
  // Also through a statement, and for a background job before it starts.
  const std::string text =
      Run("CREATE FINDEX Books ON TABLE " + std::string(4100, 't') + " COLUMNS a KEY id");
  EXPECT_TRUE(Contains(text, "definition is too long")) << text;
  EXPECT_EQ(command_->CreateFindexEx(T("Books"), T(long_select), T("t"), T("id"), 0, nullptr),
            DISP_E_EXCEPTION);
  EXPECT_EQ(Progress(), 100) << "no job was started";
  EXPECT_TRUE(fs::is_empty(IndexFolder()));
}

}  // namespace
}  // namespace qm
