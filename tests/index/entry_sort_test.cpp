// The memory-bounded external sort on its own: entries of every value type
// through runs and k-way merges (with passes over groups of runs), written
// byte for byte as the earlier two-way merge sort writes them; the pass
// traces and progress, the allocation failure, and no run file left behind.
#include "index/entry_sort.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <limits>
#include <random>

#include "format/sort_entry.h"
#include "index/two_way_merge_sort.h"
#include "platform/text_encoding.h"
#include "base/checked_allocation.h"
#include "base/exception_family.h"
#include "support/sorted_file_reader.h"

namespace qm {
namespace {

using test::ReadSortedEntries;
using test::SortedEntry;

// Small pools, so equal values and equal keys are frequent.
void AppendRandomValue(const SortEntryLayout& layout, std::mt19937& random,
                       std::vector<uint8_t>& out) {
  const auto pick = [&](std::size_t n) { return static_cast<std::size_t>(random() % n); };
  switch (layout.Type()) {
    case VALUE_TYPE::AsciiString: {
      // Bytes compare unsigned: "é" (C3 A9) sorts after "z". Long words
      // differ only past their first eight bytes.
      // Around seven and eight bytes, and with zero bytes that the padding
      // of a short word matches.
      static const std::string_view kWords[] = {
          "", "A", "AB", "z", "é", "éa", "ABCDEFGHIJ", "ABCDEFGHIK", "ABCDEFGHé",
          "ABCDEFG", "ABCDEFGH", "ABCDEFGA", std::string_view("AB\0", 3),
          std::string_view("ABCDEFG\0", 8), std::string_view("\0", 1)};
      layout.AppendText(out, kWords[pick(std::size(kWords))]);
      return;
    }
    case VALUE_TYPE::UnicodeString: {
      // By code unit: a surrogate pair (D800...) sorts before U+FF61.
      static const std::u16string_view kWords[] = {
          u"", u"A", u"\uFF61", u"\U00010000", u"\u00E9", u"ABCDE", u"ABCDF", u"ABCD\uFF61",
          u"ABC", u"ABCD", std::u16string_view(u"AB\0", 3), std::u16string_view(u"ABC\0", 4)};
      layout.AppendText(out, kWords[pick(std::size(kWords))]);
      return;
    }
    case VALUE_TYPE::Integer: {
      static const int32_t kValues[] = {std::numeric_limits<int32_t>::min(), -5, 0, 3, 10,
                                        std::numeric_limits<int32_t>::max()};
      SortEntryLayout::AppendInteger(out, kValues[pick(std::size(kValues))]);
      return;
    }
    case VALUE_TYPE::Double: {
      static const double kValues[] = {-1e300, -1.5, -0.001, 0.0, 0.25, 3.0, 1e10};
      SortEntryLayout::AppendDouble(out, kValues[pick(std::size(kValues))]);
      return;
    }
    case VALUE_TYPE::DateTime: {
      static const DateTimeValue kValues[] = {{-1, 12, 31, 0, 0, 0, 0},
                                              {2024, 2, 29, 13, 45, 59, 123456},
                                              {2024, 2, 29, 13, 45, 59, 123457},
                                              {2024, 10, 1, 0, 0, 0, 0}};
      SortEntryLayout::AppendDate(out, kValues[pick(std::size(kValues))]);
      return;
    }
  }
}

class EntrySortTest : public ::testing::Test {
 protected:
  // n random entries (key 0-19, then the raw-file order as the second item)
  // in a new raw file.
  void WriteRandom(MFile& raw, VALUE_TYPE type, int n) {
    const SortEntryLayout layout(2, type);
    std::mt19937 random(static_cast<unsigned>(n) * 7 + static_cast<unsigned>(type));
    CEntrySort::OpenSortFile(home_.Defs(), raw);
    std::vector<uint8_t> entry;
    for (int i = 0; i < n; ++i) {
      entry.clear();
      const int32_t row[] = {static_cast<int32_t>(random() % 20), i};
      SortEntryLayout::AppendRow(entry, row);
      AppendRandomValue(layout, random, entry);
      raw.mwrite(entry.data(), entry.size());
    }
  }

  static std::string Bytes(MFile& file) {
    std::string bytes(static_cast<std::size_t>(file.FileSize(false)), '\0');
    if (!bytes.empty()) file.mread(bytes.data(), bytes.size());
    file.Seek(0);
    return bytes;
  }

  std::vector<std::string> TurnsLeft() const {
    std::vector<std::string> turns;
    const std::string text = home_.TraceText();
    const std::string mark = "Sorting. Turns Left: ";
    for (auto at = text.find(mark); at != std::string::npos; at = text.find(mark, at + 1)) {
      turns.push_back(text.substr(at + mark.size(), text.find_first_of("\r\n", at) - at - mark.size()));
    }
    return turns;
  }

  test::SortHome home_;
};

TEST_F(EntrySortTest, RunsAndMergesWriteTheSameFileAsTheTwoWayMergeSort) {
  // 40,000 entries of about 36 bytes with their slots: six runs of the
  // smallest buffer. Merging two at a time takes passes over groups of runs;
  // the widest merge takes them in one, the last run straight from memory.
  struct Case {
    VALUE_TYPE type;
    std::size_t merge_ways;
    bool several_passes;
  };
  const Case cases[] = {
      {VALUE_TYPE::AsciiString, 2, true},   {VALUE_TYPE::AsciiString, CEntrySort::kMergeWays, false},
      {VALUE_TYPE::UnicodeString, 3, true}, {VALUE_TYPE::Integer, 2, true},
      {VALUE_TYPE::Double, CEntrySort::kMergeWays, false}, {VALUE_TYPE::DateTime, 2, true},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(testing::Message() << static_cast<int>(c.type) << " ways " << c.merge_ways);
    const SortEntryLayout layout(2, c.type);
    MFile raw_new, raw_old, sorted_new, sorted_old;
    WriteRandom(raw_new, c.type, 40000);
    WriteRandom(raw_old, c.type, 40000);
    CEntrySort sort(home_.Defs(), layout, CEntrySort::Module::PiSort, 256 * 1024, c.merge_ways);
    sort.Sort(raw_new, sorted_new);
    CTwoWayMergeSort(home_.Defs(), layout, CTwoWayMergeSort::Module::PiSort)
        .Sort(raw_old, sorted_old);
    EXPECT_FALSE(raw_new.IsOpen());
    EXPECT_GE(sort.Runs(), 4);
    EXPECT_EQ(sort.MergePasses() > 1, c.several_passes);
    EXPECT_EQ(sort.EntriesSorted(), 40000);
    const std::string bytes = Bytes(sorted_new);
    EXPECT_TRUE(bytes == Bytes(sorted_old)) << "the sorted files differ";
    const auto entries = ReadSortedEntries(sorted_new, 2, c.type);
    ASSERT_EQ(entries.size(), 40000u);
    test::ExpectSortedAndStable(entries, 1);
  }
  EXPECT_EQ(home_.Defs().GetProgress(), 90);
  EXPECT_TRUE(home_.WorkFiles().empty());
}

TEST_F(EntrySortTest, EachMergePassTracesTheRunsItWrote) {
  MFile raw, sorted;
  WriteRandom(raw, VALUE_TYPE::Integer, 40000);
  CEntrySort sort(home_.Defs(), SortEntryLayout(2, VALUE_TYPE::Integer),
                  CEntrySort::Module::PiSort, 256 * 1024, 2);
  sort.Sort(raw, sorted);
  // 40,000 entries of 12 bytes, each with a 16-byte slot: four full buffers
  // and the rest. Two at a time, the passes write 3, 2 and 1 runs.
  ASSERT_EQ(sort.Runs(), 5);
  EXPECT_EQ(sort.MergePasses(), 3);
  EXPECT_EQ(TurnsLeft(), (std::vector<std::string>{"3", "2", "1"}));
}

TEST_F(EntrySortTest, MemoryThatCannotBeAllocatedRaisesErrorElevenAndLeavesNoFile) {
  const SortEntryLayout layout(1, VALUE_TYPE::Integer);
  MFile raw;
  WriteRandom(raw, VALUE_TYPE::Integer, 10);
  SetAllocationLimitForTesting(16 * 1024);  // below the smallest sort buffer
  CEntrySort sort(home_.Defs(), SortEntryLayout(2, VALUE_TYPE::Integer),
                  CEntrySort::Module::PiOrderSort);
  MFile sorted;
  try {
    sort.Sort(raw, sorted);
    ADD_FAILURE() << "no error";
  } catch (const CException& e) {
    EXPECT_EQ(e.GetErrorNumber(), 11);
    const std::string text = Utf16ToUtf8(e.GetCurrentEntry().text);
    EXPECT_NE(text.find("(Module:PiOrderSort,Method:AllocateRowArrays)"), std::string::npos)
        << text;
  }
  EXPECT_FALSE(sorted.IsOpen());
  SetAllocationLimitForTesting(0);
  raw.Close();
  EXPECT_TRUE(home_.WorkFiles().empty());
}

}  // namespace
}  // namespace qm
