// The host's engine commands (exec, info, options, exists, drop), run as a user
// runs them: exit statuses, standard output and standard error, and settings
// that last from one invocation to the next.
#include <gtest/gtest.h>
#include <stdlib.h>

#include <algorithm>
#include <filesystem>
#include <string>
#include <vector>

#include "config/global_defs.h"
#include "sources/share_database.h"
#include "support/test_support.h"

namespace qm {
namespace {

namespace fs = std::filesystem;

struct Result {
  int status = -1;
  std::string out;
  std::string err;
};

class EngineCommandsTest : public ::testing::Test {
 protected:
  void SetUp() override {
    for (const char* folder : {"Indexes", "Orders", "Config", "WorkData", "DataStore"}) {
      fs::create_directories(dir_.Path() + "data/Groups/PUBLIC/" + folder);
    }
  }

  Result Host(const std::vector<std::string>& args) {
    Result r;
    const std::string err_file = dir_.Path() + "stderr.txt";
    std::vector<std::string> argv{"/bin/sh", "-c", "e=$1; shift; exec \"$@\" 2> \"$e\"", "sh",
                                  err_file, QM_CLI_PATH, "--data", dir_.Path() + "data"};
    argv.insert(argv.end(), args.begin(), args.end());
    r.status = test::RunProgram(argv, &r.out);
    r.err = test::ReadFile(err_file);
    return r;
  }

  // Runs SQL on books.db of the scratch folder; returns its connection string.
  std::string Books(const std::vector<std::string>& statements) {
    const std::string connect = "Driver=SQLite3;Database=" + dir_.Path() + "books.db;StepAPI=1;";
    CGlobalDefs defs;
    defs.SetConnectionString(connect, "books");
    CShareDatabase db(defs);
    db.Connect();
    int16_t columns = 0;
    for (const auto& statement : statements) db.ExecuteSql(statement, columns);
    db.Disconnect();
    return connect;
  }

  test::ScratchDir dir_{"host"};
};

TEST_F(EngineCommandsTest, OptionsLastFromOneInvocationToTheNext) {
  Result r = Host({"options", "get", "index-language"});
  ASSERT_EQ(r.status, 0) << r.err;
  EXPECT_EQ(r.out,
            "iloLanguage\t2\niloUseStemming\t0\niloUsePhonetic\t0\niloRemoveAccent\t1\n"
            "iloUseCharacterTranslation\t0\niloUseStopWords\t1\n");

  r = Host({"options", "set", "index-general", "igoSupportScore=1", "igoSeparators=;<SPACE>-",
            "igoIndexMaxSize=3"});
  ASSERT_EQ(r.status, 0) << r.err;
  EXPECT_EQ(r.out,
            "igoIndexMaxSize\t3\nigoIndexStartValue\t0\nigoSeparators\t;<SPACE>-\n"
            "igoSupportScore\t1\nigoSupportPhrases\t1\nigoUseDefaultSeparators\t1\n"
            "igoSaveDatabaseConnection\t1\nigoRemoveHtml\t0\nigoUseUnicode\t0\n");

  r = Host({"options", "get", "index-general"});
  ASSERT_EQ(r.status, 0) << r.err;
  EXPECT_NE(r.out.find("igoSeparators\t;<SPACE>-\n"), std::string::npos) << r.out;
  EXPECT_NE(r.out.find("igoSupportScore\t1\n"), std::string::npos) << r.out;
}

TEST_F(EngineCommandsTest, UsageErrorsExitTwo) {
  for (const std::vector<std::string>& args :
       {std::vector<std::string>{"options", "get", "index-colour"},
        {"options", "set", "index-general", "igoSupportScore=yes"},
        {"exec", "--fast", "DROP FINDEX x"},
        {"drop", "findex"}}) {
    const Result r = Host(args);
    EXPECT_EQ(r.status, 2) << args[0] << " " << r.err;
    EXPECT_NE(r.err.find("usage: quillmere"), std::string::npos) << r.err;
    EXPECT_EQ(r.out, "");
  }
  const Result help = Host({"exec", "--help"});
  EXPECT_EQ(help.status, 0);
  EXPECT_NE(help.out.find("--background"), std::string::npos);
}

TEST_F(EngineCommandsTest, EngineErrorsGoToStandardErrorAndExitOne) {
  Result r = Host({"exec", "DROP THING x"});
  EXPECT_EQ(r.status, 1);
  EXPECT_EQ(r.err,
            "quillmere exec: Command not recognised (Module:PiStartPoint,Method:ExecuteW)\n");



  // A group whose folder is missing is the engine's error, at the first use.
  r = Host({"--group", "Nowhere", "exec", "SET GROUP Nowhere"});
  EXPECT_EQ(r.status, 1);
  EXPECT_NE(r.err.find("group folder does not exist"), std::string::npos) << r.err;
}

TEST_F(EngineCommandsTest, ExecBuildsUpdatesAndDropsAFindexThatInfoAndExistsSee) {
  ASSERT_EQ(Host({"init"}).status, 0);  // the language data the build needs
  const std::string connect = Books({"create table books (id integer, title varchar(50))",
                                     "insert into books values (1, 'River fish'), (2, 'Mountain')"});
  Result r = Host({"--connect", connect, "exec", "--background",
                   "CREATE FINDEX Books ON TABLE books COLUMNS title KEY id"});
  ASSERT_EQ(r.status, 0) << r.err;
  EXPECT_EQ(r.out.substr(r.out.size() - 5), "100%\n") << r.out;

  r = Host({"info", "findex", "Books"});
  ASSERT_EQ(r.status, 0) << r.err;
  for (const char* line : {"idxTableName\tbooks\n", "idxTypeName\tText (Ansi)\n", "idxWordCount\t3\n",
                           "idxKeyCount\t2\n"}) {
    EXPECT_NE(r.out.find(line), std::string::npos) << line << r.out;
  }
  EXPECT_EQ(std::count(r.out.begin(), r.out.end(), '\n'), 18);
  EXPECT_EQ(Host({"exists", "books"}).out, "yes\n");

  // An update runs through exec like any statement.
  Books({"insert into books values (3, 'Quiet lake')"});
  ASSERT_EQ(Host({"--connect", connect, "exec", "UPDATE", "FINDEX", "Books"}).status, 0);
  EXPECT_NE(Host({"info", "findex", "Books"}).out.find("idxKeyCount\t3\n"), std::string::npos);
  EXPECT_EQ(Host({"drop", "findex", "Books"}).status, 0);
  EXPECT_EQ(Host({"exists", "Books"}).out, "no\n");
}

TEST_F(EngineCommandsTest, ExecCountsTheTextValuesCutAtTheLimit) {
  std::string body;
  while (body.size() < 1100000) body += "long text ";
  const std::string connect =
      Books({"create table books (id integer, body text)",
             "insert into books values (1, 'short'), (2, '" + body + "'), (3, '" + body + "')"});
  ASSERT_EQ(Host({"init"}).status, 0);  // the language data the build needs
  setenv("MORVIL_MAX_COLUMN_TEXT_MB", "1", 1);
  const Result cut = Host({"--connect", connect, "exec",
                           "CREATE FINDEX Books ON TABLE books COLUMNS body KEY id"});
  unsetenv("MORVIL_MAX_COLUMN_TEXT_MB");
  ASSERT_EQ(cut.status, 0) << cut.err;
  EXPECT_EQ(cut.out, "2 text value(s) longer than max_column_text_mb were cut there (see the trace)\n");
  const Result whole = Host({"--connect", connect, "exec",
                             "CREATE FINDEX Books ON TABLE books COLUMNS body KEY id"});
  ASSERT_EQ(whole.status, 0) << whole.err;
  EXPECT_EQ(whole.out, "");
}

TEST_F(EngineCommandsTest, BackgroundExecPrintsProgressThenTheJobsError) {
  // Standard output is not a terminal here: one line per percentage shown.
  Result r = Host({"exec", "--background", "UPDATE FINDEX Books"});
  EXPECT_EQ(r.status, 1);
  ASSERT_GE(r.out.size(), 5u) << r.out;
  EXPECT_EQ(r.out.substr(r.out.size() - 5), "100%\n") << r.out;
  EXPECT_EQ(r.out.find('\r'), std::string::npos);
  EXPECT_EQ(r.err.rfind("quillmere exec: ", 0), 0u) << r.err;

}

}  // namespace
}  // namespace qm
