// The deleted-key file of a findex: damaged and unreadable lists refused
// without being touched; failed writes and replaces that keep the old list;
// the kind 1 locks taken.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <filesystem>
#include <initializer_list>
#include <string>
#include <vector>

#include "index/deleted_keys.h"
#include "locks/lock_manager.h"
#include "base/exception_family.h"
#include "support/file_test_util.h"
#include "config/global_defs.h"
#include "support/test_support.h"

namespace qm {
namespace {

namespace fs = std::filesystem;
using test::RaisedChain;
using test::RaisedText;

// 32-bit little-endian words, written out by hand: the count word first.
std::string Words(std::initializer_list<int64_t> words) {
  std::string bytes;
  for (int64_t w : words) {
    const auto u = static_cast<uint32_t>(w);
    for (int i = 0; i < 4; ++i) bytes += static_cast<char>((u >> (8 * i)) & 0xFF);
  }
  return bytes;
}

class DeletedKeyFileTest : public ::testing::Test {
 protected:
  DeletedKeyFileTest() { fs::create_directories(Indexes()); }
  ~DeletedKeyFileTest() override {
    SetDeletedKeysReplaceHookForTesting({});
    CLockManager::ScaleTimeoutsForTesting(1.0);
  }

  std::string Indexes() const { return home_.Data() + "Groups/PUBLIC/Indexes/"; }
  std::string Del(const std::string& upper_name) const { return Indexes() + upper_name + ".del"; }
  // Every file of the Indexes folder, so stray temporary files show.
  std::vector<std::string> Files() const {
    std::vector<std::string> names;
    for (const auto& entry : fs::directory_iterator(Indexes())) {
      names.push_back(entry.path().filename().string());
    }
    std::sort(names.begin(), names.end());
    return names;
  }
  std::string Damaged(const std::string& path, const char* method) const {
    return "Deleted-key file is damaged: " + path + " (Module:PiDelete,Method:" + method + ")";
  }

  test::ConfiguredHome home_;
  CGlobalDefs defs_;
};

TEST_F(DeletedKeyFileTest, DamagedListsAreRefusedAndKeptAsTheyWere) {
  const std::vector<std::pair<const char*, std::string>> damaged = {
      {"shorter than a count", std::string("\x01\x00", 2)},
      {"fewer keys than counted", Words({3, 10, 20})},
      {"a trailing partial key", Words({1, 10}) + "\x07"},
      {"keys out of order", Words({3, 10, 30, 20})},
      {"a repeated key", Words({2, 10, 10})},
  };
  for (const auto& [what, bytes] : damaged) {
    SCOPED_TRACE(what);
    test::WriteFile(Del("BOOKS"), bytes);
    EXPECT_EQ(RaisedText<CPiDeleteException>([&] { DeleteKey(defs_, "books", 15, true); }),
              Damaged(Del("BOOKS"), "DeleteKey"));
    EXPECT_EQ(RaisedText<CPiDeleteException>([&] { ReadDeletedKeys(defs_, "books"); }),
              Damaged(Del("BOOKS"), "ReadDeletedKeys"));
    EXPECT_EQ(test::ReadFile(Del("BOOKS")), bytes);
    EXPECT_EQ(Files(), std::vector<std::string>{"BOOKS.del"});
  }
  // An empty list written by hand is a sound one.
  test::WriteFile(Del("BOOKS"), Words({0}));
  DeleteKey(defs_, "books", 15, true);
  EXPECT_EQ(test::ReadFile(Del("BOOKS")), Words({1, 15}));
}

TEST_F(DeletedKeyFileTest, AListThatCannotBeReadIsNotTakenForAMissingOne) {
  fs::create_directories(Del("BOOKS") + "/inner");
  const auto chain = RaisedChain<CPiDeleteException>([&] { DeleteKey(defs_, "books", 1, true); });
  ASSERT_FALSE(chain.empty());
  EXPECT_NE(chain.front().find(Del("BOOKS")), std::string::npos) << chain.front();
  EXPECT_TRUE(fs::is_directory(Del("BOOKS") + "/inner"));
  EXPECT_EQ(Files(), std::vector<std::string>{"BOOKS.del"});
  EXPECT_FALSE(RaisedChain<CPiDeleteException>([&] { ReadDeletedKeys(defs_, "books"); }).empty());
}

TEST_F(DeletedKeyFileTest, AFailedReplaceKeepsTheOldList) {
  for (int32_t key : {10, 20}) DeleteKey(defs_, "books", key, true);
  std::string temp;
  SetDeletedKeysReplaceHookForTesting([&](const std::string& path) {
    temp = path;
    EXPECT_EQ(test::ReadFile(path), Words({3, 10, 15, 20}));  // the new list, complete
    fs::remove(path);  // the move now finds no source
  });
  const auto chain = RaisedChain<CPiDeleteException>([&] { DeleteKey(defs_, "books", 15, true); });
  EXPECT_EQ(chain, (std::vector<std::string>{
                       "General Error (Module:PiDelete,Method:DeleteKey)",
                       "Error renaming file: " + temp + " to " + Del("BOOKS") +
                           " (Module:WinFile,Method:RemoveFile)"}));
  EXPECT_EQ(test::ReadFile(Del("BOOKS")), Words({2, 10, 20}));
  EXPECT_EQ(ReadDeletedKeys(defs_, "books"), (std::vector<int32_t>{10, 20}));
}

TEST_F(DeletedKeyFileTest, AFailedWriteKeepsTheOldListAndLeavesNoTemporaryFile) {
  for (int32_t key : {10, 20, 30}) DeleteKey(defs_, "books", key, true);
  const std::string before = test::ReadFile(Del("BOOKS"));
  // The other process may write files of 16 bytes at most: the new list needs 20.
  std::string out;
  EXPECT_EQ(test::RunProgram({test::HelperPath("deleted_key_worker"), home_.Data(), "public",
                              "books", "delete-limited", "16", "15"},
                             &out),
            1);
  EXPECT_EQ(out.rfind("Error writing to file: " + Indexes() + "tmp", 0), 0u) << out;
  EXPECT_EQ(test::ReadFile(Del("BOOKS")), before);
  EXPECT_EQ(Files(), std::vector<std::string>{"BOOKS.del"});
}

TEST_F(DeletedKeyFileTest, ChangesWaitForReadersAndReadsWaitForChanges) {
  CLockManager::ScaleTimeoutsForTesting(0.002);
  DeleteKey(defs_, "books", 10, true);
  CLockManager other(home_.Data(), "PUBLIC", "BOOKS", kLockDeletedKeys);
  other.LockReader();  // a search reading BOOKS.del
  const auto chain = RaisedChain<CPiDeleteException>([&] { DeleteKey(defs_, "books", 20, true); });
  ASSERT_EQ(chain.size(), 2u);
  EXPECT_EQ(chain[1],
            "Timeout waiting for all read access to an index. Lock name: MORVIL_1_PUBLIC_BOOKS "
            "(Module:LockManager,Method:LockAllReaders)");
  EXPECT_FALSE(RaisedChain<CPiDeleteException>([&] { DropDeletedKeys(defs_, "books"); }).empty());
  EXPECT_EQ(ReadDeletedKeys(defs_, "books"), std::vector<int32_t>{10});  // readers share

  other.UnlockAll();
  other.LockExclusive();  // a delete in progress
  const auto read = RaisedChain<CPiDeleteException>([&] { ReadDeletedKeys(defs_, "books"); });
  ASSERT_EQ(read.size(), 2u);
  EXPECT_EQ(read[1],
            "Timeout waiting for single read access to an index. Lock name: MORVIL_1_PUBLIC_BOOKS "
            "(Module:LockManager,Method:LockReader)");
  other.UnlockAll();
  EXPECT_EQ(test::ReadFile(Del("BOOKS")), Words({1, 10}));
}

}  // namespace
}  // namespace qm
