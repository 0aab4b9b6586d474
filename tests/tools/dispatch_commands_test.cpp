// The host's calls through the C interface (call, repl, typelib), run as a
// user or a script runs them on a findex built from an SQLite table: what each
// prints, its exit status and its messages.
#include <gtest/gtest.h>

#include <filesystem>
#include <sstream>
#include <string>
#include <vector>

#include "config/global_defs.h"
#include "quillmere/api_enums.h"
#include "sources/share_database.h"
#include "support/host_run.h"
#include "support/test_support.h"

namespace qm {
namespace {

namespace fs = std::filesystem;

using Result = test::HostResult;

using Args = std::vector<std::string>;

std::vector<std::string> Lines(const std::string& text) {
  std::vector<std::string> lines;
  std::istringstream in(text);
  for (std::string line; std::getline(in, line);) lines.push_back(line);
  return lines;
}

bool Contains(const std::string& text, const std::string& part) {
  return text.find(part) != std::string::npos;
}

constexpr const char* kCreateBooks = "CREATE FINDEX Books ON TABLE books COLUMNS title KEY id";

class DispatchCommandsTest : public ::testing::Test {
 protected:
  void SetUp() override {
    for (const char* folder : {"Indexes", "Orders", "Config", "WorkData", "DataStore"}) {
      fs::create_directories(dir_.Path() + "data/Groups/PUBLIC/" + folder);
    }
    ASSERT_EQ(Host({"init"}).status, 0);
    connect_ = test::SqliteDatabase(
        dir_.Path() + "books.db",
        {"create table books (id integer, title varchar(60))",
         "insert into books values (1, 'River fish'), (2, 'The river bank'),"
         " (3, 'Mountain'), (4, 'Quiet river'), (5, 'Fish market')"});
  }

  // The host with the scratch data folder; input feeds its standard input.
  Result Host(const Args& args, const std::string& input = std::string()) {
    return test::RunHost(dir_.Path(), args, input);
  }

  Result Call(const Args& args) {
    Args argv{"--connect", connect_, "call"};
    argv.insert(argv.end(), args.begin(), args.end());
    return Host(argv);
  }

  // Each line of the repl's JSON answers parsed by Python's json module and
  // written back as [result, out, error]: a line that is not one JSON object
  // with exactly those three members fails the parse.
  std::vector<std::string> ParsedJson(const std::string& answers) {
    const std::string file = dir_.Path() + "answers.json";
    test::WriteFile(file, answers);
    std::string out;
    const int status = test::RunProgram(
        {"/usr/bin/env", "python3", "-c",
         "import json, sys\n"
         "for line in open(sys.argv[1], encoding='utf-8').read().split('\\n')[:-1]:\n"
         "    o = json.loads(line)\n"
         "    assert sorted(o) == ['error', 'out', 'result'], line\n"
         "    print(json.dumps([o['result'], o['out'], o['error']], ensure_ascii=False))\n",
         file},
        &out);
    EXPECT_EQ(status, 0) << answers;
    return Lines(out);
  }

  test::ScratchDir dir_{"dispatch-host"};
  std::string connect_;
};

TEST_F(DispatchCommandsTest, CallDrivesBothObjectsByNameOrProgIdAndBuildsAFindex) {
  const std::string version = std::string(CGlobalDefs::kVersionText) + "\n";
  struct Case {
    Args args;
    std::string out;
  };
  for (const Case& c : std::vector<Case>{
           {{"APICommand", "GetVersion"}, version},
           {{"apisearch", "getversion"}, version},
           {{"QuillmereAPI.APISearch.1", "GetVersion"}, version},
           {{"quillmereapi.apicommand", "GETVERSION"}, version},
           {{"APICommand", "FindexExist", "Books", "PUBLIC"}, "false\n"},
           // -1 blocks until the findex is built; a method without a
           // result prints nothing.
           {{"APICommand", "ExecuteEx", kCreateBooks, "-1"}, ""},
           {{"APICommand", "FindexExist", "Books", "PUBLIC"}, "true\n"},
           {{"APICommand", "FindexExist", "Books", "OTHER"}, "false\n"},
           {{"APICommand", "ExecuteEx", "DROP FINDEX Books", "true"}, ""},
           {{"APICommand", "FindexExist", "Books", "PUBLIC"}, "false\n"},
           {{"APICommand", "Execute", kCreateBooks}, ""},
           {{"APISearch", "ValidateStatement", "SELECT id FROM books WHERE [Books='river']"},
            "'RIVER'\n"},
       }) {
    const Result r = Call(c.args);
    EXPECT_EQ(r.status, 0) << c.args[1] << "\n" << r.err;
    EXPECT_EQ(r.out, c.out) << c.args[0] << " " << c.args[1];
    EXPECT_EQ(r.err, "") << c.args[1];
  }
  // The host's own look at the files agrees.
  EXPECT_EQ(Host({"exists", "Books"}).out, "yes\n");
}

TEST_F(DispatchCommandsTest, CallRejectsBadObjectsMethodsCountsAndValuesWithExitTwo) {
  struct Case {
    Args args;
    std::string message;
  };
  for (const Case& c : std::vector<Case>{
           {{"APIThing", "GetVersion"}, "No class is registered as APIThing"},
           {{"APISearch", "Frobnicate"}, "IAPISearch has no method named Frobnicate"},
           {{"APISearch"}, "expected an object and a method"},
           {{}, "expected an object and a method"},
           {{"APICommand", "GetFindexInfo"},
            "GetFindexInfo takes 1 argument, 0 given: GetFindexInfo(InfoType: integer) -> text"},
           {{"APICommand", "GetVersion", "x"}, "GetVersion takes 0 arguments, 1 given"},
           {{"APICommand", "GetFindexInfo", "idx"},
            "argument 1 (InfoType) of GetFindexInfo must be an integer, not 'idx'"},
           {{"APICommand", "GetFindexInfo", "2147483648"}, "must be an integer"},
           {{"APICommand", "GetFindexInfo", "7.0"}, "must be an integer"},
           {{"APICommand", "GetFindexInfo", "null"}, "must be an integer, not 'null'"},
           {{"APICommand", "ExecuteEx", kCreateBooks, "yes"},
            "argument 2 (Blocking) of ExecuteEx must be a boolean"},
           {{"APICommand", "ExecuteEx", kCreateBooks, "32768"}, "must be a boolean"},
           {{"APISearch", "AdjustScore", "high", "1"},
            "argument 1 (StartValue) of AdjustScore must be a number"},
           {{"APISearch", "AdjustScore", "1", "1e999"},
            "argument 2 (StepValue) of AdjustScore must be a number"},
       }) {
    const Result r = Call(c.args);
    EXPECT_EQ(r.status, 2) << c.message;
    EXPECT_TRUE(Contains(r.err, c.message)) << r.err;
    EXPECT_TRUE(Contains(r.err, "usage: quillmere call OBJECT METHOD")) << r.err;
    EXPECT_EQ(r.out, "") << c.message;
  }
  // Nothing ran: the findex of the rejected ExecuteEx calls is not there.
  EXPECT_EQ(Call({"APICommand", "FindexExist", "Books", "PUBLIC"}).out, "false\n");
}

TEST_F(DispatchCommandsTest, CallReportsEngineFailuresWithExitOneAndOptionsReachTheObject) {
  struct Case {
    Args args;
    std::string message;
  };
  for (const Case& c : std::vector<Case>{
           {{"APICommand", "ExecuteEx", "CREATE FINDEX Bad ON TABLE nosuch COLUMNS x KEY id",
             "-1"},
            "nosuch"},
           // A method with a result prints none when it fails.
           {{"APISearch", "GetTotal"}, "GetTotal"},
       }) {
    const Result r = Call(c.args);
    EXPECT_EQ(r.status, 1) << c.args[1];
    EXPECT_TRUE(Contains(r.err, "quillmere call: ")) << r.err;
    EXPECT_TRUE(Contains(r.err, c.message)) << r.err;
    EXPECT_EQ(r.out, "");
  }

  // --data and --group reach the object: the findex is built where they say,
  // and only there.
  const std::string other = dir_.Path() + "other/";
  ASSERT_EQ(Host({"--data", other, "init"}).status, 0);
  ASSERT_EQ(Host({"--group", "SIDE", "init"}).status, 0);
  for (const Args& place : std::vector<Args>{{"--data", other}, {"--group", "SIDE"}}) {
    Args build = place;
    build.insert(build.end(),
                 {"--connect", connect_, "call", "APICommand", "ExecuteEx", kCreateBooks, "-1"});
    const Result r = Host(build);
    EXPECT_EQ(r.status, 0) << place[1] << "\n" << r.err;
  }
  EXPECT_EQ(Host({"--data", other, "call", "APICommand", "FindexExist", "Books", "PUBLIC"}).out,
            "true\n");
  EXPECT_EQ(Call({"APICommand", "FindexExist", "Books", "SIDE"}).out, "true\n");
  EXPECT_EQ(Call({"APICommand", "FindexExist", "Books", "PUBLIC"}).out, "false\n");
  // A group that was never laid out: the build finds no folders for it.
  Result r = Host({"--group", "NOGROUP", "--connect", connect_, "call", "APICommand",
                   "ExecuteEx", kCreateBooks, "-1"});
  EXPECT_EQ(r.status, 1) << r.err;
  EXPECT_TRUE(Contains(r.err, "NOGROUP")) << r.err;
  // Without --connect the command object has no data source for the build.
  r = Host({"call", "APICommand", "ExecuteEx", kCreateBooks, "-1"});
  EXPECT_EQ(r.status, 1) << r.err;
  // The object's own SetDataPath refuses a folder that is not there.
  r = Host({"--data", dir_.Path() + "nowhere", "call", "APISearch", "GetVersion"});
  EXPECT_EQ(r.status, 1);
  EXPECT_TRUE(Contains(r.err, "quillmere call: SetDataPath: Data path does not exist")) << r.err;
  EXPECT_EQ(Call({"APICommand", "FindexExist", "Books", "PUBLIC"}).out, "false\n");
}

TEST_F(DispatchCommandsTest, ReplKeepsBothObjectsAcrossLinesAndAnswersEachOnOneLine) {
  const std::string script =
      "# a findex, then searches on it\n"
      "APICommand.ExecuteEx \"CREATE FINDEX Books ON TABLE books COLUMNS title KEY id\" -1\n"
      "\n"
      "   # an indented comment\n"
      "APISearch.Execute \"SELECT id FROM books WHERE [Books='river']\"\n"
      "APISearch.GetTotal\n"
      "APISearch.GetRawKeyString 1 2\n"
      "APISearch.GetRawKeyString 3 5\n"
      "APISearch.OrderBy 'KEY DESC'\n"
      "apisearch.getrawkeystring 1 10\n"
      // 1 is not -1: the open result set refuses a second statement.
      "APISearch.ExecuteEx \"SELECT id FROM books WHERE [Books='fish']\" 1\n"
      "APISearch.ExecuteEx \"SELECT id FROM books WHERE [Books='fish']\" true\n"
      "APISearch.GetRawKeyStringEx 1 10 2\n"
      "APISearch.IsEOB\n"
      "APISearch.GetFindexWordsEx Books 1 10 'm*' '\\'\n"
      "APISearch.Frobnicate\n"
      "Nothing.GetTotal\n"
      "GetTotal\n"
      "APISearch.GetRawKeyString 1 'two\n"
      "APISearch.GetRawKeyString 1\n"
      "APICommand.ExecuteEx \"CREATE FINDEX Bad ON TABLE nosuch COLUMNS x KEY id\" -1\n"
      "QuillmereAPI.APICommand.1.FindexExist Books PUBLIC\n";
  const Result r = Host({"--connect", connect_, "repl"}, script);
  ASSERT_EQ(r.status, 0) << r.err;
  EXPECT_EQ(r.err, "");
  const std::vector<std::string> lines = Lines(r.out);
  const std::vector<std::string> expected = {
      "",
      "",
      "3",
      "(1,2)",
      "(4)",
      "",
      "(4,2,1)",
      "! A result set is already open",
      "",
      "(1,5)",
      // The engine's end of block is 1, not -1: it shows as the number.
      "1",
      "MARKET\\\\MOUNTAIN",
      "! IAPISearch has no method named Frobnicate",
      "! unknown object 'Nothing' (APICommand or APISearch)",
      "! expected OBJECT.METHOD, not 'GetTotal'",
      "! a single quote is not closed",
      "! GetRawKeyString takes 2 arguments, 1 given",
      "! ",
      "true",
  };
  ASSERT_EQ(lines.size(), expected.size()) << r.out;
  for (std::size_t i = 0; i < expected.size(); ++i) {
    if (expected[i].rfind("! ", 0) == 0) {
      EXPECT_EQ(lines[i].rfind(expected[i], 0), 0u) << i << ": " << lines[i];
    } else {
      EXPECT_EQ(lines[i], expected[i]) << i;
    }
  }
  // The failed build's message chain stays on its line.
  EXPECT_TRUE(Contains(lines[17], "nosuch")) << lines[17];
}

TEST_F(DispatchCommandsTest, ReplJsonAnswersAreJsonObjectsOfResultOutAndError) {
  const std::string script =
      "APICommand.ExecuteEx \"CREATE FINDEX Books ON TABLE books COLUMNS title KEY id\" -1\n"
      "APISearch.Execute \"SELECT id FROM books WHERE [Books='river']\"\n"
      "APISearch.GetTotal\n"
      "APISearch.OrderBy \"KEY DESC\"\n"
      "APISearch.GetRawKeyString 2 5\n"
      "APISearch.IsEOB\n"
      "APISearch.IsTruncated\n"
      "APISearch.GetFindexWordsEx Books 1 10 'm*' '\"\\'\n"
      "APICommand.FindexExist Books PUBLIC\n"
      "APISearch.Execute \"SELECT id FROM books WHERE [Books='fish']\"\n"
      "APISearch.GetTotal 1\n"
      "APICommand.ExecuteEx \"CREATE FINDEX Bad ON TABLE nosuch COLUMNS x KEY id\" -1\n";
  const Result r = Host({"--connect", connect_, "repl", "--json"}, script);
  ASSERT_EQ(r.status, 0) << r.err;
  const std::vector<std::string> parsed = ParsedJson(r.out);
  const std::vector<std::string> expected = {
      "[null, [], null]",
      "[null, [], null]",
      "[3, [], null]",
      "[null, [], null]",
      "[\"(2,1)\", [], null]",
      // The engine's end of block is 1, which is not VARIANT_TRUE.
      "[1, [], null]",
      "[false, [], null]",
      "[\"MARKET\\\"\\\\MOUNTAIN\", [], null]",
      "[true, [], null]",
      "[null, [], \"A result set is already open",
      "[null, [], \"GetTotal takes 0 arguments, 1 given",
      "[null, [], \"",
  };
  ASSERT_EQ(parsed.size(), expected.size()) << r.out;
  for (std::size_t i = 0; i < expected.size(); ++i) {
    EXPECT_EQ(parsed[i].rfind(expected[i], 0), 0u) << i << ": " << parsed[i];
  }
  EXPECT_TRUE(Contains(parsed.back(), "nosuch")) << parsed.back();
}

TEST_F(DispatchCommandsTest, ReplSplitsWordsAsAShellDoes) {
  ASSERT_EQ(Call({"APICommand", "ExecuteEx", kCreateBooks, "-1"}).status, 0);
  // The separator of a word list comes back between the words as it was
  // typed, after the line's quoting.
  struct Case {
    std::string separator;
    std::string answer;
  };
  const std::vector<Case> cases = {
      {"-", "MARKET-MOUNTAIN"},
      {"-  \t ", "MARKET-MOUNTAIN"},
      {"x\\ ", "MARKETx MOUNTAIN"},
      {"a\\ b", "MARKETa bMOUNTAIN"},
      {"'a  \"b\\'", "MARKETa  \"b\\\\MOUNTAIN"},
      {"\"x\\\"y\\\\z\"", "MARKETx\"y\\\\zMOUNTAIN"},
      {"\"p\\q\"", "MARKETp\\\\qMOUNTAIN"},
      {"'it''s'\"!\"", "MARKETits!MOUNTAIN"},
      {"''", "MARKETMOUNTAIN"},
      {"\"open", "! a double quote is not closed"},
      {"'open", "! a single quote is not closed"},
      {"x\\", "! a backslash ends the line"},
      {"- extra", "! GetFindexWordsEx takes 5 arguments, 6 given"},
  };
  std::string script;
  for (const Case& c : cases) {
    script += "\tAPISearch.GetFindexWordsEx  Books 1 10 'm*' " + c.separator + "\n";
  }
  const Result r = Host({"repl"}, script);
  ASSERT_EQ(r.status, 0) << r.err;
  const std::vector<std::string> lines = Lines(r.out);
  ASSERT_EQ(lines.size(), cases.size()) << r.out;
  for (std::size_t i = 0; i < cases.size(); ++i) {
    EXPECT_EQ(lines[i].substr(0, cases[i].answer.size()), cases[i].answer)
        << cases[i].separator;
  }
}

TEST_F(DispatchCommandsTest, ReplTellsTheNullTextFromTheWordNull) {
  const std::string get = "APICommand.GetIndexGeneralOption " + std::to_string(igoSeparators) +
                          " true\n";
  const std::string script =
      "APICommand.SetCurrentObjectName Fresh\n"
      "APICommand.SetIndexGeneralOptions 0 0 0 ';:' true false\n" + get +
      // The null text leaves the separators as they were; 'null' is a text.
      "APICommand.SetIndexGeneralOptions 0 0 0 null true false\n" + get +
      "APICommand.SetIndexGeneralOptions 0 0 0 'null' true false\n" + get +
      "APICommand.SetIndexGeneralOptions 0 0 0 \"\" true false\n" + get;
  const Result r = Host({"repl"}, script);
  ASSERT_EQ(r.status, 0) << r.err;
  EXPECT_EQ(r.out, "\n\n;:\n\n;:\n\nnull\n\n\n");
}

TEST_F(DispatchCommandsTest, HelpTypelibAndUsageErrors) {
  for (const Args& args : std::vector<Args>{{"call", "--help"}, {"repl", "--help"},
                                            {"typelib", "--help"}}) {
    const Result r = Host(args);
    EXPECT_EQ(r.status, 0) << args[0];
    EXPECT_EQ(r.out.rfind("usage: quillmere", 0), 0u) << r.out;
  }
  Result r = Host({"call", "APISearch", "--help"});
  EXPECT_EQ(r.status, 0);
  const std::vector<std::string> methods = Lines(r.out);
  ASSERT_EQ(methods.size(), 45u) << r.out;
  EXPECT_EQ(methods[2], "  2  ExecuteEx(SqlStatement: text, AddNewResultSet: boolean)");
  EXPECT_EQ(methods[33], " 33  GetMaxScore() -> integer");
  EXPECT_EQ(Lines(Host({"call", "APICommand", "-h"}).out).size(), 44u);

  for (const Args& args : std::vector<Args>{
           {"repl", "--jsn"}, {"repl", "extra"}, {"typelib", "x"}, {"call", "Nope", "--help"}}) {
    r = Host(args);
    EXPECT_EQ(r.status, 2) << args[1];
    EXPECT_TRUE(Contains(r.err, "usage: quillmere " + args[0])) << r.err;
  }

  // The type library is JSON that lists both interfaces' methods.
  r = Host({"typelib"});
  ASSERT_EQ(r.status, 0);
  const std::string file = dir_.Path() + "typelib.json";
  test::WriteFile(file, r.out);
  std::string out;
  EXPECT_EQ(test::RunProgram({"/usr/bin/env", "python3", "-c",
                              "import json, sys\n"
                              "t = json.load(open(sys.argv[1]))\n"
                              "for c in t['classes']:\n"
                              "    print(c['progId'], len(c['interface']['methods']))\n",
                              file},
                             &out),
            0);
  EXPECT_EQ(out, "QuillmereAPI.APISearch.1 44\nQuillmereAPI.APICommand.1 43\n");
}

}  // namespace
}  // namespace qm
