// The host's engine commands (exec, info, options, exists, drop), run as a user
// runs them: exit statuses, standard output and standard error, and settings
// that last from one invocation to the next.
#include <gtest/gtest.h>
#include <stdlib.h>

#include <algorithm>
#include <filesystem>
#include <random>
#include <regex>
#include <sstream>
#include <string>
#include <vector>

#include "config/global_defs.h"
#include "sources/share_database.h"
#include "support/host_run.h"
#include "support/test_support.h"

namespace qm {
namespace {

namespace fs = std::filesystem;

using Result = test::HostResult;

class EngineCommandsTest : public ::testing::Test {
 protected:
  void SetUp() override {
    for (const char* folder : {"Indexes", "Orders", "Config", "WorkData", "DataStore"}) {
      fs::create_directories(dir_.Path() + "data/Groups/PUBLIC/" + folder);
    }
  }

  Result Host(const std::vector<std::string>& args) {
    return test::RunHost(dir_.Path(), args);
  }

  // Runs SQL on books.db of the scratch folder; returns its connection string.
  std::string Books(const std::vector<std::string>& statements) {
    return test::SqliteDatabase(dir_.Path() + "books.db", statements);
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
  Result r = Host({"--connect", connect, "exec", "--background", "--quiet",
                   "CREATE FINDEX Books ON TABLE books COLUMNS title KEY id"});
  ASSERT_EQ(r.status, 0) << r.err;
  EXPECT_EQ(r.out, "");

  r = Host({"info", "findex", "Books"});
  ASSERT_EQ(r.status, 0) << r.err;
  for (const char* line : {"idxTableName\tbooks\n", "idxTypeName\tText (Ansi)\n", "idxWordCount\t3\n",
                           "idxKeyCount\t2\n"}) {
    EXPECT_NE(r.out.find(line), std::string::npos) << line << r.out;
  }
  EXPECT_EQ(std::count(r.out.begin(), r.out.end(), '\n'), 18);
  EXPECT_EQ(Host({"exists", "books"}).out, "yes\n");
  EXPECT_EQ(Host({"exists", "books"}).status, 0);

  // An update runs through exec like any statement.
  Books({"insert into books values (3, 'Quiet lake')"});
  ASSERT_EQ(Host({"--connect", connect, "exec", "UPDATE", "FINDEX", "Books"}).status, 0);
  EXPECT_NE(Host({"info", "findex", "Books"}).out.find("idxKeyCount\t3\n"), std::string::npos);
  EXPECT_EQ(Host({"drop", "findex", "Books"}).status, 0);
  r = Host({"exists", "Books"});
  EXPECT_EQ(r.out, "no\n");
  EXPECT_EQ(r.status, 3);  // so that scripts can test it
}

TEST_F(EngineCommandsTest, ExecCountsTheTextValuesCutAtTheLimit) {
  std::string body;
  while (body.size() < 1100000) body += "long text ";
  const std::string connect =
      Books({"create table books (id integer, body text)",
             "insert into books values (1, 'short'), (2, '" + body + "'), (3, '" + body + "')"});
  ASSERT_EQ(Host({"init"}).status, 0);  // the language data the build needs
  setenv("MORVIL_MAX_COLUMN_TEXT_MB", "1", 1);
  // --quiet leaves out the summary line, never the count of cut values.
  const Result cut = Host({"--connect", connect, "exec", "--quiet",
                           "CREATE FINDEX Books ON TABLE books COLUMNS body KEY id"});
  unsetenv("MORVIL_MAX_COLUMN_TEXT_MB");
  ASSERT_EQ(cut.status, 0) << cut.err;
  EXPECT_EQ(cut.out, "2 text value(s) longer than max_column_text_mb were cut there (see the trace)\n");
  const Result whole = Host({"--connect", connect, "exec", "--quiet",
                             "CREATE FINDEX Books ON TABLE books COLUMNS body KEY id"});
  ASSERT_EQ(whole.status, 0) << whole.err;
  EXPECT_EQ(whole.out, "");
}

TEST_F(EngineCommandsTest, BackgroundExecPrintsProgressThenTheJobsError) {
  // Standard output is not a terminal here: one line per percentage shown.
  const std::string connect = Books({"create table books (id integer, title varchar(50))"});
  Result r = Host({"--connect", connect, "exec", "--background",
                   "CREATE FINDEX Books ON TABLE nosuch COLUMNS title KEY id"});
  EXPECT_EQ(r.status, 1);
  ASSERT_GE(r.out.size(), 5u) << r.out;
  EXPECT_EQ(r.out.substr(r.out.size() - 5), "100%\n") << r.out;
  EXPECT_EQ(r.out.find('\r'), std::string::npos);
  EXPECT_EQ(r.err.rfind("quillmere exec: ", 0), 0u) << r.err;
}

TEST_F(EngineCommandsTest, AFindexOrOrderThatIsNotThereIsNamedNotItsFile) {
  const fs::path empty = dir_.Path() + "never-initialised";
  fs::create_directories(empty);
  struct Case {
    std::vector<std::string> args;
    std::string err;
  };
  for (const Case& c : std::vector<Case>{
           {{"info", "findex", "NOPE"}, "quillmere info: no findex NOPE in group PUBLIC\n"},
           {{"drop", "order", "NOPE"}, "quillmere drop: no order NOPE in group PUBLIC\n"},
           {{"options", "get", "index-general", "--stored", "NOPE"},
            "quillmere options: no findex NOPE in group PUBLIC\n"},
           {{"check", "order", "NOPE"}, "quillmere check: no order NOPE in group PUBLIC\n"},
           {{"exec", "UPDATE FINDEX NOPE"}, "quillmere exec: no findex NOPE in group PUBLIC\n"},
           {{"exec", "DELETE FROM FINDEX NOPE 3"}, "quillmere exec: no findex NOPE in group PUBLIC\n"},
           {{"--group", "Other", "info", "findex", "NOPE"},
            "quillmere info: no findex NOPE in group Other\n"},
           {{"--data", empty.string(), "info", "findex", "NOPE"},
            "quillmere info: no findex NOPE in group PUBLIC\n"},
       }) {
    const Result r = Host(c.args);
    EXPECT_EQ(r.status, 1) << c.args[1];
    EXPECT_EQ(r.err, c.err);
  }
}

TEST_F(EngineCommandsTest, OptionValuesNoBuildCanUseAreRefusedAndNothingIsSaved) {
  const std::string long_text(40000, ';');
  struct Case {
    std::string kind, setting, err;
  };
  for (const Case& c : std::vector<Case>{
           {"index-language", "iloLanguage=99", "iloLanguage takes a language from 1 to 12"},
           {"index-language", "iloLanguage=0", "iloLanguage takes a language from 1 to 12"},
           {"index-general", "igoIndexMaxSize=-5", "igoIndexMaxSize takes 0 (no limit)"},
           {"index-general", "igoSeparators=" + long_text,
            "igoSeparators is too long (40000 characters) for the findex header"},
           {"order-general", "ogoIgnoreChars=" + long_text.substr(0, 3000),
            "ogoIgnoreChars is too long (3000 characters) for the order header"},
       }) {
    const Result right = Host({"options", "set", c.kind, c.setting});
    EXPECT_EQ(right.status, 2) << c.setting.substr(0, 20);
    EXPECT_NE(right.err.find(c.err), std::string::npos) << right.err;
    EXPECT_EQ(right.out, "");
  }
  EXPECT_TRUE(fs::is_empty(dir_.Path() + "data/Groups/PUBLIC/Config"));
  // The edges that builds do use are taken.
  EXPECT_EQ(Host({"options", "set", "index-language", "iloLanguage=12"}).status, 0);
  EXPECT_EQ(Host({"options", "set", "index-general", "igoIndexMaxSize=0"}).status, 0);
}

TEST_F(EngineCommandsTest, VersionAndTranslateHelp) {
  Result r = Host({"--version"});
  EXPECT_EQ(r.status, 0);
  EXPECT_EQ(r.out, "quillmere 6.14\nfindex format 614\n");
  r = Host({"translate", "--help"});
  EXPECT_EQ(r.status, 0) << r.err;
  EXPECT_EQ(r.out.rfind("usage: quillmere translate STATEMENT\n", 0), 0u) << r.out;
}

TEST_F(EngineCommandsTest, ListCheckRepairAndTheExecSummaryOnBuiltFindexesAndOrders) {
  ASSERT_EQ(Host({"init"}).status, 0);
  const std::string connect =
      Books({"create table books (id integer, title varchar(50), year integer)",
             "insert into books values (1, 'River fish', 1990), (2, 'Mountain', 1985)"});
  Result r = Host({"--connect", connect, "exec",
                   "CREATE FINDEX Books ON TABLE books COLUMNS title KEY id"});
  ASSERT_EQ(r.status, 0) << r.err;
  EXPECT_TRUE(std::regex_match(
      r.out, std::regex("exec: [0-9]+\\.[0-9][0-9] s, 2 rows read, 3 words written, 2 keys in "
                        "findex BOOKS\n")))
      << r.out;
  r = Host({"--connect", connect, "exec", "CREATE ORDER Titles ON TABLE books COLUMNS title,year KEY id"});
  ASSERT_EQ(r.status, 0) << r.err;
  EXPECT_TRUE(std::regex_match(r.out, std::regex("exec: [0-9.]+ s, 2 keys in order TITLES\n")))
      << r.out;
  // An update of a findex this small rebuilds it whole, from every row.
  r = Host({"--connect", connect, "exec", "UPDATE FINDEX Books"});
  EXPECT_NE(r.out.find(", 2 rows read, 3 words written, 2 keys in findex BOOKS\n"),
            std::string::npos)
      << r.out;

  // Piped, list is tab-separated under a line of column names.
  r = Host({"list"});
  ASSERT_EQ(r.status, 0) << r.err;
  std::vector<std::string> lines;
  for (std::size_t at = 0, end; (end = r.out.find('\n', at)) != std::string::npos; at = end + 1) {
    lines.push_back(r.out.substr(at, end - at));
  }
  ASSERT_EQ(lines.size(), 3u) << r.out;
  EXPECT_EQ(lines[0], "NAME\tKIND\tTYPE\tKEYS\tWORDS\tADD-ONS\tDELETED\tBYTES\tBUILT\tUPDATED");
  EXPECT_EQ(lines[1].rfind("BOOKS\tfindex\tText (Ansi)\t2\t3\t0\t0\t", 0), 0u) << lines[1];
  EXPECT_EQ(lines[2].rfind("TITLES\torder\tText\t2\t-\t-\t-\t", 0), 0u) << lines[2];
  EXPECT_EQ(std::count(lines[1].begin(), lines[1].end(), '\t'), 9);

  for (const char* kind : {"findex", "order"}) {
    r = Host({"check", kind, kind == std::string("findex") ? "Books" : "titles"});
    EXPECT_EQ(r.status, 0) << r.out << r.err;
    EXPECT_NE(r.out.find(" is sound\n"), std::string::npos) << r.out;
  }

  // Damage is reported with its place, exit 3; --repair removes what a killed
  // build left and tells how to rebuild.
  const std::string indexes = dir_.Path() + "data/Groups/PUBLIC/Indexes/";
  fs::resize_file(indexes + "BOOKS.fst", 10);
  test::WriteFile(indexes + "tmpxxxx_5_99.tmp1", "left by a killed build");
  r = Host({"check", "findex", "Books", "--repair"});
  EXPECT_EQ(r.status, 3) << r.err;
  EXPECT_NE(r.out.find("removed " + indexes + "tmpxxxx_5_99.tmp1\n"), std::string::npos) << r.out;
  EXPECT_NE(r.out.find("BOOKS.fst list of BOOKS.sdx block "), std::string::npos) << r.out;
  EXPECT_NE(r.out.find("findex BOOKS is damaged: "), std::string::npos) << r.out;
  EXPECT_NE(r.out.find("quillmere exec \"UPDATE FINDEX BOOKS REBUILD\""), std::string::npos);
  EXPECT_FALSE(fs::exists(indexes + "tmpxxxx_5_99.tmp1"));

  r = Host({"exec", "UPDATE FINDEX Books REBUILD"});
  ASSERT_EQ(r.status, 0) << r.err;
  EXPECT_EQ(Host({"check", "findex", "Books"}).status, 0);
  r = Host({"drop", "findex", "Books"});
  EXPECT_EQ(r.status, 0) << r.err;
  EXPECT_EQ(r.out, "removed " + indexes + "BOOKS.fst\nremoved " + indexes + "BOOKS.sdx\n");
}

// Random bytes in a built findex's word tree or postings leave its header
// whole, so info and exists see nothing; check finds them and names the place.
TEST_F(EngineCommandsTest, CheckFindsRandomBytesInTheWordTreeAndThePostings) {
  ASSERT_EQ(Host({"init"}).status, 0);
  const std::string connect =
      Books({"create table books (id integer, title varchar(50))",
             "insert into books values (1, 'River fish'), (2, 'Mountain'), (3, 'Quiet lake')"});
  ASSERT_EQ(
      Host({"--connect", connect, "exec", "CREATE FINDEX Books ON TABLE books COLUMNS title KEY id"})
          .status,
      0);
  const std::string indexes = dir_.Path() + "data/Groups/PUBLIC/Indexes/";
  struct Case {
    const char* file;
    std::size_t from;  // the first byte overwritten, up to the end of the file
    const char* place;
  };
  // A findex this small has one leaf, block 4; its used count and links
  // (the block's first 6 bytes) stay.
  for (const Case& c : {Case{"BOOKS.sdx", 4 * 4096 + 6, "BOOKS.sdx block 4 (leaf): "},
                        Case{"BOOKS.fst", 0, "BOOKS.fst list of BOOKS.sdx block 4 row 1 at byte 0: "}}) {
    SCOPED_TRACE(c.file);
    const std::string sound = test::ReadFile(indexes + c.file);
    ASSERT_LT(c.from, sound.size());
    std::string bytes = sound;
    std::mt19937 random(5);
    for (std::size_t at = c.from; at < bytes.size(); ++at) bytes[at] = static_cast<char>(random());
    test::WriteFile(indexes + c.file, bytes);
    const Result r = Host({"check", "findex", "Books"});
    EXPECT_EQ(r.status, 3) << r.err;
    EXPECT_NE(r.out.find(c.place), std::string::npos) << r.out;
    EXPECT_NE(r.out.find("findex BOOKS is damaged: "), std::string::npos) << r.out;
    test::WriteFile(indexes + c.file, sound);
    EXPECT_EQ(Host({"check", "findex", "Books"}).status, 0);
  }
}

TEST_F(EngineCommandsTest, ListAndTheSummaryCountAddOnsAndDeletedKeysAndListShowsDamage) {
  ASSERT_EQ(Host({"init"}).status, 0);
  // 700 rows of three words: 2,100 words, enough for updates to go to add-ons.
  std::string rows;
  for (int id = 1; id <= 700; ++id) {
    const std::string w = "w" + std::to_string(id);
    rows += (rows.empty() ? "(" : ",(") + std::to_string(id) + ", '" + w + "a " + w + "b " + w +
            "c')";
  }
  const std::string connect =
      Books({"create table books (id integer, title varchar(50))", "insert into books values " + rows});
  ASSERT_EQ(Host({"--connect", connect, "exec", "CREATE FINDEX Big ON TABLE books COLUMNS title KEY id"})
                .status,
            0);
  Books({"insert into books values (701, 'late one'), (702, 'late two')"});
  Result r = Host({"--connect", connect, "exec", "UPDATE FINDEX Big"});
  ASSERT_EQ(r.status, 0) << r.err;
  // The summary counts what this build wrote (the add-on) and what the findex holds.
  EXPECT_NE(r.out.find(", 2 rows read, 4 words written, 702 keys in findex BIG\n"),
            std::string::npos)
      << r.out;
  ASSERT_EQ(Host({"exec", "DELETE FROM FINDEX Big 5"}).status, 0);
  ASSERT_EQ(Host({"exec", "DELETE FROM FINDEX Big 7"}).status, 0);
  test::WriteFile(dir_.Path() + "data/Groups/PUBLIC/Indexes/BROKEN.sdx", "not a findex");

  r = Host({"list"});
  ASSERT_EQ(r.status, 0) << r.err;
  EXPECT_NE(r.out.find("\nBIG\tfindex\tText (Ansi)\t702\t2104\t1\t2\t"), std::string::npos)
      << r.out;
  EXPECT_NE(r.out.find("\nBROKEN\tfindex\tdamaged\tdamaged\tdamaged\tdamaged\t0\t12\t"),
            std::string::npos)
      << r.out;
}

// The README's order example, run as written there.
TEST_F(EngineCommandsTest, TheReadmeOrderExampleRuns) {
  ASSERT_EQ(Host({"init"}).status, 0);
  const std::string connect =
      Books({"create table books (id integer, title varchar(50), year integer)",
             "insert into books values (1, 'River fish', 1990), (2, 'Mountain', 1985)"});
  const std::string readme = test::ReadFile(std::string(QM_TEST_SOURCE_DIR) + "../README.md");
  const auto section = readme.find("### Orders");
  ASSERT_NE(section, std::string::npos);
  const std::string block = readme.substr(section, readme.find("\n## ", section) - section);
  int run = 0;
  std::istringstream lines(block);
  for (std::string line; std::getline(lines, line);) {
    const std::string prefix = "    quillmere --data D ";
    if (line.rfind(prefix, 0) != 0) continue;
    line = line.substr(prefix.size(), line.find("  #") - prefix.size());
    // Split like a shell: double-quoted words stay whole; "..." is the connection.
    std::vector<std::string> args;
    for (std::size_t at = 0; at < line.size();) {
      if (line[at] == ' ') { ++at; continue; }
      const bool quoted = line[at] == '"';
      const std::size_t end = quoted ? line.find('"', at + 1) : line.find(' ', at);
      std::string word = quoted ? line.substr(at + 1, end - at - 1) : line.substr(at, end - at);
      args.push_back(word == "..." ? connect : word);
      at = end == std::string::npos ? line.size() : end + 1;
    }
    const Result r = Host(args);
    EXPECT_EQ(r.status, 0) << line << "\n" << r.err;
    ++run;
  }
  EXPECT_EQ(run, 5);
}

}  // namespace
}  // namespace qm
