// Updates of findexes from real data sources through the command object: the
// word-count thresholds between a rebuild and the add-on findexes, add-ons
// built with the stored definition and options, files an update must leave
// byte for byte, updates by the date/time key, and deleted keys.
#include <gtest/gtest.h>

#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <thread>
#include <tuple>
#include <variant>
#include <vector>

#include "support/data_source_fixture.h"
#include "support/findex_decoder.h"
#include "locks/lock_manager.h"
#include "format/bfile.h"
#include "format/index_header.h"

namespace qm {
namespace {

namespace fs = std::filesystem;

using test::Source;
using test::SourceName;

// The text of error 10 and of error 47, as the error-message file has them.
constexpr std::string_view kOptionsDoNotFit =
    "The requested options do not match the existing data";
constexpr std::string_view kNoRows = "No rows were selected for the findex";

class FindexUpdateTest : public test::DataSourceTest {
 protected:
  // The header of a findex (or add-on), read from its .sdx.
  CIndexHeader Header(const std::string& upper_name) const {
    BFile sdx;
    sdx.OpenFile(IndexFolder() + upper_name + ".sdx", BFile::kReadOnly, 64);
    CIndexHeader header;
    header.ReadInfo(sdx);
    return header;
  }

  // Every key with a posting in the findex (or add-on), decoded from its files.
  std::set<int32_t> Keys(const std::string& upper_name) const {
    const CIndexHeader header = Header(upper_name);
    const test::DecodedFindex decoded =
        test::DecodeFindex(IndexFolder() + upper_name + ".sdx", IndexFolder() + upper_name + ".fst",
                           header.FindexType, header.GeneralFlags & 3);
    EXPECT_EQ(decoded.faults, std::vector<std::string>{}) << upper_name;
    std::set<int32_t> keys;
    for (const test::Word& word : decoded.words) {
      for (const test::Posting& posting : word.postings) keys.insert(posting.front());
    }
    return keys;
  }

  // The bytes of index files; nullopt for a file that is not there.
  using Files = std::map<std::string, std::optional<std::string>>;
  Files Snapshot(const std::vector<std::string>& names) const {
    Files files;
    for (const std::string& name : names) {
      const std::string path = IndexFolder() + name;
      files[name] = fs::exists(path) ? std::optional(test::ReadFile(path)) : std::nullopt;
    }
    return files;
  }

  bool Exists(const std::string& file) const { return fs::exists(IndexFolder() + file); }

  // The deleted-key file's keys, decoded from its documented layout.
  std::vector<int32_t> DeletedKeys(const std::string& upper_name) const {
    const std::string bytes = test::ReadFile(IndexFolder() + upper_name + ".del");
    std::vector<int32_t> keys;
    if (bytes.size() < 4 || bytes.size() != 4 + 4 * static_cast<uint32_t>(test::LoadInt32(bytes, 0))) {
      ADD_FAILURE() << "a .del of " << bytes.size() << " bytes";
      return keys;
    }
    for (std::size_t at = 4; at < bytes.size(); at += 4) keys.push_back(test::LoadInt32(bytes, at));
    return keys;
  }

  static std::set<int32_t> Range(int32_t from, int32_t to) {
    std::set<int32_t> keys;
    for (int32_t k = from; k <= to; ++k) keys.insert(k);
    return keys;
  }
  // Waits until line has been traced times times: "Renaming index: NAME" is
  // written when a build's files are complete and about to move into place.
  void WaitForTrace(std::string_view line, int times) {
    auto count = [&] {
      const std::string text = TraceText();
      int n = 0;
      for (auto at = text.find(line); at != std::string::npos; at = text.find(line, at + 1)) ++n;
      return n;
    };
    for (int i = 0; i < 30000 && count() < times; ++i) {
      std::this_thread::sleep_for(std::chrono::milliseconds(2));
    }
    ASSERT_EQ(count(), times) << TraceText();
  }

  // A findex name of this process alone: lock names are shared by every
  // process, and these tests hold a findex's locks while other tests run.
  static std::string HeldName() { return "Held" + std::to_string(getpid()); }
};

TEST_P(FindexUpdateTest, WordCountThresholdsChooseARebuildOrTheFirstAddOnWithRoom) {
  // 1,999 words: an update rebuilds the findex whole and forgets its deleted keys.
  const std::string small = Table("small", "id integer, body varchar(100)");
  Insert(small, WordRows(1, 666));
  Insert(small, {"667, 'single'"});
  ASSERT_EQ(Run("CREATE FINDEX Small ON TABLE " + small + " COLUMNS body KEY id"), "");
  ASSERT_EQ(Info("Small", idxWordCount), "1999");
  ASSERT_EQ(Run("DELETE FROM FINDEX Small 5"), "");
  Insert(small, WordRows(668, 670));
  ASSERT_EQ(Run("UPDATE FINDEX Small"), "");
  EXPECT_FALSE(Exists("SMALL_ADD_1.sdx"));
  EXPECT_FALSE(Exists("SMALL.del"));
  EXPECT_EQ(Keys("SMALL"), Range(1, 670));
  EXPECT_EQ(Info("Small", idxWordCount), "2008");

  // 2,000 words: the new rows go to add-on 1; nothing new changes nothing.
  const std::string big = Table("big", "id integer, body varchar(100)");
  Insert(big, WordRows(1, 666));
  Insert(big, {"667, 'two words'"});
  ASSERT_EQ(Run("CREATE FINDEX Big ON TABLE " + big + " COLUMNS body KEY id"), "");
  ASSERT_EQ(Info("Big", idxWordCount), "2000");
  // 669 is deleted before its row exists.
  ASSERT_EQ(Run("DELETE FROM FINDEX Big 669"), "");
  const std::vector<std::string> main_files{"BIG.sdx", "BIG.fst", "BIG.del"};
  const Files before = Snapshot(main_files);
  ASSERT_EQ(Run("UPDATE FINDEX Big"), "");
  EXPECT_FALSE(Exists("BIG_ADD_1.sdx"));
  EXPECT_EQ(Snapshot(main_files), before);

  Insert(big, WordRows(668, 670));
  ASSERT_EQ(Run("UPDATE FINDEX Big"), "");
  EXPECT_EQ(Keys("BIG_ADD_1"), Range(668, 670));
  EXPECT_EQ(Snapshot(main_files), before) << "an add-on update leaves the findex and .del";
  // The deleted key came back with its row and stays deleted.
  EXPECT_EQ(DeletedKeys("BIG"), std::vector<int32_t>{669});

  // Add-on 1 with room takes the next rows too, built again from the findex's
  // highest key; at 2,000 words or more the rows after go to add-on 2.
  Insert(big, WordRows(671, 1337));
  ASSERT_EQ(Run("UPDATE FINDEX Big"), "");
  EXPECT_EQ(Keys("BIG_ADD_1"), Range(668, 1337));
  EXPECT_EQ(Info("Big_ADD_1", idxWordCount), "2010");
  EXPECT_FALSE(Exists("BIG_ADD_2.sdx"));
  EXPECT_EQ(Snapshot(main_files), before);

  Insert(big, WordRows(1338, 1339));
  const std::vector<std::string> kept{"BIG.sdx", "BIG.fst", "BIG.del", "BIG_ADD_1.sdx",
                                      "BIG_ADD_1.fst"};
  const Files with_add_on = Snapshot(kept);
  ASSERT_EQ(Run("UPDATE FINDEX Big"), "");
  EXPECT_EQ(Keys("BIG_ADD_2"), Range(1338, 1339));
  EXPECT_EQ(Snapshot(kept), with_add_on);
  EXPECT_EQ(Info("Big", idxFracmentationLevel), "2");
  EXPECT_EQ(Info("Big", idxKeyCount), "1339");

  // A rebuild takes every row into the findex and drops add-ons and deleted keys.
  ASSERT_EQ(Run("UPDATE FINDEX Big REBUILD"), "");
  EXPECT_EQ(Keys("BIG"), Range(1, 1339));
  for (const char* file : {"BIG.del", "BIG_ADD_1.sdx", "BIG_ADD_1.fst", "BIG_ADD_2.sdx"}) {
    EXPECT_FALSE(Exists(file)) << file;
  }

  // A drop takes the findex with its add-ons and deleted keys; an add-on
  // goes only with its findex.
  Insert(big, WordRows(1340, 1342));
  ASSERT_EQ(Run("UPDATE FINDEX Big"), "");
  ASSERT_EQ(Run("DELETE FROM FINDEX Big 3"), "");
  EXPECT_EQ(command_->DropFindex(T("Big_ADD_1")), DISP_E_EXCEPTION);
  EXPECT_NE(LastError().find("cannot be dropped by itself"), std::string::npos) << LastError();
  ASSERT_TRUE(Exists("BIG_ADD_1.sdx") && Exists("BIG.del"));
  ASSERT_EQ(Run("DROP FINDEX Big"), "");
  for (const char* file : {"BIG.sdx", "BIG.fst", "BIG.del", "BIG_ADD_1.sdx", "BIG_ADD_1.fst"}) {
    EXPECT_FALSE(Exists(file)) << file;
  }
  EXPECT_TRUE(Exists("SMALL.sdx"));
}

TEST_P(FindexUpdateTest, RebuildsReadEveryRowAndMustFindRows) {
  // Keys up to 0 leave SortMax at 0: no key range to update from, so even a
  // findex of 2,000 words or more is rebuilt and takes the lower key too.
  const std::string low = Table("low", "id integer, body varchar(100)");
  Insert(low, WordRows(-700, 0));
  ASSERT_EQ(Run("CREATE FINDEX Low ON TABLE " + low + " COLUMNS body KEY id"), "");
  ASSERT_EQ(Info("Low", idxWordCount), "2103");
  Insert(low, WordRows(-710, -701));
  ASSERT_EQ(Run("UPDATE FINDEX Low"), "");
  EXPECT_FALSE(Exists("LOW_ADD_1.sdx"));
  EXPECT_EQ(Keys("LOW"), Range(-710, 0));

  // A findex of nothing is refused; so is a rebuild that finds no row, and the
  // findex stays as it was.
  const std::string empty = Table("empty", "id integer, body varchar(100)");
  std::string text = Run("CREATE FINDEX Empty ON TABLE " + empty + " COLUMNS body KEY id");
  EXPECT_EQ(text.rfind(kNoRows, 0), 0u) << text;
  EXPECT_FALSE(Exists("EMPTY.sdx"));
  const std::string few = Table("few", "id integer, body varchar(100)");
  Insert(few, WordRows(1, 5));
  ASSERT_EQ(Run("CREATE FINDEX Few ON TABLE " + few + " COLUMNS body KEY id"), "");
  OnSource({"delete from " + few});
  const Files before = Snapshot({"FEW.sdx", "FEW.fst"});
  text = Run("UPDATE FINDEX Few");
  EXPECT_EQ(text.rfind(kNoRows, 0), 0u) << text;
  EXPECT_EQ(Snapshot({"FEW.sdx", "FEW.fst"}), before);
}

TEST_P(FindexUpdateTest, AddOnsAreBuiltWithTheStoredDefinitionAndOptions) {
  const std::string rows = Table("rows", "id integer, title varchar(50), body varchar(100)");
  std::vector<std::string> values;
  for (int32_t id = 1; id <= 700; ++id) {
    values.push_back(std::to_string(id) + ", 'running', 'w" + std::to_string(id) + "a w" +
                     std::to_string(id) + "b'");
  }
  Insert(rows, values);
  // Built with stemming, scores and phrases.
  ASSERT_EQ(command_->SetIndexLanguageOptions(2, VARIANT_TRUE, 0, VARIANT_TRUE, VARIANT_TRUE, 0),
            S_OK);
  ASSERT_EQ(command_->SetIndexGeneralOptions(VARIANT_TRUE, VARIANT_TRUE, 0, nullptr, VARIANT_TRUE,
                                             VARIANT_TRUE),
            S_OK);
  const std::string columns = " COLUMNS body:CONTENT_WEIGHT=2,title KEY id";
  ASSERT_EQ(Run("CREATE FINDEX Rows ON TABLE " + rows + columns), "");
  const CIndexHeader stored = Header("ROWS");

  // Current options without them must not change how the new rows are indexed.
  ASSERT_EQ(command_->SetIndexLanguageOptions(2, 0, 0, 0, 0, 0), S_OK);
  ASSERT_EQ(command_->SetIndexGeneralOptions(0, 0, 0, nullptr, VARIANT_TRUE, VARIANT_TRUE), S_OK);
  Insert(rows, {"701, 'running', 'fresh'"});
  const Files before = Snapshot({"ROWS.sdx", "ROWS.fst"});

  // An update must name the stored table, key and columns with their tags.
  for (const std::string& statement :
       {"UPDATE FINDEX Rows ON TABLE " + prefix_ + "other" + columns,
        "UPDATE FINDEX Rows ON TABLE " + rows + " COLUMNS body:CONTENT_WEIGHT=2,title KEY title",
        "UPDATE FINDEX Rows ON TABLE " + rows + " COLUMNS body:CONTENT_WEIGHT=3,title KEY id"}) {
    const std::string text = Run(statement);
    EXPECT_EQ(text.rfind(kOptionsDoNotFit, 0), 0u) << statement << "\n" << text;
    EXPECT_NE(text.find("findex Rows was built on table " + rows), std::string::npos) << text;
  }
  EXPECT_FALSE(Exists("ROWS_ADD_1.sdx"));
  EXPECT_EQ(Snapshot({"ROWS.sdx", "ROWS.fst"}), before);

  // Names are compared in upper case.
  ASSERT_EQ(Run("update findex ROWS on table " + ToUpper(rows) +
                " columns TITLE,BODY:content_weight=2 key ID"),
            "");
  const CIndexHeader add_on = Header("ROWS_ADD_1");
  EXPECT_EQ(add_on.GeneralFlags, stored.GeneralFlags);
  EXPECT_EQ(add_on.LanguageFlags, stored.LanguageFlags);
  EXPECT_EQ(add_on.Columns, stored.Columns);
  EXPECT_EQ(add_on.SortMax, 701);
  // Text words in the form the driver gives: UTF-16 only through the Unicode
  // PostgreSQL driver.
  const int32_t text_type = GetParam() == Source::PostgresUnicode ? 4 : 2;
  EXPECT_EQ(stored.FindexType, text_type);
  EXPECT_EQ(add_on.FindexType, text_type);
  const test::DecodedFindex decoded = test::DecodeFindex(
      IndexFolder() + "ROWS_ADD_1.sdx", IndexFolder() + "ROWS_ADD_1.fst", add_on.FindexType, 3);
  EXPECT_EQ(decoded.faults, std::vector<std::string>{});
  // Stemmed, with the body's weight: (word, key, weight) of each posting.
  std::vector<std::tuple<std::string, int32_t, int32_t>> postings;
  for (const test::Word& word : decoded.words) {
    for (const test::Posting& p : word.postings) {
      ASSERT_EQ(p.size(), 3u) << "key, weight and position";
      postings.emplace_back(test::WordText(word.value), p[0], p[1]);
    }
  }
  EXPECT_EQ(postings, (std::vector<std::tuple<std::string, int32_t, int32_t>>{{"FRESH", 701, 2},
                                                                              {"RUN", 701, 1}}));
  EXPECT_EQ(Snapshot({"ROWS.sdx", "ROWS.fst"}), before);
}

TEST_P(FindexUpdateTest, DateTimeKeyUpdatesSelectTheRowsChangedAfterTheLastOneRead) {
  const std::string dated = Table("dated", "id integer, body varchar(100), changed timestamp");
  std::vector<std::string> values;
  for (const std::string& row : WordRows(1, 699)) values.push_back(row + ", '2024-01-01 10:00:00'");
  values.push_back("700, 'last one', '2024-01-02 10:00:00'");
  Insert(dated, values);
  ASSERT_EQ(command_->SetIndexUpdateOptions(0, VARIANT_TRUE, 0), S_OK);
  const std::string select = "SELECT id, body, changed FROM " + dated;
  ASSERT_EQ(command_->CreateFindexEx(T("Dated"), T(select), T("body"), T("id"), VARIANT_TRUE,
                                     T("changed")),
            S_OK)
      << LastError();
  CIndexHeader header = Header("DATED");
  EXPECT_EQ(header.DateTimeKeyColumn, "changed");
  EXPECT_EQ(header.UpdateFlags, 1);
  EXPECT_EQ(header.MaxDateTimeKey, (DateTimeValue{2024, 1, 2, 10, 0, 0, 0}));

  // Fewer than 2,000 words: updates rebuild it.
  ASSERT_EQ(command_->CreateFindexEx(T("DatedFew"), T(select + " WHERE id <= 10"), T("body"),
                                     T("id"), VARIANT_TRUE, T("changed")),
            S_OK)
      << LastError();

  // A row of an old key changed later is read again; a new key with an older
  // time is not.
  OnSource({"update " + dated +
            " set body = 'changed text', changed = '2024-01-03 09:00:00' "
            "where id = 5"});
  Insert(dated,
         {"701, 'older time', '2024-01-01 12:00:00'", "702, 'newest row', '2024-01-04 08:30:15'"});
  // The stored options decide, not the current ones.
  ASSERT_EQ(command_->SetIndexUpdateOptions(0, 0, 0), S_OK);
  ASSERT_EQ(Run("UPDATE FINDEX Dated"), "");
  EXPECT_EQ(Keys("DATED_ADD_1"), (std::set<int32_t>{5, 702}));
  header = Header("DATED_ADD_1");
  EXPECT_EQ(header.MaxDateTimeKey, (DateTimeValue{2024, 1, 4, 8, 30, 15, 0}));
  EXPECT_EQ(header.DateTimeKeyColumn, "changed");
  // A rebuild reads every row, whatever their times.
  ASSERT_EQ(Run("UPDATE FINDEX DatedFew"), "");
  EXPECT_FALSE(Exists("DATEDFEW_ADD_1.sdx"));
  EXPECT_EQ(Keys("DATEDFEW"), Range(1, 10));
  EXPECT_EQ(Header("DATEDFEW").MaxDateTimeKey, (DateTimeValue{2024, 1, 3, 9, 0, 0, 0}));

  // The update key must be a date/time column.
  ASSERT_EQ(command_->SetIndexUpdateOptions(0, VARIANT_TRUE, 0), S_OK);
  EXPECT_EQ(command_->CreateFindexEx(T("Keyed"), T("SELECT id, body FROM " + dated), T("body"),
                                     T("id"), VARIANT_TRUE, T("id")),
            DISP_E_EXCEPTION);
  EXPECT_NE(LastError().find("DateTime key is not a datetime column"), std::string::npos)
      << LastError();
}

TEST_P(FindexUpdateTest, DeletesInAnyOrderLeaveASortedListWithoutDuplicates) {
  const std::string rows = Table("rows", "id integer, body varchar(100)");
  Insert(rows, WordRows(1, 40));
  const std::string create = "CREATE FINDEX Rows ON TABLE " + rows + " COLUMNS body KEY id";
  const std::vector<std::vector<int32_t>> orders{
      {40, 3, 2, 1}, {17, 5, 17, 33, 5, 2147483647, 9}};
  for (const std::vector<int32_t>& order : orders) {
    // Each CREATE starts without deleted keys.
    ASSERT_EQ(Run(create), "");
    EXPECT_FALSE(Exists("ROWS.del"));
    std::set<int32_t> expected;
    for (int32_t key : order) {
      ASSERT_EQ(Run("DELETE FROM FINDEX rows " + std::to_string(key)), "") << key;
      expected.insert(key);
    }
    EXPECT_EQ(DeletedKeys("ROWS"), std::vector<int32_t>(expected.begin(), expected.end()));
  }

  // Keys below 1 are refused, and the list stays as it was.
  const Files before = Snapshot({"ROWS.del"});
  EXPECT_NE(Run("DELETE FROM FINDEX Rows 0").find("Invalid key in DELETE FROM FINDEX"),
            std::string::npos);
  const std::string text = Run("DELETE FROM FINDEX Rows -3");
  EXPECT_EQ(text.rfind("Cannot delete key -3 from findex Rows: deleted keys must be 1 or above", 0),
            0u)
      << text;
  EXPECT_EQ(Snapshot({"ROWS.del"}), before);
  const std::string missing = Run("DELETE FROM FINDEX Rowz 5");
  EXPECT_EQ(missing.rfind("Cannot delete key 5: findex Rowz does not exist", 0), 0u) << missing;
  EXPECT_FALSE(Exists("ROWZ.del"));
}

TEST_P(FindexUpdateTest, AKeyDeletedWhileARebuildRunsStaysDeletedAfterIt) {
  const std::string rows = Table("rows", "id integer, body varchar(100)");
  Insert(rows, WordRows(1, 10));
  const std::string name = HeldName();
  ASSERT_EQ(Run("CREATE FINDEX " + name + " ON TABLE " + rows + " COLUMNS body KEY id"), "");
  // A search holds the rebuild back just before it moves into place, after
  // it has read row 3.
  CLockManager search(home_.Data(), "PUBLIC", name, kLockFindex);
  search.LockReader();
  ASSERT_EQ(command_->ExecuteEx(T("UPDATE FINDEX " + name + " REBUILD"), 0), S_OK);
  WaitForTrace("Renaming index: " + name, 2);  // the CREATE's, then the rebuild's
  OnSource({"delete from " + rows + " where id = 3"});
  APICommand deleter;
  ASSERT_EQ(deleter.SetDataPath(T(home_.Data())), S_OK);
  ASSERT_EQ(deleter.ExecuteEx(T("DELETE FROM FINDEX " + name + " 3"), 0), S_OK);
  const std::string upper = ToUpper(name);
  for (int i = 0; i < 50; ++i) {
    EXPECT_FALSE(Exists(upper + ".del")) << "the delete waits for the rebuild";
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
  search.UnlockReaders();
  test::WaitForJob(*command_);
  EXPECT_EQ(ErrorNumber(), 0) << ErrorMsg();
  test::WaitForJob(deleter);
  int32_t failed = -1;
  ASSERT_EQ(deleter.GetErrorNumber(&failed), S_OK);
  EXPECT_EQ(failed, 0);
  EXPECT_EQ(Keys(upper), Range(1, 10));
  EXPECT_EQ(DeletedKeys(upper), std::vector<int32_t>{3});
}

INSTANTIATE_TEST_SUITE_P(Sources, FindexUpdateTest,
                         ::testing::Values(Source::SQLite, Source::PostgresAnsi,
                                           Source::PostgresUnicode),
                         SourceName);

TEST_P(FindexUpdateTest, DateTimeFractionsReachTheLiteralOnlyWhenAsked) {
  const std::string timed = Table("timed", "id integer, body varchar(100), changed timestamp");
  std::vector<std::string> values;
  for (const std::string& row : WordRows(1, 699)) values.push_back(row + ", '2024-05-06 07:08:09'");
  values.push_back("700, 'quarter second', '2024-05-06 07:08:09.25'");
  Insert(timed, values);
  const std::string select = "SELECT id, body, changed FROM " + timed;
  ASSERT_EQ(command_->SetIndexUpdateOptions(0, VARIANT_TRUE, VARIANT_TRUE), S_OK);
  ASSERT_EQ(command_->CreateFindexEx(T("Fraction"), T(select), T("body"), T("id"), VARIANT_TRUE,
                                     T("changed")),
            S_OK)
      << LastError();
  ASSERT_EQ(command_->SetIndexUpdateOptions(0, VARIANT_TRUE, 0), S_OK);
  ASSERT_EQ(command_->CreateFindexEx(T("Whole"), T(select), T("body"), T("id"), VARIANT_TRUE,
                                     T("changed")),
            S_OK)
      << LastError();
  EXPECT_EQ(Header("FRACTION").MaxDateTimeKey, (DateTimeValue{2024, 5, 6, 7, 8, 9, 250000000}));

  Insert(timed, {"701, 'half second', '2024-05-06 07:08:09.5'"});
  ASSERT_EQ(Run("UPDATE FINDEX Fraction"), "");
  ASSERT_EQ(Run("UPDATE FINDEX Whole"), "");
  EXPECT_NE(TraceText().find("where changed>'2024-05-06 07:08:09.250000000'"), std::string::npos);
  EXPECT_EQ(Keys("FRACTION_ADD_1"), std::set<int32_t>{701});
  EXPECT_EQ(Header("FRACTION_ADD_1").MaxDateTimeKey,
            (DateTimeValue{2024, 5, 6, 7, 8, 9, 500000000}));
  // Cut to the second, the literal lies below the quarter second row too.
  EXPECT_EQ(Keys("WHOLE_ADD_1"), (std::set<int32_t>{700, 701}));
}

TEST_P(FindexUpdateTest, AnAddOnIsSwappedInOnlyWhenNoSearchReadsItsFindex) {
  const std::string rows = Table("rows", "id integer, body varchar(100)");
  Insert(rows, WordRows(1, 700));
  const std::string name = HeldName();
  ASSERT_EQ(Run("CREATE FINDEX " + name + " ON TABLE " + rows + " COLUMNS body KEY id"), "");
  Insert(rows, WordRows(701, 703));
  // A search of the findex holds a reader unit of its findex lock; the add-on
  // files are read under that lock.
  CLockManager search(home_.Data(), "PUBLIC", name, kLockFindex);
  search.LockReader();
  ASSERT_EQ(command_->ExecuteEx(T("UPDATE FINDEX " + name), 0), S_OK);
  const std::string add_on = ToUpper(name) + "_ADD_1";
  WaitForTrace("Renaming index: " + add_on, 1);
  for (int i = 0; i < 50; ++i) {
    EXPECT_FALSE(Exists(add_on + ".sdx"));
    EXPECT_LT(Progress(), 100);
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
  search.UnlockReaders();
  test::WaitForJob(*command_);
  EXPECT_EQ(ErrorNumber(), 0) << ErrorMsg();
  EXPECT_EQ(Keys(add_on), Range(701, 703));
}

}  // namespace
}  // namespace qm
