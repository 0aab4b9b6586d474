// Words, ranges, patterns and similar words looked up in findexes built from
// SQLite through the command object: the keys that come back are those of
// the rows holding the words, whatever the findex's value type.
#include <gtest/gtest.h>

#include <algorithm>
#include <set>
#include <string>
#include <vector>

#include "config/global_defs.h"
#include "format/bfile.h"
#include "format/findex_postings.h"
#include "format/findex_tree.h"
#include "format/index_header.h"
#include "search/lookup_fixture.h"

namespace qm {
namespace {

using namespace compare_flags;
using test::Found;

std::set<int32_t> KeySet(const Found& found) {
  return std::set<int32_t>(found.keys.begin(), found.keys.end());
}

class FindexLookupTest : public test::LookupFixture {};

// One word a row; rows 11 and 12 hold a two-byte letter, so character counts
// and byte counts differ on this narrow findex.
const std::vector<std::string> kTextRows = {
    "1, 'apple'",  "2, 'apply'", "3, 'applesauce'", "4, 'banana'", "5, 'band'",
    "6, 'bandana'", "7, 'fish'", "8, 'fishy'",      "9, 'fishes'", "11, 'été'",
    "12, 'ete'"};

struct TextCase {
  std::u16string word;
  int32_t flags;
  int32_t modifier;
  std::set<int32_t> keys;
};

TEST_F(FindexLookupTest, TextWordsRangesPatternsAndSimilarWords) {
  Build("LkText", "varchar(40)", kTextRows);
  const std::set<int32_t> all = {1, 2, 3, 4, 5, 6, 7, 8, 9, 11, 12};
  const std::vector<TextCase> cases = {
      // exact words
      {u"FISH", 0, -1, {7}},
      {u"FISHX", 0, -1, {}},
      {u"APPLESAUCE", 0, -1, {3}},
      {u"ÉTÉ", 0, -1, {11}},
      // ranges, on words in the findex and between them
      {u"FISH", kGreater | kEqual, -1, {7, 8, 9, 11}},
      {u"FISH", kGreater, -1, {8, 9, 11}},
      {u"FISHA", kGreater, -1, {8, 9, 11}},
      {u"FISHA", kGreater | kEqual, -1, {8, 9, 11}},
      {u"APPLESAUCE", kLess, -1, {1}},
      {u"APPLESAUCE", kLess | kEqual, -1, {1, 3}},
      {u"APPLEZ", kLess, -1, {1, 3}},
      {u"APPLEZ", kLess | kEqual, -1, {1, 3}},
      {u"A", kLess, -1, {}},
      {u"ZZZ", kGreater, -1, {11}},  // UTF-8 byte order: É after Z
      {u"ÉTÉ", kGreater, -1, {}},
      {u"ÉTÉ", kGreater | kEqual, -1, {11}},
      {u"A", kGreater | kEqual, -1, all},
      // patterns: start, middle, end, one character, several
      {u"APP*", 0, -1, {1, 2, 3}},
      {u"*ANA", 0, -1, {4, 6}},
      {u"B*D", 0, -1, {5}},
      {u"FISH?", 0, -1, {8}},
      {u"?ISH", 0, -1, {7}},
      {u"ÉT?", 0, -1, {11}},
      {u"*", 0, -1, all},
      {u"*Z*", 0, -1, {}},
      // similar words: "=^" counts edits, "=~" a percentage of the length
      {u"FISH", kSimilarDistance, -1, {7, 8}},
      {u"FISH", kSimilarDistance, 0, {7}},
      {u"FISH", kSimilarDistance, 2, {7, 8, 9}},
      {u"FISH", kSimilarPercent, -1, {7, 8}},
      {u"FISH", kSimilarPercent, 50, {7, 8, 9}},
      {u"FISH", kSimilarPercent, 24, {7}},
      {u"BAND", kSimilarDistance, 3, {4, 5, 6}},
      {u"ÉTÉ", kSimilarDistance, 1, {11}},
      {u"ÉTÉ", kSimilarDistance, 2, {11, 12}},
      {u"ÉTÉS", kSimilarPercent, 25, {11}},
  };
  for (const TextCase& c : cases) {
    const Found found = Text("LkText", c.word, c.flags, c.modifier);
    SCOPED_TRACE(Utf16ToUtf8(c.word) + " flags " + std::to_string(c.flags) + " modifier " +
                 std::to_string(c.modifier));
    EXPECT_EQ(found.error, "");
    EXPECT_EQ(KeySet(found), c.keys);
    EXPECT_EQ(found.found, !c.keys.empty());
    EXPECT_TRUE(std::is_sorted(found.keys.begin(), found.keys.end()));
  }
}

TEST_F(FindexLookupTest, StartAndStopPositionsBoundTheRunsOfTheWordsInARange) {
  Build("LkSpan", "varchar(40)", kTextRows);
  Build("LkNone", "varchar(40)", {"1, NULL"});
  CGiFIndex findex(defs_);
  findex.Open("LkSpan");
  const auto text = [](const char* utf8) {
    CValue value;
    value.SetText(utf8);
    return value;
  };
  struct SpanCase {
    const char* start;
    const char* stop;
    bool single;
    int32_t result;
    std::set<int32_t> keys;  // of the rows between the two positions
  };
  const std::vector<SpanCase> cases = {
      {"FISH", "FISH", true, CGiFIndex::kFound, {7}},
      {"FISHX", "FISHX", true, CGiFIndex::kNothingFound, {}},
      {"B", "BAND", false, CGiFIndex::kFound, {4, 5}},
      {"BANDANA", "FISHES", false, CGiFIndex::kFound, {6, 7, 9, 12}},
      {"FISHZ", "\xC3\xBF", false, CGiFIndex::kStopBeyondEnd, {11}},
      {"C", "D", false, CGiFIndex::kNothingFound, {}},
  };
  for (const SpanCase& c : cases) {
    SCOPED_TRACE(std::string(c.start) + ".." + c.stop);
    int64_t start = -1;
    int64_t stop = -1;
    EXPECT_EQ(findex.FindStartStop(text(c.start), text(c.stop), start, stop, c.single, 0),
              c.result);
    if (c.result == CGiFIndex::kNothingFound) continue;
    if (c.result == CGiFIndex::kStopBeyondEnd) {
      EXPECT_EQ(stop, findex.ItemFileSize());
    }
    CItems items(CColumnSet::FromGeneralFlags(findex.Header().GeneralFlags));
    bool truncated = false;
    findex.ReadItems(items, start, stop, 0, truncated);
    MergeRuns(items);
    Found found;
    test::LookupFixture::Collect(items, found);
    EXPECT_EQ(KeySet(found), c.keys);
  }
  // A findex without words has an empty tree.
  CGiFIndex none(defs_);
  none.Open("LkNone");
  int64_t start = -1;
  int64_t stop = -1;
  EXPECT_EQ(none.FindStartStop(text("A"), text("Z"), start, stop, false, 0),
            CGiFIndex::kNothingFound);
}

TEST_F(FindexLookupTest, WildcardsAndBackslashesMatchExactlyAsWritten) {
  // Blanks alone separate words here, so "*" and "?" stand inside words.
  ASSERT_EQ(command_->SetIndexGeneralOptions(VARIANT_FALSE, VARIANT_TRUE, VARIANT_FALSE, T(" "),
                                             VARIANT_FALSE, VARIANT_FALSE),
            S_OK);
  Build("LkMarks", "varchar(40)", {"1, 'a*b'", "2, 'axb'", "3, 'a?b'", "4, 'ab'", "5, 'axxb'"});
  const std::vector<TextCase> cases = {
      {u"A\\*B", 0, -1, {1}},
      {u"A\\?B", 0, -1, {3}},
      {u"A?B", 0, -1, {1, 2, 3}},
      {u"A*B", 0, -1, {1, 2, 3, 4, 5}},
      {u"A\\**", 0, -1, {1}},
      {u"A??B", 0, -1, {5}},
  };
  for (const TextCase& c : cases) {
    SCOPED_TRACE(Utf16ToUtf8(c.word));
    const Found found = Text("LkMarks", c.word, c.flags, c.modifier);
    EXPECT_EQ(found.error, "");
    EXPECT_EQ(KeySet(found), c.keys);
  }
  // The parser cuts values with the findex's own separators.
  CGiRepository marks(defs_);
  marks.OpenRepository("LkMarks");
  EXPECT_EQ(marks.GetSeparators(), u" ");
  ASSERT_EQ(command_->SetIndexGeneralOptions(VARIANT_FALSE, VARIANT_TRUE, VARIANT_FALSE, T(""),
                                             VARIANT_TRUE, VARIANT_FALSE),
            S_OK);
  Build("LkPlain", "varchar(40)", {"1, 'x'"});
  CGiRepository plain(defs_);
  plain.OpenRepository("LkPlain");
  const std::u16string defaults = plain.GetSeparators();
  EXPECT_NE(defaults.find(u';'), std::u16string::npos);
  EXPECT_NE(defaults.find(u'\t'), std::u16string::npos);
}

struct ValueCase {
  const char* what;
  CWordSearch search;
  int32_t flags;
  std::set<int32_t> keys;
};

CValue Int(int32_t v) {
  CValue value;
  value.SetInteger(v);
  return value;
}

CValue Real(double v) {
  CValue value;
  value.SetDouble(v);
  return value;
}

CValue Date(const char* text, bool upper) {
  CValue value(VALUE_TYPE::DateTime);
  value.SetDateFromText(text, upper);
  return value;
}

TEST_F(FindexLookupTest, RangesOnIntegerDoubleAndDateFindexesMeanWhatTheySay) {
  Build("LkInt", "integer", {"1, 10", "2, 20", "3, 30", "4, 40", "5, 50", "6, 60"});
  Build("LkReal", "double", {"1, 1.5", "2, 2.5", "3, 3.5", "4, -4.5"});
  Build("LkDate", "datetime",
        {"1, '2020-01-01 08:00:00'", "2, '2020-01-02 09:30:00'", "3, '2020-01-02 17:00:00'",
         "4, '2020-01-03 00:00:00'"});
  const auto day = [](const char* d) {
    return CWordSearch::ForRange(Date(d, false), Date(d, true));
  };
  const std::vector<std::pair<std::string, std::vector<ValueCase>>> tables = {
      {"LkInt",
       {{"=30", CWordSearch::ForValue(Int(30)), 0, {3}},
        {"=35", CWordSearch::ForValue(Int(35)), 0, {}},
        {">30", CWordSearch::ForValue(Int(30)), kGreater, {4, 5, 6}},
        {">=30", CWordSearch::ForValue(Int(30)), kGreater | kEqual, {3, 4, 5, 6}},
        {">35", CWordSearch::ForValue(Int(35)), kGreater, {4, 5, 6}},
        {">=35", CWordSearch::ForValue(Int(35)), kGreater | kEqual, {4, 5, 6}},
        {"<30", CWordSearch::ForValue(Int(30)), kLess, {1, 2}},
        {"<=30", CWordSearch::ForValue(Int(30)), kLess | kEqual, {1, 2, 3}},
        {"<=35", CWordSearch::ForValue(Int(35)), kLess | kEqual, {1, 2, 3}},
        {"<10", CWordSearch::ForValue(Int(10)), kLess, {}},
        {"<=10", CWordSearch::ForValue(Int(10)), kLess | kEqual, {1}},
        {">60", CWordSearch::ForValue(Int(60)), kGreater, {}},
        {">=60", CWordSearch::ForValue(Int(60)), kGreater | kEqual, {6}},
        {"<1000", CWordSearch::ForValue(Int(1000)), kLess, {1, 2, 3, 4, 5, 6}}}},
      {"LkReal",
       {{"=2.5", CWordSearch::ForValue(Real(2.5)), 0, {2}},
        {">-4.5", CWordSearch::ForValue(Real(-4.5)), kGreater, {1, 2, 3}},
        {"<2", CWordSearch::ForValue(Real(2.0)), kLess, {1, 4}},
        {"<=3.5", CWordSearch::ForValue(Real(3.5)), kLess | kEqual, {1, 2, 3, 4}}}},
      {"LkDate",
       {{"day 2", day("2020-01-02"), 0, {2, 3}},
        {"day 4", day("2020-01-04"), 0, {}},
        {"> day 1", day("2020-01-01"), kGreater, {2, 3, 4}},
        {">= day 2", day("2020-01-02"), kGreater | kEqual, {2, 3, 4}},
        {"< day 2", day("2020-01-02"), kLess, {1}},
        {"<= day 2", day("2020-01-02"), kLess | kEqual, {1, 2, 3}},
        {"instant", CWordSearch::ForValue(Date("2020-01-02 17:00:00", false)), 0, {3}}}},
  };
  for (const auto& [findex, cases] : tables) {
    for (const ValueCase& c : cases) {
      SCOPED_TRACE(findex + " " + c.what);
      const Found found = Lookup(findex, c.search, c.flags);
      EXPECT_EQ(found.error, "");
      EXPECT_EQ(KeySet(found), c.keys);
    }
  }
}

TEST_F(FindexLookupTest, TheReadLimitCutsAWordsItemsAndSaysSo) {
  // Positions only (default options): rows of key and position, 8 bytes.
  std::vector<std::string> rows;
  for (int id = 1; id <= 20; ++id) rows.push_back(std::to_string(id) + ", 'fish'");
  rows.push_back("21, 'fishy'");
  Build("LkCache", "varchar(20)", rows);
  struct LimitCase {
    int64_t limit;
    int32_t rows;
    bool truncated;
  };
  const std::vector<LimitCase> cases = {
      {0, 21, false},    // count row and 20 items
      {80, 10, true},    // ten rows' room
      {87, 10, true},    // rounded down to whole rows
      {168, 21, false},  // exactly room for the run
      {8, 1, true},      // the count row alone
  };
  for (const LimitCase& c : cases) {
    SCOPED_TRACE("limit " + std::to_string(c.limit));
    CGiFIndex findex(defs_);
    findex.Open("LkCache");
    CItems items(CColumnSet::FromGeneralFlags(findex.Header().GeneralFlags));
    const CLookupResult r =
        findex.GetItems(items, CWordSearch::ForText(u"FISH", 2), 0, -1, c.limit, false);
    EXPECT_EQ(r.truncated, c.truncated);
    EXPECT_EQ(items.Count(), c.rows);
    // The count row says how many rows of the run were read.
    EXPECT_EQ(items.Key(0), c.rows);
  }
  EXPECT_NE(TraceText().find("Quick Search. Number of items found in " + IndexFolder() +
                              "LKCACHE.fst (including count item) : 21"),
            std::string::npos);
  // A pattern stops at the limit, across its words.
  const Found cut = Text("LkCache", u"FISH*", 0, -1, 8 * 15);
  EXPECT_TRUE(cut.truncated);
  EXPECT_EQ(cut.rows, 15);
  EXPECT_EQ(cut.keys.size(), 14u);
}

TEST_F(FindexLookupTest, RunsOfSeveralWordsMergeIntoOneKeySortedArray) {
  std::vector<std::string> rows;
  for (int id = 1; id <= 60; ++id) {
    rows.push_back(std::to_string(id) + ", 'k" + std::to_string(id % 7) + " k" +
                   std::to_string(id % 5) + "'");
  }
  Build("LkRuns", "varchar(40)", rows);
  const Found found = Text("LkRuns", u"K*");
  EXPECT_EQ(found.error, "");
  EXPECT_EQ(found.runs, 7) << "K0 to K6 are seven words";
  // Positions kept: a row holding K1 twice ("k1 k1") keeps both postings, in
  // key order and then by position.
  std::vector<int32_t> expected;
  for (int id = 1; id <= 60; ++id) {
    expected.push_back(id);
    expected.push_back(id);
  }
  EXPECT_EQ(found.keys, expected);
}

// How an add-on's rows join the lookup is SearchEvaluationTest's
// AddOnFindexesJoinTheirFindexInKeyOrder; here the names no add-on can have.
TEST_F(FindexLookupTest, AddOnsThatAreMissingOrTooLongToExistAreNotOpened) {
  CGiFIndex missing(defs_);
  EXPECT_FALSE(missing.TryOpen("LkAdd_ADD_2"));
  EXPECT_FALSE(missing.TryOpen(std::string(196, 'L') + "_ADD_1")) << "too long to exist";
  EXPECT_THROW(missing.Open(std::string(200, 'L')), CGiFIndexException);
}

TEST_F(FindexLookupTest, WordListsFollowTheFilterFromItsPrefix) {
  Build("LkList", "varchar(40)", kTextRows);
  CGiFIndex findex(defs_);
  findex.Open("LkList");
  struct ListCase {
    std::u16string filter;
    int32_t first;
    int32_t last;
    std::vector<std::u16string> words;
    int32_t total;
  };
  const std::vector<ListCase> cases = {
      {u"", 1, 3, {u"APPLE", u"APPLESAUCE", u"APPLY"}, 11},
      {u"BAN*", 1, 10, {u"BANANA", u"BAND", u"BANDANA"}, 3},
      {u"BAN*", 2, 2, {u"BAND"}, 3},
      {u"*SH*", 1, 10, {u"FISH", u"FISHES", u"FISHY"}, 3},
      {u"Q*", 1, 10, {}, 0},
  };
  for (const ListCase& c : cases) {
    SCOPED_TRACE(Utf16ToUtf8(c.filter));
    std::vector<std::u16string> words;
    int32_t total = -1;
    findex.GetFindexWordsW(CWordPattern(c.filter), c.first, c.last, words, total);
    EXPECT_EQ(words, c.words);
    EXPECT_EQ(total, c.total);
  }
}

// Words of 600 bytes: a few to a block, so the tree has many nodes on every
// level, and nodes split after their first children were numbered.
TEST_F(FindexLookupTest, EveryWordOfATreeWithManyNodesOnEveryLevelIsFound) {
  const std::string pad(600, 'x');
  const auto word = [&](int w) {
    std::string n = std::to_string(w);
    return "W" + std::string(4 - n.size(), '0') + n + pad;
  };
  constexpr int kWords = 1000;
  {
    BFile tree;
    tree.OpenFile(IndexFolder() + "LKWIDE.sdx", BFile::kCreate, CFindexTreeWriter::kBlockUnits);
    CFindexTreeWriter writer(tree, CFindexTreeWriter::kMaxBlockNumber);
    CFindexPostingWriter postings(CColumnSet::FromGeneralFlags(2),
                                  CFindexPostingWriter::kMaxFileBytes);
    postings.Create(IndexFolder() + "LKWIDE.fst");
    for (int w = 0; w < kWords; ++w) {
      CValue value;
      value.SetText(word(w));
      writer.AddWord(value, postings.BeginList());
      const int32_t row[2] = {w + 1, 1};
      postings.AddEntry(row);
      postings.EndList();
    }
    CIndexHeader header;
    header.BlockNum = writer.Finish();
    header.FindexType = 2;
    header.GeneralFlags = 2;
    header.WriteInfo(tree);
    tree.Close();
    postings.Close();
  }
  CGiFIndex findex(defs_);
  findex.Open("LkWide");
  ASSERT_GT(findex.Header().BlockNum, 150) << "a tree of many nodes";
  const auto keys = [&](const std::string& text, int32_t flags) {
    CItems items(CColumnSet::FromGeneralFlags(2));
    findex.GetItems(items, CWordSearch::ForText(Utf8ToUtf16(text), 2), flags, -1, 0, false);
    MergeRuns(items);
    Found found;
    test::LookupFixture::Collect(items, found);
    return found.keys;
  };
  for (int w = 0; w < kWords; ++w) {
    ASSERT_EQ(keys(word(w), 0), std::vector<int32_t>{w + 1}) << w;
  }
  std::vector<int32_t> above_500;
  for (int32_t k = 502; k <= kWords; ++k) above_500.push_back(k);
  EXPECT_EQ(keys(word(500), kGreater), above_500);
  EXPECT_EQ(keys(word(500).substr(0, 5) + "y", kGreater), above_500) << "between two words";
  std::vector<int32_t> ninth_hundred;
  for (int32_t k = 901; k <= 1000; ++k) ninth_hundred.push_back(k);
  EXPECT_EQ(keys("W09*", 0), ninth_hundred);
  EXPECT_EQ(keys("W1000", 0), std::vector<int32_t>{});
}

}  // namespace
}  // namespace qm
