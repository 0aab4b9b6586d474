// The search object on findexes and orders built from the test's SQLite
// database: result sets, SQL and key strings for the host, orders, groups,
// scores, key files, word lists, and the refusals of each call.
#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "api/command_fixture.h"
#include "base/error_messages.h"
#include "quillmere/api_search.h"

namespace qm {
namespace {

class SearchObjectTest : public test::CommandFixture {
 protected:
  void SetUp() override {
    CommandFixture::SetUp();
    UseShippedMessages();
    UseShippedLanguages();
    UseSqlite();
    // Word counts make the scores: 1 > 2 > 3 = 4 = 6 for APPLE.
    Sql({"create table docs (id integer, body varchar(200), n integer, title varchar(20))",
         "insert into docs values (1, 'apple apple apple pie', 30, 'pear')",
         "insert into docs values (2, 'apple apple tart', 10, 'fig')",
         "insert into docs values (3, 'apple crumble', 20, 'pear')",
         "insert into docs values (4, 'apple juice', 10, 'apple')",
         "insert into docs values (5, 'banana split', 40, 'fig')",
         "insert into docs values (6, 'apple banana', 20, 'kiwi')"});
    ASSERT_EQ(command_->SetIndexGeneralOptions(-1, -1, 0, nullptr, -1, -1), S_OK);
    ASSERT_EQ(command_->SetIndexLanguageOptions(2, 0, 0, 0, 0, 0), S_OK);
    ASSERT_EQ(Run("CREATE FINDEX Docs ON TABLE docs COLUMNS body KEY id"), "");
    ASSERT_EQ(command_->SetIndexGeneralOptions(0, 0, 0, nullptr, -1, -1), S_OK);
    ASSERT_EQ(Run("CREATE FINDEX Plain ON TABLE docs COLUMNS body KEY id"), "");
    ASSERT_EQ(Run("CREATE FINDEX Numbers ON TABLE docs COLUMNS n KEY id"), "");
    ASSERT_EQ(Run("CREATE ORDER Titles ON TABLE docs COLUMNS title KEY id"), "");
    search_ = std::make_unique<APISearch>();
    ASSERT_EQ(search_->SetDataPath(T(home_.Data())), S_OK) << LastError();
  }

  void TearDown() override {
    search_.reset();
    CommandFixture::TearDown();
  }

  static std::string Statement(const std::string& condition) {
    return "SELECT id FROM docs WHERE [" + condition + "] AND id > 0";
  }

  void Execute(const std::string& condition) {
    ASSERT_EQ(search_->Execute(T(Statement(condition))), S_OK) << LastError();
  }

  std::string Keys(int32_t start = 0, int32_t count = 0) {
    BSTR keys;
    EXPECT_EQ(search_->GetRawKeyString(start, count, &keys), S_OK) << LastError();
    return Utf16ToUtf8(keys);
  }

  std::string Sql(int32_t start = 0, int32_t count = 0) {
    BSTR sql;
    EXPECT_EQ(search_->GetSql(start, count, &sql), S_OK) << LastError();
    return Utf16ToUtf8(sql);
  }

  int32_t Number(HRESULT (APISearch::*get)(int32_t*)) {
    int32_t n = -7;
    EXPECT_EQ((search_.get()->*get)(&n), S_OK) << LastError();
    return n;
  }

  // The error of a call that must fail, without the last line end.
  static std::string Failure(HRESULT hr) {
    EXPECT_EQ(hr, DISP_E_EXCEPTION);
    std::string text = LastError();
    if (text.ends_with("\r\n")) text.resize(text.size() - 2);
    return text;
  }

  using test::CommandFixture::Sql;
  std::unique_ptr<APISearch> search_;
};

TEST_F(SearchObjectTest, KeyStringsAndSqlFollowTheOrderTheWindowAndTheScoreOptions) {
  Execute("Docs='apple'");
  EXPECT_EQ(Number(&APISearch::GetTotal), 5);
  EXPECT_EQ(Number(&APISearch::GetNum), 5);
  // Before any ordering: by key, no score groups, no order clause.
  EXPECT_EQ(Keys(), "(1,2,3,4,6)");
  EXPECT_EQ(Sql(), "SELECT id FROM docs WHERE id in (1,2,3,4,6)  AND id > 0");
  BSTR text;
  ASSERT_EQ(search_->GetSqlOrderString(&text), S_OK);
  EXPECT_EQ(Utf16ToUtf8(text), "id ASC");
  ASSERT_EQ(search_->GetSqlKeyName(&text), S_OK);
  EXPECT_EQ(Utf16ToUtf8(text), "id");

  // By score: groups of equal score, the later key first on a tie; each
  // group its own SELECT, ordered by SCORE since the SQL is a union. The
  // statement's SCORE column carries each group's score.
  ASSERT_EQ(search_->OrderBy(T("SCORE")), S_OK) << LastError();
  EXPECT_EQ(Keys(), "204;(1);203;(2);202;(6,4,3);");
  EXPECT_EQ(Number(&APISearch::GetMaxScore), 204);
  ASSERT_EQ(search_->Close(), S_OK);
  ASSERT_EQ(search_->Execute(T("SELECT SCORE, id FROM docs WHERE [Docs='apple' ORDER BY SCORE] "
                               "AND id > 0")),
            S_OK)
      << LastError();
  EXPECT_EQ(Keys(), "204;(1);203;(2);202;(6,4,3);") << "the ORDER BY inside the condition";
  EXPECT_EQ(Sql(0, 0),
            "SELECT 204 as SCORE, id FROM docs WHERE id in (1)  AND id > 0 UNION ALL "
            "SELECT 203 as SCORE, id FROM docs WHERE id in (2)  AND id > 0 UNION ALL "
            "SELECT 202 as SCORE, id FROM docs WHERE id in (6,4,3)  AND id > 0 order by SCORE DESC");

  // Windows: rows 2..4; a start past the end is the empty result's string.
  EXPECT_EQ(Keys(2, 3), "203;(2);202;(6,4);");
  EXPECT_EQ(Number(&APISearch::GetNum), 3);
  EXPECT_EQ(Keys(9, 3), "0;());");
  EXPECT_EQ(Number(&APISearch::GetNum), 0);
  EXPECT_EQ(Number(&APISearch::GetTotal), 5);
  // SetLimits moves the window; GetNum follows at the next key string.
  ASSERT_EQ(search_->SetLimits(0, 2), S_OK);
  EXPECT_EQ(Keys(), "204;(1);203;(2);");
  ASSERT_EQ(search_->SetLimits(1, 5), S_OK);

  // Percentages of the highest score, rounded up only past one half:
  // 203 x 100 / 204 = 99.51 -> 100, 202 x 100 / 204 = 99.02 -> 99.
  ASSERT_EQ(search_->SetNumericOption(T("SCORE_RETURN"), 2), S_OK);
  EXPECT_EQ(Keys(), "100;(1);100;(2);99;(6,4,3);");
  ASSERT_EQ(search_->SetNumericOption(T("SCORE_RETURN"), -3), S_OK);
  EXPECT_EQ(Keys(), "204;(1);203;(2);202;(6,4,3);");

  // A group count rounds the scores to hundreds when the next order is set,
  // which puts every row into one group, cut to its first two keys. Equal
  // scores come out in the reverse of their order before the sort.
  ASSERT_EQ(search_->SetNumericOption(T("SCORE_GROUP_COUNT"), 2), S_OK);
  ASSERT_EQ(search_->OrderBy(T("SCORE DESC")), S_OK) << LastError();
  EXPECT_EQ(Keys(), "200;(3,4);");

  // Back to keys: the SQL order string names the key column.
  ASSERT_EQ(search_->OrderByEx(T("KEY DESC"), 0), S_OK) << LastError();
  EXPECT_EQ(Keys(), "(6,4,3,2,1)");
  ASSERT_EQ(search_->GetSqlOrderString(&text), S_OK);
  EXPECT_EQ(Utf16ToUtf8(text), "id DESC");
  // Without score groups the statement's SCORE column goes.
  EXPECT_EQ(Sql(), "SELECT  id FROM docs WHERE id in (6,4,3,2,1)  AND id > 0");
  ASSERT_EQ(search_->OrderBy(T("KEY DESC")), S_OK);
  EXPECT_EQ(Sql(), "SELECT  id FROM docs WHERE id in (6,4,3,2,1)  AND id > 0 order by id DESC");
  EXPECT_EQ(Sql(2, 2), "SELECT  id FROM docs WHERE id in (4,3)  AND id > 0 order by id DESC");
}

TEST_F(SearchObjectTest, OrderColumnsSortAndGroupTheResultSet) {
  Execute("Docs='apple' OR Docs='banana'");
  // The text order's ranks, then keys.
  BSTR text;
  ASSERT_EQ(search_->OrderBy(T("TITLES.TITLE, KEY DESC")), S_OK) << LastError();
  EXPECT_EQ(Keys(), "(4,5,2,6,3,1)");

  // Groups of equal titles: the value is the title's rank (apple, fig,
  // kiwi, pear), the count the rows of the title's run where it closes.
  ASSERT_EQ(search_->CollectGroups(), S_OK) << LastError();
  EXPECT_EQ(Number(&APISearch::GetTotalGroups), 6) << "every key is a group of its own";
  std::vector<std::pair<int32_t, int32_t>> groups;
  VARIANT_BOOL end = 7;
  for (int guard = 0; guard < 10; ++guard) {
    ASSERT_EQ(search_->IsEOB(&end), S_OK);
    if (end != 0) break;
    int32_t value = -1;
    int32_t count = -1;
    ASSERT_EQ(search_->GetValue(T("TITLES.TITLE"), &value), S_OK) << LastError();
    ASSERT_EQ(search_->GetCount(T("TITLES.TITLE"), &count), S_OK) << LastError();
    groups.emplace_back(value, count);
    ASSERT_EQ(search_->MoveNext(), S_OK);
  }
  // The property is the engine's 1, not VARIANT_TRUE.
  EXPECT_EQ(end, 1);
  EXPECT_EQ(groups, (std::vector<std::pair<int32_t, int32_t>>{
                        {0, 1}, {1, 0}, {1, 2}, {2, 1}, {3, 0}, {3, 2}}));
  ASSERT_EQ(search_->GetGroupString(T("TITLES.TITLE"), &text), S_OK) << LastError();
  EXPECT_EQ(Utf16ToUtf8(text), "(0,1,2,3)");

  // One level: a group a title. The group SQL takes the rows of the window's groups.
  ASSERT_EQ(search_->OrderBy(T("TITLES.TITLE DESC")), S_OK) << LastError();
  ASSERT_EQ(search_->CollectGroups(), S_OK) << LastError();
  EXPECT_EQ(Number(&APISearch::GetTotalGroups), 4);
  ASSERT_EQ(search_->GetGroupSql(2, 2, T("TITLES.TITLE"), &text), S_OK) << LastError();
  EXPECT_EQ(Utf16ToUtf8(text), "SELECT id FROM docs WHERE id in (6,2,5)  AND id > 0 "
                               "order by TITLES.TITLE DESC");
  EXPECT_EQ(Number(&APISearch::GetNumGroups), 2);
  ASSERT_EQ(search_->GetGroupSql(9, 2, T("TITLES.TITLE"), &text), S_OK) << LastError();
  EXPECT_EQ(Utf16ToUtf8(text), "") << "no group in the window";
  int32_t value = -1;
  ASSERT_EQ(search_->MoveNext(), S_OK);
  ASSERT_EQ(search_->MoveNext(), S_OK);
  ASSERT_EQ(search_->MovePrev(), S_OK);
  ASSERT_EQ(search_->GetValue(T("TITLES.TITLE"), &value), S_OK) << LastError();
  EXPECT_EQ(value, 2) << "the second group (kiwi)";
  const std::string unknown = Failure(search_->GetValue(T("NOPE.X"), &value));
  EXPECT_TRUE(unknown.starts_with("Error fetching value. Make sure the column has been ordered"))
      << unknown;
  EXPECT_NE(unknown.find("Group name not found"), std::string::npos) << unknown;
}

TEST_F(SearchObjectTest, SeveralCommandsShareOneResultSetAndItsKeyFile) {
  Execute("Plain='banana'");
  // Without -1 the open result set is refused.
  EXPECT_EQ(Failure(search_->ExecuteEx(T(Statement("Plain='pie'")), 1)),
            "A result set is already open. Please close the result set before opening a new "
            "one. (Module:GiStartPoint,Method:ExecuteW)");
  ASSERT_EQ(search_->ExecuteEx(T("SELECT id FROM other WHERE [Plain='apple']"), -1), S_OK)
      << LastError();
  EXPECT_EQ(Number(&APISearch::GetTotal), 7);
  EXPECT_EQ(Sql(), "SELECT id FROM docs WHERE id in (5,6)  AND id > 0 UNION ALL "
                   "SELECT id FROM other WHERE id in (1,2,3,4,6) ");
  BSTR keys;
  ASSERT_EQ(search_->GetRawKeyStringEx(0, 0, 1, &keys), S_OK);
  EXPECT_EQ(Utf16ToUtf8(keys), "(5,6)");
  ASSERT_EQ(search_->GetRawKeyStringEx(3, 3, 2, &keys), S_OK);
  EXPECT_EQ(Utf16ToUtf8(keys), "(1,2,3)");
  EXPECT_EQ(Failure(search_->GetRawKeyStringEx(0, 0, 3, &keys)),
            "Command number not executed (Module:GiStartPoint,Method:GetRawKeyString)");

  // The key file: command 1 by default, CR LF lines, one name per result set.
  BSTR first;
  ASSERT_EQ(search_->GetRawKeyFile(1, 10, &first), S_OK) << LastError();
  EXPECT_EQ(test::ReadFile(Utf16ToUtf8(first)), "5\r\n6\r\n");
  BSTR second;
  ASSERT_EQ(search_->GetRawKeyFileEx(1, 10, 2, &second), S_OK) << LastError();
  EXPECT_EQ(second, first);
  EXPECT_EQ(test::ReadFile(Utf16ToUtf8(second)), "1\r\n2\r\n3\r\n4\r\n6\r\n");
  ASSERT_EQ(search_->Close(), S_OK);

  // Scores in the key file, as percentages with SCORE_RETURN 2.
  Execute("Docs='apple'");
  ASSERT_EQ(search_->OrderBy(T("SCORE")), S_OK);
  ASSERT_EQ(search_->SetNumericOption(T("SCORE_RETURN"), 2), S_OK);
  BSTR scored;
  ASSERT_EQ(search_->GetRawKeyFile(1, 3, &scored), S_OK) << LastError();
  EXPECT_NE(scored, first);
  EXPECT_EQ(test::ReadFile(Utf16ToUtf8(scored)), "100,1\r\n100,2\r\n99,6\r\n");
}

TEST_F(SearchObjectTest, AFailedStatementKeepsItsCommandNumberAndTheRestKeepTheirs) {
  // Command 1 fails to parse and stays in the list; 2 and 3 hold the rows.
  EXPECT_NE(Failure(search_->ExecuteEx(T(Statement("Nope='x'")), -1)), "");
  ASSERT_EQ(search_->ExecuteEx(T(Statement("Plain='banana'")), -1), S_OK) << LastError();
  EXPECT_EQ(Keys(), "(5,6)");
  ASSERT_EQ(search_->ExecuteEx(T(Statement("Plain='pie'")), -1), S_OK) << LastError();
  BSTR keys;
  ASSERT_EQ(search_->GetRawKeyStringEx(0, 0, 2, &keys), S_OK) << LastError();
  EXPECT_EQ(Utf16ToUtf8(keys), "(5,6)");
  ASSERT_EQ(search_->GetRawKeyStringEx(0, 0, 1, &keys), S_OK) << LastError();
  EXPECT_EQ(Utf16ToUtf8(keys), "()");
  EXPECT_EQ(Keys(), "(1)");
  EXPECT_EQ(Sql(), "SELECT id FROM docs WHERE id in (5,6)  AND id > 0 UNION ALL "
                   "SELECT id FROM docs WHERE id in (1)  AND id > 0");
}

TEST_F(SearchObjectTest, ScoresAreAdjustedInRowOrder) {
  struct Case {
    double start, step;
    int32_t type, stop_count;
    VARIANT_BOOL stop_at_zero;
    std::string keys;
  };
  // Rows by score: 1 (204), 2 (203), 6, 4, 3 (202).
  // The adjustment itself is ResultOrderTest's; here the flag reaches it and
  // the new scores regroup the rows without sorting them again.
  const Case cases[] = {
      {10, 10, 0, 0, -1, "214;(1);203;(2);202;(6,4,3);"},
      {10, 10, 0, 0, 0, "214;(1);203;(2);192;(6);182;(4);172;(3);"},
  };
  for (const Case& c : cases) {
    Execute("Docs='apple'");
    ASSERT_EQ(search_->OrderBy(T("SCORE")), S_OK);
    ASSERT_EQ(search_->AdjustScoreEx(c.start, c.step, c.type, c.stop_count, c.stop_at_zero), S_OK)
        << LastError();
    EXPECT_EQ(Keys(), c.keys) << c.start << " " << c.step << " " << c.type;
    ASSERT_EQ(search_->Close(), S_OK);
  }
  // Without score support neither adjusts nor reports a maximum.
  Execute("Plain='apple'");
  EXPECT_NE(Failure(search_->AdjustScore(1, 0)).find("Error adjusting score."), std::string::npos);
  EXPECT_NE(Failure(search_->GetMaxScore(nullptr)).find("not ordered by score"), std::string::npos);
}

TEST_F(SearchObjectTest, WordListsCoverTheAddOnFindexes) {
  // An add-on findex of Plain over the titles.
  ASSERT_EQ(Run("CREATE FINDEX Extra ON TABLE docs COLUMNS title KEY id"), "");
  std::filesystem::copy_file(IndexFolder() + "EXTRA.sdx", IndexFolder() + "PLAIN_ADD_1.sdx");
  std::filesystem::copy_file(IndexFolder() + "EXTRA.fst", IndexFolder() + "PLAIN_ADD_1.fst");
  BSTR words;
  // Numbers 1 .. 1 + 3 in each findex: count + 1 words.
  ASSERT_EQ(search_->GetFindexWords(T("Plain"), 1, 3, &words), S_OK) << LastError();
  EXPECT_EQ(Utf16ToUtf8(words), "APPLE;BANANA;CRUMBLE;JUICE;APPLE;FIG;KIWI;PEAR");
  EXPECT_EQ(Number(&APISearch::GetNumWords), 3);
  EXPECT_EQ(Number(&APISearch::GetTotalWords), 4);
  ASSERT_EQ(search_->GetFindexWordsEx(T("Plain"), 1, 9, T("p*"), T(" "), &words), S_OK)
      << LastError();
  EXPECT_EQ(Utf16ToUtf8(words), "PIE PEAR");
  EXPECT_EQ(Number(&APISearch::GetTotalWords), 1);
  EXPECT_NE(Failure(search_->GetFindexWords(T("Numbers"), 1, 3, &words)).find("Index type must be Text"),
            std::string::npos);
  EXPECT_NE(Failure(search_->GetFindexWords(T("../Plain"), 1, 3, &words)).find("findex"),
            std::string::npos);
}

TEST_F(SearchObjectTest, EveryCallStatesWhatItNeeds) {
  int32_t n = 0;
  BSTR text;
  VARIANT_BOOL flag = 5;
  // Each names itself in the message.
  const std::vector<std::pair<std::string, std::function<HRESULT()>>> closed = {
      {"GetSql", [&] { return search_->GetSql(0, 0, &text); }},
      {"GetTotal", [&] { return search_->GetTotal(&n); }},
      {"GetNum", [&] { return search_->GetNum(&n); }},
      {"Close", [&] { return search_->Close(); }},
      {"GetTruncInfo", [&] { return search_->GetTruncInfo(&n); }},
      {"MoveNext", [&] { return search_->MoveNext(); }},
      {"MovePrev", [&] { return search_->MovePrev(); }},
      {"GetCount", [&] { return search_->GetCount(T("SCORE"), &n); }},
      {"GetGroupString", [&] { return search_->GetGroupString(T("SCORE"), &text); }},
      {"OrderBy", [&] { return search_->OrderBy(T("SCORE")); }},
      {"CollectGroups", [&] { return search_->CollectGroups(); }},
      {"IsEOB", [&] { return search_->IsEOB(&flag); }},
      {"GetRawKeyString", [&] { return search_->GetRawKeyString(0, 0, &text); }},
      {"SetLimits", [&] { return search_->SetLimits(1, 1); }},
      {"GetTotalGroups", [&] { return search_->GetTotalGroups(&n); }},
      {"GetNumGroups", [&] { return search_->GetNumGroups(&n); }},
      {"GetGroupSql", [&] { return search_->GetGroupSql(1, 1, T("SCORE"), &text); }},
      {"GetMaxScore", [&] { return search_->GetMaxScore(&n); }},
      {"AdjustScore", [&] { return search_->AdjustScore(1, 1); }},
      {"GetRawKeyFile", [&] { return search_->GetRawKeyFile(0, 0, &text); }},
      {"SetNumericOption", [&] { return search_->SetNumericOption(T("SCORE_RETURN"), 2); }},
      {"GetSqlOrderString", [&] { return search_->GetSqlOrderString(&text); }},
      {"GetSqlKeyName", [&] { return search_->GetSqlKeyName(&text); }},
  };
  for (const auto& [method, call] : closed) {
    EXPECT_EQ(Failure(call()), "No open result set (Module:GiStartPoint,Method:" + method + ")");
  }
  EXPECT_EQ(Failure(search_->GetValue(T("SCORE"), &n)),
            "GetValue: No open result set (Module:GiStartPoint,Method:GetValue)");
  // Before any result set: not truncated, and the words calls work.
  ASSERT_EQ(search_->IsTruncated(&flag), S_OK);
  EXPECT_EQ(flag, 0);
  EXPECT_EQ(Failure(search_->Execute(T(""))),
            "Nothing to execute (Module:GiStartPoint,Method:ExecuteW)");

  // A statement that fails leaves no result set open.
  EXPECT_NE(Failure(search_->Execute(T(Statement("Nope='x'")))), "");
  EXPECT_EQ(search_->GetTotal(&n), DISP_E_EXCEPTION);
  LastError();

  Execute("Plain='apple'");
  const std::vector<std::pair<std::string, std::string>> open = {
      {Failure(search_->SetGroup(T("OTHER"))),
       "Error: A result set is open, close the result set before changeing group. "
       "(Module:GiStartPoint,Method:SetGroup)"},
      {Failure(search_->SetDataPath(T(home_.Data()))),
       "A result set is open, close the result set before changing data path. "
       "(Module:GiStartPoint,Method:SetDataPath)"},
      {Failure(search_->SetNumericOption(T("score_return"), 2)),
       "Unknown Option score_return (Module:GiStartPoint,Method:SetNumericOption)"},
      {Failure(search_->GetValue(T("SCORE"), &n)),
       "Error fetching value. Make sure the column has been ordered "
       "(Module:GiStartPoint,Method:GetValue)\r\n"},
  };
  for (const auto& [got, want] : open) EXPECT_EQ(got.substr(0, want.size()), want);
  ASSERT_EQ(search_->Close(), S_OK);

  // A missing data path is refused and the old one stays in use.
  EXPECT_NE(Failure(search_->SetDataPath(T(home_.Data() + "missing"))).find("Data path does not exist"),
            std::string::npos);
  Execute("Plain='banana'");
  EXPECT_EQ(Keys(), "(5,6)");
}

TEST_F(SearchObjectTest, FailuresReachTheErrorInfoAndTheSearchObjectsTrace) {
  EXPECT_EQ(search_->ConnectToServer(T("search.example")), DISP_E_EXCEPTION);
  ErrorInfo info;
  ASSERT_TRUE(GetErrorInfo(info));
  EXPECT_EQ(Utf16ToUtf8(info.Source), "QuillmereAPI.APISearch.1");
  EXPECT_NE(Utf16ToUtf8(info.Description).find("search.example"), std::string::npos);
  std::string trace;
  for (const auto& entry : std::filesystem::directory_iterator(home_.Home() + "Log/")) {
    if (entry.path().filename().string().starts_with("trace_APISearch_")) {
      trace += test::ReadFile(entry.path().string());
    }
  }
  EXPECT_NE(trace.find("search.example"), std::string::npos);
}

}  // namespace
}  // namespace qm
