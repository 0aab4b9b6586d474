// The engine's work on existing findexes and orders, given as header files:
// information values summed over add-ons, existence, stored options, the
// option check of updates, and drops waiting for their locks.
#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <thread>

#include "build/data_source_fixture.h"
#include "build/command_locks.h"
#include "build/command_type.h"
#include "locks/lock_manager.h"
#include "shared/bfile.h"
#include "shared/index_header.h"
#include "shared/order_info.h"

namespace qm {
namespace {

namespace fs = std::filesystem;
using test::CommandFixture;

class FindexCommandsTest : public CommandFixture {
 protected:
  // A findex without words: its header in block 0 and an empty posting file,
  // under the upper-cased name as the engine forms file names.
  void WriteFindex(const std::string& file_name, const CIndexHeader& header) {
    BFile sdx;
    sdx.OpenFile(IndexFolder() + file_name + ".sdx", BFile::kCreate, 64);
    header.WriteInfo(sdx);
    sdx.Close();
    test::WriteFile(IndexFolder() + file_name + ".fst", "");
  }

  void WriteOrder(const std::string& file_name, const COrderInfo& info) {
    fs::create_directories(GroupFolder() + "Orders");
    BFile sri;
    sri.OpenFile(GroupFolder() + "Orders/" + file_name + ".sri", BFile::kCreate, 64);
    info.WriteInfo(sri);
    sri.Close();
  }

  static CIndexHeader Books(int32_t word_count, int32_t sort_max) {
    CIndexHeader h;
    h.BlockNum = 1;
    h.BuildState = 1;
    h.FindexType = 2;
    h.IndexName = "Books";
    h.TableName = "books";
    h.KeyColumn = "id";
    h.Columns["body"] = {};
    h.Columns["title"] = {{"CONTENT_WEIGHT", "3"}};
    h.WordCount = word_count;
    h.SortMax = sort_max;
    h.KeyCount = 10;
    h.DistinctWordCount = 7;
    h.GeneralFlags = 14;
    return h;
  }

  std::string Info(int32_t value) {
    BSTR text = u"untouched";
    EXPECT_EQ(command_->GetFindexInfo(value, &text), S_OK) << LastError();
    return Utf16ToUtf8(text);
  }

  // The decision the engine took for the last findex command, as it traced it.
  bool Traced(std::string_view line) const { return TraceText().find(line) != std::string::npos; }
};

TEST_F(FindexCommandsTest, EveryInformationValue) {
  CIndexHeader h = Books(3000, 900);
  h.SqlUsedAsTable = 1;
  h.SqlSelect = "SELECT ID, Title FROM Books WHERE Shelf = 'A'";
  h.ConnectionString = "Driver=SQLite3;Database=/x/Books.db;";
  h.DisplayName = "My Books";
  h.BuildTime = {2024, 3, 9, 14, 5, 7, 0};
  h.LastUpdateTime = {2025, 12, 31, 23, 59, 58, 0};
  WriteFindex("BOOKS", h);
  CIndexHeader add_on_1 = Books(2500, 1200);
  add_on_1.KeyCount = 4;
  add_on_1.DistinctWordCount = 5;
  WriteFindex("BOOKS_ADD_1", add_on_1);
  CIndexHeader add_on_2 = Books(10, 1300);
  add_on_2.KeyCount = 1;
  add_on_2.DistinctWordCount = 2;
  WriteFindex("BOOKS_ADD_2", add_on_2);
  // The walk stops at the first missing add-on: number 4 is never counted.
  WriteFindex("BOOKS_ADD_4", Books(100000, 1));

  // Any case of the name finds the upper-cased files; counts add up the
  // add-ons, texts are lower-cased.
  ASSERT_EQ(command_->SetCurrentObjectName(T("books")), S_OK);
  EXPECT_EQ(Info(idxTypeName), "Text (Ansi)");
  EXPECT_EQ(Info(idxWordCount), "5510");
  EXPECT_EQ(Info(idxDistinctWordCount), "14");
  EXPECT_EQ(Info(idxKeyCount), "15");
  EXPECT_EQ(Info(idxFracmentationLevel), "2");
  EXPECT_EQ(Info(idxSQLUsedAsTable), "Yes");
  EXPECT_EQ(Info(idxSQLSelect), "select id, title from books where shelf = 'a'");
  EXPECT_EQ(Info(idxDBConnectionString), "Driver=SQLite3;Database=/x/Books.db;");
  EXPECT_EQ(Info(idxDBDisplayName), "my books");
  EXPECT_EQ(Info(idxBuildTime), "2024-3-9 14:5:7");
  EXPECT_EQ(Info(idxLastUpdateTime), "2025-12-31 23:59:58");
  EXPECT_EQ(Info(4), "");

  // Types without a word source; a connection that was not saved.
  ASSERT_EQ(command_->SetCurrentObjectName(T("Typed")), S_OK);
  for (const auto& [type, name] : {std::pair{4, "Text (Unicode)"}, {0, "Error"}, {5, "Error"}}) {
    CIndexHeader h = Books(1, 1);
    h.FindexType = type;
    h.GeneralFlags = 6;  // the connection is not saved
    h.ConnectionString = "DSN=x;PWD=secret;";
    WriteFindex("TYPED", h);
    EXPECT_EQ(Info(idxTypeName), name) << type;
  }
  EXPECT_EQ(Info(idxDBConnectionString), "");
}

TEST_F(FindexCommandsTest, ExistenceAndStoredOptions) {
  LayOutGroup("OTHER");
  CIndexHeader h = Books(1, 1);
  h.Language = lngGerman;
  h.LanguageFlags = 1 | 16;
  h.GeneralFlags = 1 | 32;
  h.Separators = u"\t-";
  h.IndexMaxSize = 4;
  h.UpdateFlags = 2;
  h.UpdateSupport = 6;
  WriteFindex("BOOKS", h);

  VARIANT_BOOL exists = 0;
  ASSERT_EQ(command_->FindexExist(T("Books"), T("Other"), &exists), S_OK);
  EXPECT_EQ(exists, VARIANT_FALSE);
  ASSERT_EQ(command_->FindexExist(T("BOOKS"), T("public"), &exists), S_OK);
  EXPECT_EQ(exists, VARIANT_TRUE);
  // Without its posting file a findex does not open.
  fs::remove(IndexFolder() + "BOOKS.fst");
  ASSERT_EQ(command_->FindexExist(T("Books"), T("PUBLIC"), &exists), S_OK);
  EXPECT_EQ(exists, VARIANT_FALSE);
  test::WriteFile(IndexFolder() + "BOOKS.fst", "");

  ASSERT_EQ(command_->SetCurrentObjectName(T("Books")), S_OK);
  auto stored = [&](auto getter, int32_t option) {
    BSTR text;
    EXPECT_EQ((command_.get()->*getter)(option, VARIANT_FALSE, &text), S_OK) << LastError();
    return Utf16ToUtf8(text);
  };
  EXPECT_EQ(stored(&APICommand::GetIndexLanguageOption, iloLanguage), "7");
  EXPECT_EQ(stored(&APICommand::GetIndexLanguageOption, iloUseStemming), "1");
  EXPECT_EQ(stored(&APICommand::GetIndexLanguageOption, iloRemoveAccent), "0");
  EXPECT_EQ(stored(&APICommand::GetIndexGeneralOption, igoUseUnicode), "1");
  EXPECT_EQ(stored(&APICommand::GetIndexGeneralOption, igoSupportPhrases), "0");
  EXPECT_EQ(stored(&APICommand::GetIndexGeneralOption, igoSeparators), "<TAB>-");
  EXPECT_EQ(stored(&APICommand::GetIndexGeneralOption, igoIndexMaxSize), "4");
  EXPECT_EQ(stored(&APICommand::GetIndexUpdateOption, iuoUseDateTimeFraction), "1");
  EXPECT_EQ(stored(&APICommand::GetIndexUpdateOption, iuoUpdateSupport), "6");
  // The current options are not touched by reading stored ones.
  BSTR text;
  ASSERT_EQ(command_->GetIndexLanguageOption(iloLanguage, VARIANT_TRUE, &text), S_OK);
  EXPECT_EQ(text, u"2");
}

TEST_F(FindexCommandsTest, OrderInformationIsLowerCased) {
  COrderInfo info;
  info.OrderType = 1;
  info.OrderName = "Titles";
  info.TableName = "Books";
  info.SqlSelect = "SELECT Id, Title FROM Books";
  info.SqlUsedAsTable = 1;
  info.Columns = {{"Title", {}}, {"Year", {}}};
  info.KeyColumn = "ID";
  info.ConnectionString = "DSN=Shop;UID=Ann;";
  info.DisplayName = "SHOP";
  info.GeneralFlags = 1;
  info.IgnoreChars = u"-_";
  info.UpdateFlags = 1;
  WriteOrder("TITLES", info);
  ASSERT_EQ(command_->SetCurrentObjectName(T("titles")), S_OK);
  auto order = [&](int32_t value) {
    BSTR text = u"untouched";
    EXPECT_EQ(command_->GetOrderInfo(value, &text), S_OK) << LastError();
    return Utf16ToUtf8(text);
  };
  EXPECT_EQ(order(odrTableName), "books");
  EXPECT_EQ(order(odrColumnNames), "title,year");
  EXPECT_EQ(order(odrKeyName), "id");
  EXPECT_EQ(order(odrTypeName), "integer");
  EXPECT_EQ(order(odrType), "1");
  EXPECT_EQ(order(odrVersion), "6.14");
  EXPECT_EQ(order(odrSQLUsedAsTable), "yes");
  EXPECT_EQ(order(odrSQLSelect), "select id, title from books");
  EXPECT_EQ(order(odrDBConnectionString), "dsn=shop;uid=ann;");
  EXPECT_EQ(order(odrDBDisplayName), "shop");
  EXPECT_EQ(order(idxWordCount), "");
  info.OrderType = 2;
  WriteOrder("TITLES", info);
  EXPECT_EQ(order(odrTypeName), "text");

  BSTR text;
  ASSERT_EQ(command_->GetOrderGeneralOption(ogoIgnoreChars, VARIANT_FALSE, &text), S_OK);
  EXPECT_EQ(text, u"-_");
  ASSERT_EQ(command_->GetOrderGeneralOption(ogoIgnorreCase, VARIANT_FALSE, &text), S_OK);
  EXPECT_EQ(text, u"1");
  ASSERT_EQ(command_->GetOrderUpdateOption(ouoUseDateTimeKey, VARIANT_FALSE, &text), S_OK);
  EXPECT_EQ(text, u"1");
}

TEST_F(FindexCommandsTest, UpdateCannotAddScoreOrPhrasesTheFindexWasBuiltWithout) {
  CIndexHeader h = Books(5000, 10);
  h.GeneralFlags = 4 | 8;  // neither scores nor phrases
  WriteFindex("BOOKS", h);
  ASSERT_EQ(command_->SetIndexGeneralOptions(-1, 0, 0, nullptr, -1, -1), S_OK);
  const std::string text = Run("UPDATE FINDEX Books ON TABLE books COLUMNS body KEY id");
  EXPECT_EQ(text.rfind("The requested options do not match the existing data", 0), 0u) << text;
  EXPECT_EQ(Run("UPDATE FINDEX Books ON TABLE books COLUMNS body KEY id REBUILD"), text);
  EXPECT_FALSE(Traced("Status 2."));
  // The stored definition brings its own options.
  Run("UPDATE FINDEX Books");
  EXPECT_TRUE(Traced("Status 2. IndexBuildName: BOOKS_ADD_1, Rebuild: 0, SortMax: 10"));
  // So does CREATE from the stored definition: a rebuild reads every row.
  Run("CREATE FINDEX Books");
  EXPECT_TRUE(Traced("Status 2. IndexBuildName: Books, Rebuild: 1, SortMax: 0"));
}

TEST_F(FindexCommandsTest, DropWaitsForBuildsAndSearchesOfTheFindex) {
  WriteFindex("BOOKS", Books(1, 1));
  // A build of the findex holds its CREATE lock.
  CLockManager build(CommandLockName(kCmdFindexDefined, "BOOKS"));
  build.LockWriter();
  ASSERT_EQ(command_->ExecuteEx(T("DROP FINDEX Books"), 0), S_OK);
  // A search of the findex holds a reader unit.
  CLockManager search("PUBLIC", "Books", kLockFindex);
  search.LockReader();
  build.UnlockWriter();
  // The drop cannot finish while the search reads.
  for (int i = 0; i < 50; ++i) {
    EXPECT_EQ(Progress(), 0);
    EXPECT_TRUE(fs::exists(IndexFolder() + "BOOKS.sdx"));
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
  search.UnlockReaders();
  test::WaitForJob(*command_);
  EXPECT_EQ(ErrorNumber(), 0) << ErrorMsg();
  EXPECT_FALSE(fs::exists(IndexFolder() + "BOOKS.sdx"));
}

}  // namespace
}  // namespace qm
