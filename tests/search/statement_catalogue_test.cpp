// Search statements on findexes built from SQLite: values are read with the
// findex's own separators, value type and stop words.
#include <gtest/gtest.h>

#include <string>

#include "api/command_fixture.h"
#include "search/cmd_tree.h"
#include "search/condition_shape.h"

namespace qm {
namespace {

class StatementCatalogueTest : public test::CommandFixture {
 protected:
  void SetUp() override {
    CommandFixture::SetUp();
    UseShippedLanguages();
    UseSqlite();
    defs_ = Defs();
  }

  void Build(const std::string& findex, const std::string& column_type, const std::string& row) {
    const std::string table = "t_" + findex;
    Sql({"create table " + table + " (id integer, v " + column_type + ")",
         "insert into " + table + " values (1, " + row + ")"});
    ASSERT_EQ(Run("CREATE FINDEX " + findex + " ON TABLE " + table + " COLUMNS v KEY id"), "");
  }

  std::string ShapeOf(const std::string& condition) {
    CGiCmdTree command(defs_);
    command.SplitSqlW(Utf8ToUtf16("SELECT id FROM t WHERE [" + condition + "]"));
    return test::Shape(command.Root());
  }

  CGlobalDefs defs_;
};

TEST_F(StatementCatalogueTest, ValuesFollowTheFindexTheyName) {
  // English stop words on.
  ASSERT_EQ(command_->SetIndexLanguageOptions(2, VARIANT_FALSE, VARIANT_FALSE, VARIANT_TRUE,
                                              VARIANT_FALSE, VARIANT_FALSE),
            S_OK);
  Build("Stopped", "varchar(100)", "'the river of life'");
  Build("Counted", "integer", "1999");
  ASSERT_EQ(command_->SetIndexLanguageOptions(2, VARIANT_FALSE, VARIANT_FALSE, VARIANT_FALSE,
                                              VARIANT_FALSE, VARIANT_FALSE),
            S_OK);
  Build("Kept", "varchar(100)", "'the river of life'");
  Build("Years", "integer", "1999");
  // Blanks alone separate words.
  ASSERT_EQ(command_->SetIndexGeneralOptions(VARIANT_FALSE, VARIANT_TRUE, VARIANT_FALSE, T(" "),
                                             VARIANT_FALSE, VARIANT_FALSE),
            S_OK);
  Build("Spaced", "varchar(100)", "'red-wine'");

  struct Case {
    const char* condition;
    const char* shape;
  };
  const Case cases[] = {
      {"STOPPED='the river of life'", "STOPPED{ADJ(RIVER,LIFE)}"},
      // Operators between values are no stop words, though "or" and "and" are.
      {"COUNTED='1999' OR '2001'", "COUNTED{OR(1999,2001)}"},
      {"COUNTED='1999' AND '2001'", "COUNTED{AND(1999,2001)}"},
      {"KEPT='the river'", "KEPT{ADJ(THE,RIVER)}"},
      {"KEPT='red-wine'", "KEPT{ADJ(RED,WINE)}"},
      {"SPACED='red-wine'", "SPACED{RED-WINE}"},
      {"YEARS!='1999' AND KEPT='river'", "AND(FILTERNOT(YEARS{*},YEARS{1999}),KEPT{RIVER})"},
  };
  for (const Case& c : cases) {
    EXPECT_EQ(ShapeOf(c.condition), c.shape) << c.condition;
  }
}

}  // namespace
}  // namespace qm
