// The settings object: folders and placeholders, configuration values, the
// connection and its display name, dbc.dat and the connection-text scramble.
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <string>

#include "support/file_test_util.h"
#include "base/exception_family.h"
#include "config/global_defs.h"
#include "config/registry_key.h"
#include "base/sql_time.h"
#include "base/trace.h"
#include "support/test_support.h"

namespace qm {
namespace {

using test::RaisedText;

std::string Stdfun(const std::string& text, const std::string& method) {
  return text + " (Module:STDFUN,Method:" + method + ")";
}

class GlobalDefsTest : public ::testing::Test {
 protected:
  test::ConfiguredHome home_;  // restores the variables the tests change
};

TEST_F(GlobalDefsTest, FolderKinds) {
  CGlobalDefs defs;
  const std::string h = home_.Home(), d = home_.Data(), g = d + "Groups/PUBLIC/";
  const std::pair<int, std::string> kinds[] = {
      {8, h},  {14, h + "Config/"}, {10, h + "System/"}, {11, h + "Log/"}, {15, h + "Tasks/"},
      {0, d},  {17, d + "Language/"}, {5, d + "Converters/"}, {18, d + "Groups/"}, {7, g},
      {12, g + "Indexes/"}, {13, g + "Orders/"}, {9, g + "Config/"}, {1, g + "Repositories/"},
      {16, g + "Repositories/"}, {2, g + "Definitions/"}, {4, g + "Queries/"},
      {3, g + "WorkData/"}, {6, g + "DataStore/"}};
  for (const auto& [kind, path] : kinds) EXPECT_EQ(defs.GetFolder(FolderKind(kind)), path) << kind;
  EXPECT_EQ(RaisedText<CSTDFUNException>([&] { defs.GetFolder(FolderKind(19)); }),
            Stdfun("Unknown folder kind: 19", "GetFolder"));

  setenv("MORVIL_PATH", "/srv/D", 1);  // no trailing slash
  EXPECT_EQ(defs.GetFolder(FolderKind::Indexes), "/srv/D/Groups/PUBLIC/Indexes/");
  EXPECT_EQ(defs.GetFolder(FolderKind::GroupConfig, true),
            "[QUILLMERE_HOME]\\Data/Groups/PUBLIC/Config/");
  defs.SetDataPath("/caller/data");  // wins over the configured path and the placeholder
  EXPECT_EQ(defs.GetFolder(FolderKind::Data, true), "/caller/data/");
  defs.SetGroup("grüne Bücher");
  EXPECT_EQ(defs.GetFolder(FolderKind::Orders), "/caller/data/Groups/GRÜNE BÜCHER/Orders/");
  for (const char* bad : {"", "..", "a/b"}) {
    defs.SetGroup(bad);
    EXPECT_EQ(RaisedText<CSTDFUNException>([&] { defs.GetFolder(FolderKind::Group); }),
              Stdfun("Invalid group name: " + std::string(bad), "GetFullDataPath"));
  }
}

TEST_F(GlobalDefsTest, MissingRootsAreReportedOrLeftEmpty) {
  unsetenv("MORVIL_PATH");
  unsetenv("MORVIL_HOME");
  CGlobalDefs defs;
  EXPECT_EQ(RaisedText<CSTDFUNException>([&] { defs.GetFolder(FolderKind::WorkData); }),
            Stdfun("Data path is not set", "GetFullDataPath"));
  EXPECT_EQ(defs.GetFolder(FolderKind::HomeConfig), "");
  EXPECT_EQ(RaisedText<CSTDFUNException>(
                [&] { defs.GetHomePathRequired(FolderKind::HomeConfig, "SLGetTempConfigFilePath"); }),
            Stdfun("Home path is not set", "SLGetTempConfigFilePath"));
  EXPECT_EQ(RaisedText<CSTDFUNException>([] { GetRegKey("home"); }),
            Stdfun("Morvil registry key does not exists", "getregkey"));
}

TEST_F(GlobalDefsTest, PlaceholdersExpandAndTheDataRootCollapsesKeepingCase) {
  CGlobalDefs defs;
  defs.SetDataPath(home_.Data() + "Mixed/Root");
  const std::string h = home_.Home(), d = home_.Data() + "Mixed/Root/";
  const std::string text =
      "[QUILLMERE_HOME]\\a;[QUILLMERE_CONFIG]\\b;[QUILLMERE_DATA]\\c;[QUILLMERE_DATA_GROUP]\\d;"
      "[QUILLMERE_DATA_CONVERTERS]\\e;[QUILLMERE_DATA_STORE]\\f;[quillmere_data]\\g";
  EXPECT_EQ(defs.ExpandPlaceholders(text),
            h + "a;" + h + "Config/b;" + d + "c;" + d + "Groups/d;" + d + "Converters/e;" + d +
                "Groups/PUBLIC/DataStore/f;[quillmere_data]\\g");
  EXPECT_EQ(defs.ExpandHomePlaceholders(text),
            h + "a;" + h + "Config/b" + text.substr(text.find(";[QUILLMERE_DATA]")));

  const std::string stored = d + "Groups/PUBLIC/Repositories/Doc.HTML|" + d + "x|" +
                             home_.Data() + "MIXED/ROOT/y";  // another spelling is another folder
  const std::string collapsed = defs.CollapseDataPath(stored);
  EXPECT_EQ(collapsed, "[QUILLMERE_DATA]\\Groups/PUBLIC/Repositories/Doc.HTML|[QUILLMERE_DATA]\\x|" +
                           home_.Data() + "MIXED/ROOT/y");
  EXPECT_EQ(defs.ExpandPlaceholders(collapsed), stored);
}

TEST_F(GlobalDefsTest, DsnConnectionIsTracedWithoutItsPassword) {
  test::WriteFile(home_.Home() + "Log/traceStat.log", "Trace Level 1\n");
  CGlobalDefs defs;
  EXPECT_TRUE(defs.TraceLevel1());
  EXPECT_FALSE(defs.IsConnectionSet());
  defs.SetConnectionDsn("Books", "reader", "s3cret");
  EXPECT_EQ(defs.GetConnectionString(), "DSN=Books;UID=reader;PWD=s3cret;");
  EXPECT_EQ(defs.GetDisplayName(), "Books");
  const std::string log = test::TraceOf(home_, "PILIB");
  EXPECT_TRUE(log.ends_with(" (SHARELIB)CGlobalDefs.set_connection - Connection set: DSN; Books\r\n"));
  EXPECT_EQ(log.find("s3cret"), std::string::npos);
  std::filesystem::remove(home_.Home() + "Log/traceStat.log");
  InitTraceLevels();  // the process-wide flags back to off for the other tests
}

TEST_F(GlobalDefsTest, GroupConnectionComesFromAScrambledDbcDat) {
  CGlobalDefs defs;
  defs.SetGroup("sales");
  defs.SetConnection("DSN=Before;", "before");
  defs.SetConnection("SQL_GROUP_DEFAULT", "unused");  // no dbc.dat: nothing changes
  EXPECT_EQ(defs.GetConnectionString(), "DSN=Before;");
  const std::string plain = "DSN=Orders;UID=clerk;PWD=p\tw d;";
  std::string stored = plain;
  ScrambleConnectionText(stored);
  EXPECT_NE(stored, plain);
  test::WriteFile(home_.Data() + "Groups/SALES/Config/dbc.dat", stored + std::string(1, '\0'));
  defs.SetConnection("sql_group_default", "unused");
  EXPECT_EQ(defs.GetConnectionString(), plain);
  EXPECT_EQ(defs.GetDisplayName(), "sales");
}

TEST(ConnectionScrambleTest, TheSubstitutionIsItsOwnInverse) {
  for (int b = 0; b < 256; ++b) {
    EXPECT_EQ(ScrambleConnectionByte(ScrambleConnectionByte(static_cast<uint8_t>(b))), b) << b;
  }
  const std::pair<int, int> pairs[] = {{9, 2}, {32, 1}, {34, 84}, {183, 233}, {33, 33}, {234, 234}};
  for (const auto& [from, to] : pairs) {
    EXPECT_EQ(ScrambleConnectionByte(static_cast<uint8_t>(from)), to) << from;
  }
}

TEST(SqlTimeTest, LocalTimeBecomesADateAndDatesPrintWithoutLeadingZeros) {
  const DateTimeValue date = SystemTimeToSQLTime({2004, 3, 9, 14, 5, 7});
  EXPECT_EQ(date, (DateTimeValue{2004, 3, 9, 14, 5, 7, 0}));
  EXPECT_EQ(SQLTimeToString(date), "2004-3-9 14:5:7");
  EXPECT_EQ(SQLTimeToString(date, true), "2004-3-9 14:5:7.0");
}

}  // namespace
}  // namespace qm
