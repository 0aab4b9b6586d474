// The SELECT texts of findex builds and updates, and the findex type that the
// indexed columns' types decide.
#include "index/row_selection.h"

#include <gtest/gtest.h>

#include "format/findex_type.h"
#include "format/index_header.h"

namespace qm {
namespace {

CIndexHeader Definition() {
  CIndexHeader d;
  d.TableName = "books";
  d.KeyColumn = "ID";
  d.Columns = {{"title", {}}, {"body", {{"CONTENT_WEIGHT", "3"}}}};
  return d;
}

std::vector<std::string> Statements(const CIndexHeader& d) {
  return RowSelection::FromHeader(d).Statements();
}

TEST(RowSelection, FullBuildsUpdatesAndPartialBuilds) {
  CIndexHeader d = Definition();
  // One comma per column, in the column map's order.
  EXPECT_EQ(Statements(d), std::vector<std::string>{"select ID,body,title from books"});

  d.SortMax = 500;
  EXPECT_EQ(Statements(d), std::vector<std::string>{"select ID,body,title from books where ID>500"});

  d.SortMax = 0;
  d.IndexMaxSize = 2;
  d.IndexStartValue = 1;
  EXPECT_EQ(Statements(d),
            std::vector<std::string>{"select ID,body,title from books where ID>0 AND ID<200000"});
  d.SortMax = 250000;  // past the start value: the next slice goes on from it
  EXPECT_EQ(Statements(d), std::vector<std::string>{
                               "select ID,body,title from books where ID>250000 AND ID<450000"});
  // The upper bound is past 32 bits.
  d.IndexMaxSize = 30000;
  d.SortMax = 2147483000;
  EXPECT_EQ(Statements(d), std::vector<std::string>{"select ID,body,title from books where "
                                                    "ID>2147483000 AND ID<5147483000"});

  CIndexHeader s = Definition();
  s.SqlUsedAsTable = 1;
  s.SqlSelect = "select b.ID, b.title, a.name from books b join authors a on a.id = b.author";
  s.SortMax = 7;
  EXPECT_EQ(Statements(s), std::vector<std::string>{
                               "select * from (" + s.SqlSelect + ") as temp_table where ID>7"});
}

TEST(RowSelection, DateTimeKeyUpdatesTryTheQuotedLiteralThenTheHashForm) {
  CIndexHeader d = Definition();
  d.UpdateFlags = RowSelection::kUseDateTimeKey;
  d.DateTimeKeyColumn = "changed";
  d.MaxDateTimeKey = {2024, 3, 9, 4, 5, 7, 120000};
  // A first build reads everything; the key column is selected for its values.
  EXPECT_EQ(Statements(d), std::vector<std::string>{"select ID,body,title,changed from books"});

  d.SortMax = 12;
  EXPECT_EQ(Statements(d),
            (std::vector<std::string>{
                "select ID,body,title,changed from books where changed>'2024-03-09 04:05:07'",
                "select ID,body,title,changed from books where changed>#2024-03-09 04:05:07#"}));
  d.UpdateFlags |= RowSelection::kDateTimeFraction;
  EXPECT_EQ(Statements(d).front(),
            "select ID,body,title,changed from books where changed>'2024-03-09 04:05:07.000120000'");

  // A column selected already is not selected twice; a maximum size uses keys.
  d.Columns.emplace("CHANGED", TagMap{});
  EXPECT_EQ(Statements(d).front(),
            "select ID,CHANGED,body,title from books where changed>'2024-03-09 04:05:07.000120000'");
  d.IndexMaxSize = 1;
  EXPECT_EQ(Statements(d), std::vector<std::string>{
                               "select ID,CHANGED,body,title from books where ID>12 AND ID<100012"});
}

TEST(FindexType, TextWinsNumbersWidenDatesWithNumbersBecomeText) {
  constexpr auto I = VALUE_TYPE::Integer, A = VALUE_TYPE::AsciiString, D = VALUE_TYPE::DateTime,
                 U = VALUE_TYPE::UnicodeString, F = VALUE_TYPE::Double;
  struct Case {
    std::vector<VALUE_TYPE> columns;
    int32_t type;
  };
  for (const Case& c : std::vector<Case>{
           {{}, 0}, {{I}, 1}, {{D}, 3}, {{U}, 4}, {{F, I}, 6}, {{I, D}, 2}, {{D, F}, 2},
           {{D, D}, 3}, {{U, A}, 4}, {{U, I, D}, 4}, {{I, F, D}, 2},
       }) {
    int32_t type = 0;
    for (VALUE_TYPE t : c.columns) type = NextFindexType(type, t);
    EXPECT_EQ(type, c.type) << ::testing::PrintToString(c.columns.size()) << " columns";
  }
}

}  // namespace
}  // namespace qm
