// The external merge sort on its own: entries of every value type, runs of
// 8,192, multi-pass merges whose run files shrink between passes, stability,
// the pass traces and progress, and the allocation failure.
#include "index/entry_sort.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <limits>
#include <numeric>
#include <random>

#include "format/sort_entry.h"
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
      static const char* const kWords[] = {"", "A", "AB", "z", "é", "éa", "ABCDEFGHIJ",
                                           "ABCDEFGHIK", "ABCDEFGHé"};
      layout.AppendText(out, std::string_view(kWords[pick(std::size(kWords))]));
      return;
    }
    case VALUE_TYPE::UnicodeString: {
      // By code unit: a surrogate pair (D800...) sorts before U+FF61.
      static const char16_t* const kWords[] = {u"", u"A", u"\uFF61", u"\U00010000", u"\u00E9",
                                               u"ABCDE", u"ABCDF", u"ABCD\uFF61"};
      layout.AppendText(out, std::u16string_view(kWords[pick(std::size(kWords))]));
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
  // Writes n random entries (key 0-19, then the raw-file order as the
  // second item), sorts them and reads the sorted file back.
  std::vector<SortedEntry> SortRandom(VALUE_TYPE type, int n, CEntrySort* used = nullptr) {
    const SortEntryLayout layout(2, type);
    std::mt19937 random(static_cast<unsigned>(n) * 7 + static_cast<unsigned>(type));
    MFile raw;
    CEntrySort::OpenSortFile(home_.Defs(), raw);
    std::vector<uint8_t> entry;
    for (int i = 0; i < n; ++i) {
      entry.clear();
      const int32_t row[] = {static_cast<int32_t>(random() % 20), i};
      SortEntryLayout::AppendRow(entry, row);
      AppendRandomValue(layout, random, entry);
      raw.mwrite(entry.data(), entry.size());
    }
    CEntrySort local(home_.Defs(), layout, CEntrySort::Module::PiSort);
    CEntrySort& sort = used != nullptr ? *used : local;
    MFile sorted;
    sort.Sort(raw, sorted);
    EXPECT_FALSE(raw.IsOpen());
    auto entries = ReadSortedEntries(sorted, 2, type);
    // Every raw entry comes out exactly once.
    std::vector<int32_t> order, expected(static_cast<std::size_t>(n));
    for (const auto& e : entries) order.push_back(e.row[1]);
    std::sort(order.begin(), order.end());
    std::iota(expected.begin(), expected.end(), 0);
    EXPECT_TRUE(order == expected) << "entries lost or repeated";
    return entries;
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

TEST_F(EntrySortTest, EveryTypeSortsByValueThenKeyStablyAcrossMergePasses) {
  // 40,000 entries: five level-one runs, the last short; passes write 3, 2, 1
  // runs, and one run file holds less in the third pass than in the first.
  for (VALUE_TYPE type : {VALUE_TYPE::AsciiString, VALUE_TYPE::UnicodeString, VALUE_TYPE::Integer,
                          VALUE_TYPE::Double, VALUE_TYPE::DateTime}) {
    SCOPED_TRACE(static_cast<int>(type));
    CEntrySort sort(home_.Defs(), SortEntryLayout(2, type), CEntrySort::Module::PiSort);
    test::ExpectSortedAndStable(SortRandom(type, 40000, &sort), 1);
    EXPECT_EQ(sort.LevelOneRuns(), 5);
    EXPECT_EQ(sort.MergePasses(), 3);
    EXPECT_EQ(sort.EntriesSorted(), 40000);
  }
  const std::vector<std::string> turns = TurnsLeft();
  ASSERT_EQ(turns.size(), 15u);
  EXPECT_EQ(std::vector<std::string>(turns.begin(), turns.begin() + 3),
            (std::vector<std::string>{"3", "2", "1"}));
  EXPECT_EQ(home_.Defs().GetProgress(), 90);
  EXPECT_TRUE(home_.WorkFiles().empty());
}

TEST_F(EntrySortTest, ArraysThatCannotBeAllocatedRaiseErrorElevenAndLeaveNoFile) {
  const SortEntryLayout layout(1, VALUE_TYPE::Integer);
  MFile raw;
  CEntrySort::OpenSortFile(home_.Defs(), raw);
  SetAllocationLimitForTesting(16 * 1024);  // below two arrays of 8,192 offsets
  CEntrySort sort(home_.Defs(), layout, CEntrySort::Module::PiOrderSort);
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
