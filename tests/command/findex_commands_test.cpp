// The engine's work on existing findexes, given as header files: existence,
// stored options, the option check of updates, and drops waiting for their
// locks.
#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <thread>

#include "support/data_source_fixture.h"
#include "command/command_locks.h"
#include "command/command_type.h"
#include "locks/lock_manager.h"
#include "format/bfile.h"
#include "format/index_header.h"

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

TEST_F(FindexCommandsTest, ExistenceAndStoredOptions) {
  CIndexHeader h = Books(1, 1);
  h.Language = lngGerman;
  h.GeneralFlags = 1 | 32;
  h.Separators = u"\t-";
  WriteFindex("BOOKS", h);

  VARIANT_BOOL exists = 0;
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
  EXPECT_EQ(stored(&APICommand::GetIndexGeneralOption, igoUseUnicode), "1");
  EXPECT_EQ(stored(&APICommand::GetIndexGeneralOption, igoSeparators), "<TAB>-");
  // The current options are not touched by reading stored ones.
  BSTR text;
  ASSERT_EQ(command_->GetIndexLanguageOption(iloLanguage, VARIANT_TRUE, &text), S_OK);
  EXPECT_EQ(text, u"2");
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
  CLockManager build(home_.Data(), CommandLockName(kCmdFindexDefined, "BOOKS"));
  build.LockWriter();
  ASSERT_EQ(command_->ExecuteEx(T("DROP FINDEX Books"), 0), S_OK);
  // A search of the findex holds a reader unit.
  CLockManager search(home_.Data(), "PUBLIC", "Books", kLockFindex);
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
