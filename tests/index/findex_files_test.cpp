// The files a findex build writes, read back with the tests' own decoder:
// every word with its postings, the leaf chain, a tree whose every level
// splits, batches of postings, and the limits of the tree and the postings.
#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <vector>

#include "base/exception_family.h"
#include "config/global_defs.h"
#include "format/mfile.h"
#include "index/findex_files_writer.h"
#include "platform/text_encoding.h"
#include "search/findex_check.h"
#include "support/findex_decoder.h"
#include "support/raised_error.h"
#include "support/test_support.h"

namespace qm {
namespace {

using test::DecodedFindex;
using test::Entry;
using test::Posting;

// Distinct text values of about length bytes, ascending with i.
std::string LongWord(int i, std::size_t length) {
  std::string word = "w" + std::to_string(1000000 + i);
  word.resize(length, static_cast<char>('a' + i % 26));
  return word;
}

std::vector<Entry> LongWords(int count, std::size_t length, int vary = 0) {
  std::vector<Entry> entries;
  for (int i = 0; i < count; ++i) {
    const std::size_t n = length + (vary > 0 ? static_cast<std::size_t>(i * 37 % vary) : 0);
    entries.push_back(Entry{LongWord(i, n), i + 1, 1, i});
  }
  return entries;
}

class FindexFilesTest : public ::testing::Test {
 protected:
  void SetUp() override {
    // The files stand where a findex T of the data directory would.
    std::filesystem::create_directories(dir_.Path() + "Groups/PUBLIC/Indexes");
    defs_.SetDataPath(dir_.Path());
    defs_.SetGroup("PUBLIC");
  }

  FindexWriteCounts Write(const std::vector<Entry>& entries, int32_t flags, int32_t type = 2,
                          FindexLimits limits = {}, std::function<void(int32_t)> observer = {}) {
    test::WriteSortedFile(dir_.Path() + "sorted", entries, flags);
    MFile sorted;
    sorted.OpenFile(dir_.Path() + "sorted", MFile::kReadOnly);
    header_.GeneralFlags = flags;
    header_.FindexType = type;
    header_.IndexName = "Books";
    return WriteFindexFiles(header_, sorted, Sdx(), Fst(), limits, std::move(observer));
  }
  DecodedFindex Decode(int32_t flags, int32_t type = 2) const {
    // Every findex written whole passes the check that operators run.
    EXPECT_EQ(CheckFindexFiles(defs_, "T"), std::vector<std::string>{});
    return test::DecodeFindex(Sdx(), Fst(), type, flags);
  }
  std::string Sdx() const { return dir_.Path() + "Groups/PUBLIC/Indexes/T.sdx"; }
  std::string Fst() const { return dir_.Path() + "Groups/PUBLIC/Indexes/T.fst"; }

  test::ScratchDir dir_{"findex-files"};
  CGlobalDefs defs_;
  CIndexHeader header_;
};

TEST_F(FindexFilesTest, SmallFindexReadsBackWithEachColumnSet) {
  constexpr int32_t kBig = 2000000000;
  // Entries in the sorted file's order: by value (bytes unsigned), then key.
  const std::vector<Entry> entries = {
      {std::string("apple"), 3, 2, 1},   {std::string("apple"), 3, 5, 7},
      {std::string("apple"), 9, 1, 2},   {std::string("bear"), 1, kBig, 1},
      {std::string("bear"), 1, kBig, 5}, {std::string("bear"), 2, 4, 3},
      {std::string("zebra"), 8, 1, 4},   {std::string("\xC3\xA9t\xC3\xA9"), 5, 3, 6}};
  for (int32_t flags : {0, 1, 2, 3}) {
    SCOPED_TRACE(flags);
    const FindexWriteCounts counts = Write(entries, flags);
    const DecodedFindex findex = Decode(flags);
    EXPECT_EQ(findex.faults, std::vector<std::string>{});
    EXPECT_EQ(findex.words, test::ExpectedWords(entries, flags));
    EXPECT_EQ(counts.words, 8);
    EXPECT_EQ(counts.distinct, 4);
    // One leaf, one node on each inner level, the end leaf and the header.
    EXPECT_EQ(counts.blocks, 6);
    EXPECT_EQ(findex.nodes_per_level, (std::vector<int32_t>{1, 1, 1}));
    // Numbers in the order handed out: root 1, the nodes it starts 2 and 3.
    EXPECT_EQ(findex.nodes.at(1).children.front(), 2);
    EXPECT_EQ(findex.nodes.at(2).children.front(), 3);
    EXPECT_EQ(findex.leaves, std::vector<int32_t>{4});
    // One posting per key, weights summed up to the int32 range.
    if (flags == 1) {
      EXPECT_EQ(findex.words.at(1).postings, (std::vector<Posting>{{1, 2147483647}, {2, 4}}));
    }
  }
}

TEST_F(FindexFilesTest, PlusAndMinusZeroShareAWord) {
  const std::vector<Entry> entries = {{-0.0, 1, 1, 0}, {0.0, 2, 1, 0}, {2.5, 1, 1, 0}, {2.5, 3, 1, 0}};
  Write(entries, 0, 6);
  const DecodedFindex findex = Decode(0, 6);
  EXPECT_EQ(findex.faults, std::vector<std::string>{});
  ASSERT_EQ(findex.words.size(), 2u);
  EXPECT_EQ(findex.words[0].postings, (std::vector<Posting>{{1}, {2}}));
}

TEST_F(FindexFilesTest, EveryLevelOfTheTreeSplits) {
  // Long values make leaves and nodes of about ten rows: 2,500 words need
  // more than one node on every level.
  const std::vector<Entry> entries = LongWords(2500, 300, 200);
  const FindexWriteCounts counts = Write(entries, 3);
  const DecodedFindex findex = Decode(3);
  EXPECT_EQ(findex.faults, std::vector<std::string>{});
  EXPECT_EQ(findex.words, test::ExpectedWords(entries, 3));
  EXPECT_EQ(counts.blocks, findex.block_num);
  EXPECT_EQ(findex.nodes_per_level[0], 1);
  EXPECT_GT(findex.nodes_per_level[1], 1);
  EXPECT_GT(findex.nodes_per_level[2], findex.nodes_per_level[1]);
  EXPECT_GT(findex.leaves.size(), static_cast<std::size_t>(findex.nodes_per_level[2]));
}

TEST_F(FindexFilesTest, LongPostingListsGoInBatchesWithTheCountPatchedIn) {
  std::vector<Entry> entries;
  for (int32_t key = 1; key <= 20000; ++key)
    entries.push_back(Entry{std::string("many"), key, 1, 0});
  entries.push_back(Entry{std::string("one"), 4, 1, 0});
  std::vector<int32_t> batches;
  Write(entries, 0, 2, {}, [&](int32_t rows) { batches.push_back(rows); });
  EXPECT_EQ(batches, (std::vector<int32_t>{8193, 8193, 3614, 1}));
  const DecodedFindex findex = Decode(0);
  EXPECT_EQ(findex.faults, std::vector<std::string>{});
  EXPECT_EQ(findex.words, test::ExpectedWords(entries, 0));
  // 20,001 in the count row: the decoder read exactly the 20,000 postings
  // before the next list.
  ASSERT_EQ(findex.words.size(), 2u);
  EXPECT_EQ(findex.words[0].postings.size(), 20000u);
}

TEST_F(FindexFilesTest, TreeAndPostingLimitsAndDisorderRaiseInsteadOfWritingWrongFiles) {
  // Values of 2,000 bytes: two per leaf and per node, so the root is full
  // after eight leaves.
  EXPECT_EQ(test::Raised<CPiFIndexException>([&] { Write(LongWords(40, 2000), 0); }).number, 29);
  EXPECT_EQ(test::Raised<CPiFIndexException>([&] { Write(LongWords(1, 4090), 0); }).text,
            "Error inserting row leaf (Module:PiFIndex,Method:buildrowfindex)");

  FindexLimits blocks;
  blocks.max_block_number = 20;
  EXPECT_NE(
      test::Raised<CPiFIndexException>([&] {
        Write(LongWords(300, 400), 0, 2, blocks);
      }).text.find("would need more than 21 blocks, the most that 16-bit block numbers address"),
      std::string::npos);
  FindexLimits bytes;
  bytes.max_fst_bytes = 1000;
  EXPECT_NE(test::Raised<CPiFIndexException>([&] {
              Write(LongWords(300, 10), 0, 2, bytes);
            }).text.find("would pass 1000 bytes, the most that 32-bit positions address"),
            std::string::npos);
  // Just within both limits the same data is written whole.
  blocks.max_block_number = 1000;
  bytes.max_fst_bytes = 300 * 8;  // a count row and one posting of 4 bytes each per word
  Write(LongWords(300, 10), 0, 2, bytes);
  Write(LongWords(300, 400), 0, 2, blocks);
  EXPECT_EQ(Decode(0).faults, std::vector<std::string>{});

  const std::vector<Entry> unsorted = {{std::string("b"), 1, 1, 1}, {std::string("a"), 1, 1, 1}};
  EXPECT_EQ(test::Raised<CPiFIndexException>([&] { Write(unsorted, 0); }).text,
            "Sorted entry file out of order at entry 2 (Module:PiFIndex,Method:BuildRowFindex)");
}

}  // namespace
}  // namespace qm
