#include "command/findex_column_parser.h"
#include "command/order_column_parser.h"
#include "support/file_test_util.h"
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
  ParseFindexColumns(u"b,a:CONTENT_WEIGHT=1,a:CONTENT_TYPE=URL", columns, "TranslateW");
  EXPECT_EQ(columns, (ColumnMap{{"a", {{"CONTENT_TYPE", "URL"}}}, {"b", {}}}));
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

// A tag no build reads, or a weight that is not a whole number, would be
// ignored and give another findex than the one asked for.
TEST_F(ColumnParserTest, UnknownTagsAndWeightsThatAreNoWholeNumberAreRefusedByName) {
  struct Case {
    const char16_t* list;
    const char* message;  // empty: accepted
  };
  for (const Case& c : {
           Case{u"title:CONTENT_WEIGHT=abc,body", "CONTENT_WEIGHT on column title takes a whole number, not \"abc\""},
           Case{u"title:CONTENT_WEIGHT=2.5", "CONTENT_WEIGHT on column title takes a whole number"},
           Case{u"title,body:NOSUCHTAG=1", "Unknown column tag NOSUCHTAG on column body"},
           Case{u"title:content_weight=3", ""},
           Case{u"title:CONTENT_WEIGHT=-2,body:CONTENT_WEIGHT= 0 ", ""},
           Case{u"u:CONTENT_TYPE=URL:BASE_URL=\"http://h/\",d:DOCUMENT_TYPE=pdf:BASE_FILE_PATH=/x", ""},
       }) {
    SCOPED_TRACE(Utf16ToUtf8(c.list));
    ColumnMap columns{{"kept", {}}};
    if (*c.message == '\0') {
      EXPECT_NO_THROW(ParseFindexColumns(c.list, columns, "TranslateW"));
      continue;
    }
    const std::string text = RaisedText<CPiCmdException>(
        [&] { ParseFindexColumns(c.list, columns, "TranslateW"); });
    EXPECT_NE(text.find(c.message), std::string::npos) << text;
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
