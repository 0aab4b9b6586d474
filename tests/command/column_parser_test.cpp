#include "command/findex_column_parser.h"
#include "command/order_column_parser.h"
#include "translator_fixture.h"

namespace qm::test {
namespace {

using ColumnParserTest = TranslatorTest;  // for the shipped error texts

TEST_F(ColumnParserTest, FindexColumnsWithTagsRepeatedColumnsReplaced) {
  ColumnMap columns{{"stale", {}}};
  ParseFindexColumns(
      u" title : CONTENT_WEIGHT = 3 :BASE_URL=\"http://host:8080/docs/\","
      u"\"body, text\":DOCUMENT_TYPE=\"a\"\"b\",zeta",
      columns, "CreateFindex");
  const ColumnMap expected{
      {"body, text", {{"DOCUMENT_TYPE", "a\"b"}}},
      {"title", {{"BASE_URL", "http://host:8080/docs/"}, {"CONTENT_WEIGHT", "3"}}},
      {"zeta", {}}};
  EXPECT_EQ(columns, expected);

  // A repeated column replaces the earlier one; the map is replaced whole.
  ParseFindexColumns(u"b,a:X=1,a:Y=2", columns, "TranslateW");
  EXPECT_EQ(columns, (ColumnMap{{"a", {{"Y", "2"}}}, {"b", {}}}));
  CIndexHeader header;
  header.Columns = columns;
  EXPECT_EQ(header.ColumnNames(), "a,b");
}

TEST_F(ColumnParserTest, RejectedFindexListsLeaveTheMapAsItWas) {
  for (const char16_t* list : {u"  ", u"a,,b", u"a,", u"a:X", u"a:=3", u"a:X=\"1", u"\"\":X=1"}) {
    SCOPED_TRACE(Utf16ToUtf8(list));
    ColumnMap columns{{"kept", {}}};
    try {
      ParseFindexColumns(list, columns, "CreateFindex");
      ADD_FAILURE() << "accepted";
    } catch (const CPiCmdException& e) {
      EXPECT_EQ(e.GetErrorNumber(), 17);
      EXPECT_NE(Utf16ToUtf8(e.GetEntries().front().text).find("Method:CreateFindex)"),
                std::string::npos);
    }
    EXPECT_EQ(columns, (ColumnMap{{"kept", {}}}));
  }
}

TEST_F(ColumnParserTest, OrderColumnsInListOrder) {
  OrderColumnList columns{{"stale", {}}};
  ParseOrderColumns(u"year, title ,\"last, first\",a:b", columns, "TranslateW");
  COrderInfo info;
  info.Columns = columns;
  EXPECT_EQ(info.ColumnNames(), "year,title,\"last, first\",a:b");

  EXPECT_THROW(ParseOrderColumns(u"a,,b", columns, "TranslateW"), CPiCmdException);
  EXPECT_THROW(ParseOrderColumns(u"\"a,b", columns, "TranslateW"), CPiCmdException);
  EXPECT_EQ(columns.size(), 4u);
}

}  // namespace
}  // namespace qm::test
