// The host's search commands (search, validate, words, groups), run as a user
// runs them on findexes and orders built from an SQLite table: what each
// prints, its exit status and its messages.
#include <gtest/gtest.h>

#include <cmath>
#include <filesystem>
#include <regex>
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

using Args = std::vector<std::string>;

Args With(Args head, const Args& rest) {
  head.insert(head.end(), rest.begin(), rest.end());
  return head;
}

// Matches 'river' in the titles of 1, 2 (twice) and 4, and in the note of 3.
constexpr const char* kRiver = "SELECT id,title FROM books WHERE [Books='river']";
constexpr const char* kEveryBook =
    "SELECT id FROM books WHERE [Books='river' OR Books='fish' OR Books='mountain']";

class SearchCommandsTest : public ::testing::Test {
 protected:
  void SetUp() override {
    for (const char* folder : {"Indexes", "Orders", "Config", "WorkData", "DataStore"}) {
      fs::create_directories(dir_.Path() + "data/Groups/PUBLIC/" + folder);
    }
    ASSERT_EQ(Host({"init"}).status, 0);
    ASSERT_EQ(Host({"options", "set", "index-general", "igoSupportScore=1"}).status, 0);
    connect_ = Database("books.db", {
        "create table books (id integer, title varchar(60), year integer, genre varchar(20), "
        "price real, note varchar(40), cover blob)",
        "insert into books values"
        " (1, 'River fish', 1990, 'nature', 12.5, 'first', X'00010203'),"
        " (2, 'The river and the river bank', 1985, 'nature', 20, NULL, NULL),"
        " (3, 'Mountain', 1985, 'travel', NULL, 'river' || char(9) || 'view', NULL),"
        " (4, 'Quiet river', 2001, 'fiction', 8.25, 'Ünïcode', NULL),"
        " (5, 'Fish market', 2001, 'travel', 15, 'line' || char(10) || 'two', NULL)"});
    for (const char* statement :
         {"CREATE FINDEX Books ON TABLE books COLUMNS title KEY id",
          "CREATE FINDEX Scored ON TABLE books COLUMNS title:CONTENT_WEIGHT=5,note KEY id",
          "CREATE FINDEX Years ON TABLE books COLUMNS year KEY id",
          // Named after the table, so that the SQL order clause BOOKS.YEAR is
          // one the database understands.
          "CREATE ORDER books ON TABLE books COLUMNS year,price KEY id",
          "CREATE ORDER Genres ON TABLE books COLUMNS genre KEY id"}) {
      const Result r = Host({"--connect", connect_, "exec", "--quiet", statement});
      ASSERT_EQ(r.status, 0) << statement << "\n" << r.err;
    }
  }

  Result Host(const Args& args) {
    return test::RunHost(dir_.Path(), args);
  }

  // Runs SQL on a database file of the scratch folder; returns its connection string.
  std::string Database(const std::string& file, const std::vector<std::string>& statements) {
    return test::SqliteDatabase(dir_.Path() + file, statements);
  }

  test::ScratchDir dir_{"search-host"};
  std::string connect_;
};

TEST_F(SearchCommandsTest, SearchPrintsTheTotalAndTheKeysSqlOrRowsOfItsWindow) {
  struct Case {
    Args args;
    std::string out;
  };
  for (const Case& c : std::vector<Case>{
           {{kRiver}, "3\n(1,2,4)\n"},
           {{kRiver, "--total"}, "3\n"},
           {{kRiver, "--keys", "--start", "2"}, "(2,4)\n"},
           {{kRiver, "--keys", "--start", "2", "--count", "1"}, "(2)\n"},
           {{kRiver, "--start", "9"}, "3\n()\n"},
           {{kRiver, "--count", "0"}, "3\n()\n"},
           // The shell may split a statement: its words are joined again.
           {{"SELECT", "id", "FROM", "books", "WHERE", "[Books='fish']"}, "2\n(1,5)\n"},
           {{kRiver, "--sql"}, "SELECT id,title FROM books WHERE id in (1,2,4) \n"},
           {{kRiver, "--sql", "--order-by", "KEY DESC", "--count", "2"},
            "SELECT id,title FROM books WHERE id in (4,2)  order by id DESC\n"},
           {{"SELECT id FROM books WHERE [Books='zebra']", "--sql"},
            "SELECT id FROM books WHERE 1=2 \n"},
           {{kEveryBook, "--keys", "--order-by", "books.year DESC,KEY"}, "(4,5,1,2,3)\n"},
       }) {
    const Result r = Host(With({"search"}, c.args));
    EXPECT_EQ(r.status, 0) << c.args[0] << "\n" << r.err;
    EXPECT_EQ(r.out, c.out) << c.args[0];
  }
}

// "s;(k,...);" groups of a key string ordered by score.
std::vector<std::pair<int, std::string>> ScoreGroups(const std::string& keys) {
  std::vector<std::pair<int, std::string>> groups;
  const std::regex group("([0-9]+);(\\([0-9,]*\\));");
  for (std::sregex_iterator it(keys.begin(), keys.end(), group), end; it != end; ++it) {
    groups.emplace_back(std::stoi((*it)[1]), (*it)[2]);
  }
  return groups;
}

TEST_F(SearchCommandsTest, ScoresOrderTheKeysAndShowAsPercentagesInKeysKeyFilesAndRows) {
  const std::string statement = "SELECT [SCORE],id FROM books WHERE [Scored='river']";
  Result r = Host({"search", statement, "--order-by", "SCORE", "--keys"});
  ASSERT_EQ(r.status, 0) << r.err;
  // Key 2 has the word twice in the weighted title, 4 and 1 once (equal
  // scores in descending key order), 3 only in the unweighted note.
  const auto raw = ScoreGroups(r.out);
  ASSERT_EQ(raw.size(), 3u) << r.out;
  EXPECT_EQ(raw[0].second, "(2)");
  EXPECT_EQ(raw[1].second, "(4,1)");
  EXPECT_EQ(raw[2].second, "(3)");
  EXPECT_GT(raw[0].first, raw[1].first);
  EXPECT_GT(raw[1].first, raw[2].first);

  // Percentages of the highest score, rounded up only past one half.
  const auto percent = [&](int score) {
    const double exact = score * 100.0 / raw[0].first;
    return static_cast<int>(exact - std::floor(exact) > 0.5 ? std::ceil(exact) : std::floor(exact));
  };
  std::string keys;
  for (const auto& [score, list] : raw) keys += std::to_string(percent(score)) + ";" + list + ";";
  // The ORDER BY inside the condition orders as --order-by does.
  r = Host({"search", "SELECT [SCORE],id FROM books WHERE [Scored='river' ORDER BY SCORE]",
            "--option", "SCORE_RETURN=2"});
  EXPECT_EQ(r.out, "4\n" + keys + "\n") << r.err;

  r = Host(
      {"search", statement, "--option", "SCORE_RETURN=2", "--order-by", "SCORE", "--key-file"});
  ASSERT_EQ(r.status, 0) << r.err;
  ASSERT_FALSE(r.out.empty());
  const std::string file = r.out.substr(0, r.out.size() - 1);
  EXPECT_EQ(test::ReadFile(file), std::to_string(percent(raw[0].first)) + ",2\r\n" +
                                      std::to_string(percent(raw[1].first)) + ",4\r\n" +
                                      std::to_string(percent(raw[1].first)) + ",1\r\n" +
                                      std::to_string(percent(raw[2].first)) + ",3\r\n");

  // The rows of equal score come in the search's order, not the database's.
  r = Host({"search", statement, "--option", "SCORE_RETURN=2", "--order-by", "SCORE", "--rows"});
  ASSERT_EQ(r.status, 0) << r.err;
  EXPECT_EQ(r.out, "SCORE\tid\n" + std::to_string(percent(raw[0].first)) + "\t2\n" +
                       std::to_string(percent(raw[1].first)) + "\t4\n" +
                       std::to_string(percent(raw[1].first)) + "\t1\n" +
                       std::to_string(percent(raw[2].first)) + "\t3\n");

  // A group count rounds the scores to hundreds first: one group here.
  r = Host({"search", statement, "--option", "SCORE_GROUP_COUNT=1", "--order-by", "SCORE"});
  EXPECT_TRUE(std::regex_match(r.out, std::regex("4\n[1-9]00;\\(4\\);\n"))) << r.out << r.err;
}

TEST_F(SearchCommandsTest, RowsComeFromTheSavedOrTheGivenConnection) {
  const std::string statement = "SELECT id,title,note,price FROM books WHERE "
                                "[Books='river' OR Books='fish' OR Books='mountain']";
  // Tabs and line ends inside values are escaped; NULL is empty.
  Result r = Host({"search", statement, "--order-by", "books.year DESC", "--rows"});
  ASSERT_EQ(r.status, 0) << r.err;
  EXPECT_EQ(r.out,
            "id\ttitle\tnote\tprice\n"
            "5\tFish market\tline\\ntwo\t15\n"
            "4\tQuiet river\tÜnïcode\t8.25\n"
            "1\tRiver fish\tfirst\t12.5\n"
            "3\tMountain\triver\\tview\t\n"
            "2\tThe river and the river bank\t\t20\n");

  // Unordered, the statement's own SQL decides.
  r = Host({"search", std::string(kRiver) + " ORDER BY title DESC", "--rows"});
  EXPECT_EQ(r.out, "id\ttitle\n2\tThe river and the river bank\n1\tRiver fish\n4\tQuiet river\n")
      << r.err;
  r = Host({"search", kRiver, "--start", "2", "--count", "1", "--rows"});
  EXPECT_EQ(r.out, "id\ttitle\n2\tThe river and the river bank\n") << r.err;
  // A binary value shows its size; the work file it was read into goes.
  r = Host({"search", "SELECT id,cover FROM books WHERE [Books='river']", "--rows"});
  EXPECT_EQ(r.out, "id\tcover\n1\t(4 bytes)\n2\t\n4\t\n") << r.err;
  EXPECT_TRUE(fs::is_empty(dir_.Path() + "data/Groups/PUBLIC/WorkData"));
  r = Host({"search", "SELECT id,title FROM books WHERE [Books='zebra']", "--rows"});
  EXPECT_EQ(r.out, "id\ttitle\n") << r.err;

  // --connect names another data source than the saved one.
  const std::string other = Database("other.db", {"create table books (id integer, title text)",
                                                  "insert into books values (1, 'elsewhere'), "
                                                  "(2, 'also elsewhere'), (3, 'not found')"});
  r = Host({"--connect", other, "search", kRiver, "--rows"});
  EXPECT_EQ(r.out, "id\ttitle\n1\telsewhere\n2\talso elsewhere\n") << r.err;

  // A findex that did not keep its connection needs one.
  ASSERT_EQ(Host({"options", "set", "index-general", "igoSaveDatabaseConnection=0"}).status, 0);
  ASSERT_EQ(Host({"--connect", connect_, "exec", "--quiet",
                  "CREATE FINDEX Unsaved ON TABLE books COLUMNS title KEY id"})
                .status,
            0);
  const std::string unsaved = "SELECT id FROM books WHERE [Unsaved='quiet']";
  r = Host({"search", unsaved, "--rows"});
  EXPECT_EQ(r.status, 1);
  EXPECT_EQ(r.out, "");
  EXPECT_EQ(r.err,
            "quillmere search: findex UNSAVED was built without saving its connection; name the "
            "data source with --connect or --dsn\n");
  r = Host({"--connect", connect_, "search", unsaved, "--rows"});
  EXPECT_EQ(r.out, "id\n4\n") << r.err;

  // The database's own error, with the SQL it refused.
  r = Host({"search", "SELECT nosuch FROM books WHERE [Books='fish']", "--rows"});
  EXPECT_EQ(r.status, 1);
  EXPECT_NE(r.err.find("no such column: nosuch"), std::string::npos) << r.err;
  EXPECT_NE(r.err.find("SELECT nosuch FROM books WHERE id in (1,5)"), std::string::npos) << r.err;
}

TEST_F(SearchCommandsTest, RowsAreAlignedOnATerminal) {
  // script(1) gives the host a terminal for its standard output.
  const std::string command = std::string("'") + QM_CLI_PATH + "' --data '" + dir_.Path() +
                              "data' search \"SELECT note,id FROM books WHERE "
                              "[Books='river' OR Books='fish']\" --rows";
  std::string out;
  ASSERT_EQ(test::RunProgram({"/usr/bin/script", "-q", "-e", "-c", command, "/dev/null"}, &out), 0)
      << out;
  std::erase(out, '\r');
  // Widths count characters, not bytes: the accented note is seven wide.
  EXPECT_EQ(out,
            "note       id\n"
            "first      1\n"
            "           2\n"
            "Ünïcode    4\n"
            "line\\ntwo  5\n");
}

TEST_F(SearchCommandsTest, ValidatePrintsTheConditionAsParsedOrTheParseError) {
  struct Case {
    std::string condition;
    int status;
    std::string out_or_err;
  };
  for (const Case& c : std::vector<Case>{
           {"Books='red wine' OR Books = beer", 0, "'RED WINE' OR 'BEER'\n"},
           // Stop words of the findex's language go: THE.
           {"(Books='x' OR Books='y') AND Books='the river'", 0, "('X' OR 'Y') AND 'RIVER'\n"},
           {"NOT Books='fish'", 0, "'*' OPERATOR 'FISH'\n"},
           {"(Books='fish'", 1, "Parentheses do not match"},
           {"   ", 1, "Empty search condition"},
       }) {
    const Result r = Host({"validate", "SELECT id FROM books WHERE [" + c.condition + "]"});
    EXPECT_EQ(r.status, c.status) << c.condition << "\n" << r.err;
    if (c.status == 0) {
      EXPECT_EQ(r.out, c.out_or_err) << c.condition;
    } else {
      EXPECT_EQ(r.out, "") << c.condition;
      EXPECT_EQ(r.err.rfind("quillmere validate: ", 0), 0u) << r.err;
      EXPECT_NE(r.err.find(c.out_or_err), std::string::npos) << c.condition << "\n" << r.err;
    }
  }
}

TEST_F(SearchCommandsTest, WordsListsAFindexsWordsByFilterAndWindow) {
  struct Case {
    Args args;
    int status;
    std::string out;
  };
  for (const Case& c : std::vector<Case>{
           // Stop words (THE, AND) are not in the findex.
           {{"Books"}, 0, "BANK\nFISH\nMARKET\nMOUNTAIN\nQUIET\nRIVER\n"},
           {{"books", "--filter", "m*"}, 0, "MARKET\nMOUNTAIN\n"},
           {{"Books", "--start", "2", "--count", "3"}, 0, "FISH\nMARKET\nMOUNTAIN\n"},
           {{"Books", "--start", "6"}, 0, "RIVER\n"},
           {{"Books", "--start", "7"}, 0, ""},
           {{"Books", "--count", "0"}, 0, ""},
       }) {
    const Result r = Host(With({"words"}, c.args));
    EXPECT_EQ(r.status, c.status) << c.args.back() << "\n" << r.err;
    EXPECT_EQ(r.out, c.out) << c.args.back();
  }
  Result r = Host({"words", "Years"});
  EXPECT_EQ(r.status, 1);
  EXPECT_NE(r.err.find("Index type must be Text"), std::string::npos) << r.err;
  r = Host({"words", "Nope"});
  EXPECT_EQ(r.status, 1);
  EXPECT_EQ(r.err, "quillmere words: no findex Nope in group PUBLIC\n");
}

TEST_F(SearchCommandsTest, GroupsPrintEachValueOfTheColumnWithItsRows) {
  struct Case {
    std::string order_by, column, out;
  };
  for (const Case& c : std::vector<Case>{
           {"books.year", "books.year", "1985\t2\n1990\t1\n2001\t2\n"},
           {"books.year DESC", "BOOKS.YEAR", "2001\t2\n1990\t1\n1985\t2\n"},
           // Grouped by the first column, the runs of the second do not show. A
           // text column reads as the place of the text among the column's
           // texts: fiction 0, nature 1, travel 2.
           {"books.year,genres.genre", "books.year", "1985\t2\n1990\t1\n2001\t2\n"},
           {"books.year,genres.genre", "genres.genre", "1\t1\n2\t1\n1\t1\n0\t1\n2\t1\n"},
           {"KEY", "KEY", "1\t1\n2\t1\n3\t1\n4\t1\n5\t1\n"},
       }) {
    const Result r =
        Host({"groups", kEveryBook, "--order-by", c.order_by, "--column", c.column});
    EXPECT_EQ(r.status, 0) << c.order_by << "\n" << r.err;
    EXPECT_EQ(r.out, c.out) << c.order_by << " / " << c.column;
  }
  const Result none = Host({"groups", "SELECT id FROM books WHERE [Books='zebra']", "--order-by",
                            "books.year", "--column", "books.year"});
  EXPECT_EQ(none.status, 0) << none.err;
  EXPECT_EQ(none.out, "");
  const Result unordered =
      Host({"groups", kEveryBook, "--order-by", "books.year", "--column", "genres.genre"});
  EXPECT_EQ(unordered.status, 1);
  EXPECT_NE(unordered.err.find("Make sure the column has been ordered"), std::string::npos)
      << unordered.err;
}

TEST_F(SearchCommandsTest, EngineErrorsExitOneUsageErrorsTwoAndEveryCommandHasHelp) {
  struct Case {
    Args args;
    std::string err;
  };
  for (const Case& c : std::vector<Case>{
           // Option names are case-sensitive.
           {{"search", kRiver, "--option", "score_return=2"}, "Unknown Option score_return"},
           {{"search", kRiver, "--order-by", "SCORE SIDEWAYS"}, "Invalid sort direction"},
           {{"search", "SELECT id FROM books WHERE [Nope='x']"}, "NOPE.sdx"},
       }) {
    const Result r = Host(c.args);
    EXPECT_EQ(r.status, 1) << c.args.back() << "\n" << r.err;
    EXPECT_EQ(r.out, "") << c.args.back();
    EXPECT_EQ(r.err.rfind("quillmere search: ", 0), 0u) << r.err;
    EXPECT_NE(r.err.find(c.err), std::string::npos) << r.err;
  }
  for (const Args& args : std::vector<Args>{
           {"search"},
           {"search", kRiver, "--total", "--sql"},
           {"search", kRiver, "--start", "0"},
           {"search", kRiver, "--count", "-1"},
           {"search", kRiver, "--count"},
           {"search", kRiver, "--option", "SCORE_RETURN"},
           {"search", kRiver, "--option", "SCORE_RETURN=two"},
           {"search", kRiver, "--fast"},
           {"validate"},
           {"words"},
           {"words", "Books", "Years"},
           {"words", "Books", "--start", "x"},
           {"groups", kEveryBook, "--order-by", "KEY"},
           {"groups", kEveryBook, "--column", "KEY"},
       }) {
    const Result r = Host(args);
    EXPECT_EQ(r.status, 2) << args.back() << "\n" << r.err;
    EXPECT_EQ(r.err.rfind("quillmere " + args[0] + ": ", 0), 0u) << r.err;
    EXPECT_NE(r.err.find("\nusage: quillmere " + args[0] + " "), std::string::npos) << r.err;
    EXPECT_EQ(r.out, "");
  }
  for (const char* command : {"search", "validate", "words", "groups"}) {
    const Result r = Host({command, "--help"});
    EXPECT_EQ(r.status, 0) << command;
    EXPECT_EQ(r.out.rfind(std::string("usage: quillmere [GLOBAL OPTIONS] ") + command + " ", 0), 0u)
        << r.out;
    EXPECT_NE(Host({"--help"}).out.find(std::string("\n  ") + command + " "), std::string::npos);
  }
}

}  // namespace
}  // namespace qm
