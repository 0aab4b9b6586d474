// The findex check finds each kind of damage a findex can suffer, naming its
// place, and finds none in a findex written whole.
#include <gtest/gtest.h>

#include <filesystem>
#include <functional>
#include <random>
#include <string>
#include <vector>

#include "base/byte_layout.h"
#include "config/global_defs.h"
#include "format/mfile.h"
#include "index/findex_files_writer.h"
#include "platform/file_io.h"
#include "search/findex_check.h"
#include "support/findex_decoder.h"
#include "support/test_support.h"

namespace qm {
namespace {

constexpr int kBlock = 4096;

class FindexCheckTest : public ::testing::Test {
 protected:
  void SetUp() override {
    std::filesystem::create_directories(Folder());
    defs_.SetDataPath(dir_.Path());
    defs_.SetGroup("PUBLIC");
    // Sixty long words of three postings each: several leaves under one
    // level-3 node, so the chain and the tree both have something to break.
    std::vector<test::Entry> entries;
    for (int w = 0; w < 60; ++w) {
      std::string word = "w" + std::to_string(100 + w);
      word.resize(300, 'x');
      for (int key = 1; key <= 3; ++key) entries.push_back(test::Entry{word, key * 10, 1, w});
    }
    test::WriteSortedFile(dir_.Path() + "sorted", entries, kFlags);
    MFile sorted;
    sorted.OpenFile(dir_.Path() + "sorted", MFile::kReadOnly);
    CIndexHeader header;
    header.IndexName = "BOOKS";
    header.GeneralFlags = kFlags;
    header.FindexType = 2;
    WriteFindexFiles(header, sorted, Sdx(), Fst(), FindexLimits{});
  }

  std::string Folder() const { return dir_.Path() + "Groups/PUBLIC/Indexes/"; }
  std::string Sdx() const { return Folder() + "BOOKS.sdx"; }
  std::string Fst() const { return Folder() + "BOOKS.fst"; }

  static void Patch(const std::string& path, int64_t at, const std::string& bytes) {
    std::string all = test::ReadFile(path);
    all.replace(static_cast<std::size_t>(at), bytes.size(), bytes);
    test::WriteFile(path, all);
  }
  static void Cut(const std::string& path, int64_t size) {
    test::WriteFile(path, test::ReadFile(path).substr(0, static_cast<std::size_t>(size)));
  }
  static std::string Int32(int32_t v) {
    std::string b(4, '\0');
    bytes::StoreI32(reinterpret_cast<uint8_t*>(b.data()), v);
    return b;
  }

  static constexpr int32_t kFlags = 2;  // positions: rows of key and position
  test::ScratchDir dir_{"findex-check"};
  CGlobalDefs defs_;
};

TEST_F(FindexCheckTest, FindsEachKindOfDamageAndItsPlace) {
  // Block 1 is the root, 2 and 3 the inner nodes, 4 the first leaf; the
  // first posting list starts at byte 0 of the .fst with its count row.
  struct Case {
    const char* damage;
    std::function<void()> apply;
    const char* found;
  };
  const std::vector<Case> cases = {
      {"truncated word tree", [this] { Cut(Sdx(), 5 * kBlock); },
       "BOOKS.sdx: truncated: 5 blocks of the"},
      {"random bytes in a leaf",
       [this] {
         std::mt19937 random(7);
         std::string noise(kBlock, '\0');
         for (char& c : noise) c = static_cast<char>(random());
         Patch(Sdx(), 5 * kBlock, noise);
       },
       "BOOKS.sdx block 5 (leaf): does not read"},
      {"random bytes in a node",
       [this] { Patch(Sdx(), 3 * kBlock + 10, std::string(40, '\x7f')); },
       "BOOKS.sdx block 3 (node, level 3)"},
      {"broken leaf chain", [this] { Patch(Sdx(), 4 * kBlock + 2, std::string("\x09\x00", 2)); },
       "BOOKS.sdx block 4 (leaf): links on to block 9, but block 5 follows it"},
      {"random bytes in the postings",
       [this] {
         std::mt19937 random(11);
         std::string noise(64, '\0');
         for (char& c : noise) c = static_cast<char>(random());
         Patch(Fst(), 0, noise);
       },
       "BOOKS.fst list of BOOKS.sdx block 4 row 1 at byte 0: "},
      {"count row past the end", [this] { Cut(Fst(), 8 * 4 * 2 + 4); },
       "the count row lies past the end of the file"},
      {"postings past the end", [this] { Patch(Fst(), 0, Int32(1000)); },
       "BOOKS.fst list of BOOKS.sdx block 4 row 1 at byte 0: its 999 postings run past the end"},
      {"unsorted keys", [this] { Patch(Fst(), 8, Int32(25)); },
       "BOOKS.fst list of BOOKS.sdx block 4 row 1 at byte 0: keys out of order at posting 2 "
       "(key 20 after 25)"},
      {"damaged deleted keys", [this] { test::WriteFile(Folder() + "BOOKS.del", Int32(3) + Int32(5)); },
       "BOOKS.del: Deleted-key file is damaged"},
      {"header gone", [this] { Patch(Sdx(), 0, std::string(64, '\0')); },
       "BOOKS.sdx header (block 0): does not read"},
      {"missing postings", [this] { platform::UnlinkFile(Fst()); },
       "BOOKS.fst: missing or unreadable"},
  };
  const std::string sdx = test::ReadFile(Sdx());
  const std::string fst = test::ReadFile(Fst());
  ASSERT_EQ(CheckFindexFiles(defs_, "Books"), std::vector<std::string>{});
  for (const Case& c : cases) {
    SCOPED_TRACE(c.damage);
    c.apply();
    const std::vector<std::string> problems = CheckFindexFiles(defs_, "Books");
    bool found = false;
    for (const std::string& p : problems) found = found || p.find(c.found) != std::string::npos;
    EXPECT_TRUE(found) << "problems:\n" << ::testing::PrintToString(problems);
    test::WriteFile(Sdx(), sdx);
    test::WriteFile(Fst(), fst);
    platform::UnlinkFile(Folder() + "BOOKS.del");
  }
}

TEST_F(FindexCheckTest, SoundAddOnsAndDeletedKeysPass) {
  std::filesystem::copy_file(Sdx(), Folder() + "BOOKS_ADD_1.sdx");
  std::filesystem::copy_file(Fst(), Folder() + "BOOKS_ADD_1.fst");
  test::WriteFile(Folder() + "BOOKS.del", Int32(2) + Int32(10) + Int32(30));
  EXPECT_EQ(CheckFindexFiles(defs_, "books"), std::vector<std::string>{});
  // An add-on is walked like its findex.
  Cut(Folder() + "BOOKS_ADD_1.fst", 100);
  const std::vector<std::string> problems = CheckFindexFiles(defs_, "books");
  ASSERT_FALSE(problems.empty());
  EXPECT_EQ(problems.front().rfind("BOOKS_ADD_1.fst list of BOOKS_ADD_1.sdx block 4", 0), 0u)
      << problems.front();
}

}  // namespace
}  // namespace qm
