// Findex builds in a data directory: builds without entries, failures that
// leave the old findex and no temporary file, and readers during rebuilds.
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <filesystem>
#include <functional>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "index/file_swap.h"
#include "index/findex_file_set.h"
#include "index/findex_files_writer.h"
#include "index/findex_writer.h"
#include "support/findex_decoder.h"
#include "locks/lock_manager.h"
#include "support/raised_error.h"
#include "base/error_messages.h"
#include "base/exception_family.h"
#include "config/global_defs.h"
#include "sources/share_database.h"
#include "support/test_support.h"

namespace qm {
namespace {

namespace fs = std::filesystem;
using test::Entry;

std::vector<Entry> Words(const std::string& prefix, int count, std::size_t length = 8) {
  std::vector<Entry> entries;
  for (int i = 0; i < count; ++i) {
    std::string word = prefix + std::to_string(100000 + i);
    word.resize(std::max(word.size(), length), 'q');
    entries.push_back(Entry{word, i + 1, 2, 1});
    entries.push_back(Entry{word, i + 7, 1, 3});
  }
  return entries;
}

class FindexBuildTest : public ::testing::Test {
 protected:
  FindexBuildTest() {
    fs::create_directories(Indexes());
    fs::create_directories(home_.Data() + "Groups/PUBLIC/Config");
    LoadErrorMessagesFromFile(std::string(QM_SOURCE_DATA_DIR) + "System/mrvconf.ini");
  }
  ~FindexBuildTest() override {
    SetFindexLimitsForTesting({});
    file_swap::SetRenameHookForTesting({});
    CLockManager::ScaleTimeoutsForTesting(1.0);
  }

  std::string Indexes() const { return home_.Data() + "Groups/PUBLIC/Indexes/"; }
  void Build(const std::string& name, const std::vector<Entry>& entries, bool rebuild,
             int32_t flags = 3) {
    test::WriteSortedFile(scratch_.Path() + "sorted", entries, flags);
    MFile sorted;
    sorted.OpenFile(scratch_.Path() + "sorted", MFile::kReadOnly);
    CIndexHeader definition;
    definition.IndexName = name;
    definition.GeneralFlags = flags;
    definition.FindexType = 2;
    definition.SortMax = 77;
    CPiFIndex(defs_).BuildFromSorted(definition, sorted, rebuild);
  }
  std::set<std::string> Files() const {
    std::set<std::string> names;
    for (const auto& f : fs::directory_iterator(Indexes()))
      names.insert(f.path().filename().string());
    return names;
  }
  std::string Bytes(const std::string& file) const { return test::ReadFile(Indexes() + file); }
  test::DecodedFindex Decode(const std::string& upper_name) const {
    return test::DecodeFindex(Indexes() + upper_name + ".sdx", Indexes() + upper_name + ".fst", 2,
                              3);
  }

  test::ConfiguredHome home_;
  test::ScratchDir scratch_{"findex-build"};
  CGlobalDefs defs_;
};

TEST_F(FindexBuildTest, BuildsFromTableRows) {
  fs::create_directories(home_.Data() + "Groups/PUBLIC/WorkData");
  defs_.SetConnectionString("Driver=SQLite3;Database=" + scratch_.Path() + "rows.db;StepAPI=1", "");
  auto run = [&](const std::string& sql) {
    CShareDatabase db(defs_);
    db.Connect();
    int16_t columns = 0;
    db.ExecuteSql(sql, columns);
  };
  run("CREATE TABLE docs (id INTEGER, body TEXT)");
  run("INSERT INTO docs VALUES (1, 'alpha beta'), (2, 'beta gamma beta'), (3, NULL)");
  CIndexHeader definition;
  definition.IndexName = "Docs";
  definition.TableName = "docs";
  definition.KeyColumn = "id";
  definition.Columns["body"] = {};
  definition.GeneralFlags = 7;  // scores, positions, default separators
  definition.LanguageFlags = 0;
  CPiFIndex(defs_).BuildRowFindex(definition, true);
  EXPECT_EQ(definition.KeyCount, 3);
  EXPECT_EQ(definition.SortMax, 3);
  const std::string sdx = Bytes("DOCS.sdx");

  // A sort that fails leaves the findex and no file behind.
  definition.SortMax = 0;  // rebuilds read every row
  definition.TableName = "missing";
  EXPECT_NE(test::Raised<CPiFIndexException>([&] {
              CPiFIndex(defs_).BuildRowFindex(definition, true);
            }).text,
            "");
  EXPECT_EQ(Files(), (std::set<std::string>{"DOCS.fst", "DOCS.sdx"}));
  EXPECT_EQ(Bytes("DOCS.sdx"), sdx);
  EXPECT_TRUE(fs::is_empty(home_.Data() + "Groups/PUBLIC/WorkData"));

  // Rows that give no word rebuild the findex empty.
  definition.TableName = "docs";
  run("UPDATE docs SET body = NULL");
  CPiFIndex(defs_).BuildRowFindex(definition, true);
  const test::DecodedFindex empty = Decode("DOCS");
  EXPECT_EQ(empty.faults, std::vector<std::string>{});
  EXPECT_EQ(empty.block_num, 1);
  EXPECT_TRUE(empty.words.empty());
  EXPECT_EQ(Bytes("DOCS.fst"), "");
}

TEST_F(FindexBuildTest, FailedBuildsLeaveTheFindexAsItWasAndNoTemporaryFile) {
  Build("Books", Words("old", 40), true);
  test::WriteFile(Indexes() + "BOOKS.del", std::string("\x01\0\0\0\x05\0\0\0", 8));
  const auto files = Files();
  const std::string sdx = Bytes("BOOKS.sdx");
  const std::string fst = Bytes("BOOKS.fst");

  struct Case {
    const char* name;
    std::function<void()> arrange;
    std::vector<Entry> entries;
    const char* raised;  // part of the outermost text
  };
  FindexLimits few_blocks;
  few_blocks.max_block_number = 10;
  FindexLimits few_bytes;
  few_bytes.max_fst_bytes = 500;
  int renames = 0;
  CLockManager reader(home_.Data(), "PUBLIC", "Books", kLockFindex);
  const std::vector<Case> cases = {
      {"block numbers", [&] { SetFindexLimitsForTesting(few_blocks); }, Words("x", 300, 400),
       "16-bit block numbers"},
      {"positions", [&] { SetFindexLimitsForTesting(few_bytes); }, Words("x", 300),
       "32-bit positions"},
      {"rename",
       [&] {
         SetFindexLimitsForTesting({});
         file_swap::SetRenameHookForTesting([&](const std::string& target) {
           return target.ends_with("/BOOKS.fst") && ++renames == 1;
         });
       },
       Words("x", 30), "Error renaming index file"},
      {"readers",
       [&] {
         file_swap::SetRenameHookForTesting({});
         reader.LockReader();
         CLockManager::ScaleTimeoutsForTesting(0.001);
       },
       Words("x", 30), "Could not get exclusive access to findex BOOKS"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.name);
    c.arrange();
    EXPECT_NE(test::Raised<CPiFIndexException>([&] {
                Build("Books", c.entries, true);
              }).text.find(c.raised),
              std::string::npos);
    EXPECT_EQ(Files(), files);
    EXPECT_EQ(Bytes("BOOKS.sdx"), sdx);
    EXPECT_EQ(Bytes("BOOKS.fst"), fst);
  }
  EXPECT_EQ(renames, 2);  // the failed move, then the old file's way back
}

TEST_F(FindexBuildTest, OpenReadsOnlyExistingFindexesAndNeverTruncates) {
  Build("Books", Words("w", 5), true);
  const auto files = Files();
  const std::string sdx = Bytes("BOOKS.sdx");
  CPiFIndex findex(defs_);
  EXPECT_NE(test::Raised<CPiFIndexException>([&] { findex.Open("Missing", 3); }).text, "");
  // Modes that create or truncate never touch an existing findex.
  for (int32_t mode : {1, 2, 5}) {
    EXPECT_NE(test::Raised<CPiFIndexException>([&] {
                findex.Open("Books", mode);
              }).text.find("Unknown index mode"),
              std::string::npos);
  }
  EXPECT_FALSE(findex.IsOpen());
  EXPECT_EQ(Files(), files);
  EXPECT_EQ(Bytes("BOOKS.sdx"), sdx);
}

TEST_F(FindexBuildTest, ReadersUnderTheFindexLockSeeTheWholeOldOrNewFindex) {
  const auto small = Words("small", 300);
  const auto large = Words("large", 3000);
  const auto small_words = test::ExpectedWords(small, 3);
  const auto large_words = test::ExpectedWords(large, 3);
  Build("Books", small, true);
  // Slow renames give a reader that ignored the lock every chance to meet a
  // findex half moved.
  file_swap::SetRenameHookForTesting([](const std::string&) {
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
    return false;
  });

  std::atomic<bool> building{true};
  std::atomic<int> reads{0};
  std::vector<std::string> seen_faults;
  std::thread reader([&] {
    while (building.load()) {
      CLockManager lock(home_.Data(), "PUBLIC", "Books", kLockFindex);
      lock.LockReader();
      const test::DecodedFindex decoded = Decode("BOOKS");
      lock.UnlockReaders();
      if (!decoded.faults.empty()) seen_faults.push_back(decoded.faults.front());
      if (decoded.words != small_words && decoded.words != large_words)
        seen_faults.push_back("mixed");
      ++reads;
      // Pacing, so the builder's wait for every reader unit is not starved.
      std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
  });
  for (int i = 0; i < 12; ++i) Build("Books", i % 2 == 0 ? large : small, true);
  // The reader gets at least one look at the last findex.
  const int before = reads.load();
  while (reads.load() < before + 2) std::this_thread::yield();
  building = false;
  reader.join();
  EXPECT_EQ(seen_faults, std::vector<std::string>{});
  EXPECT_EQ(Decode("BOOKS").words, small_words);
}

}  // namespace
}  // namespace qm
