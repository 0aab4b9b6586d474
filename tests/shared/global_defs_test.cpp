// The settings object: folders and placeholders, configuration values, the
// connection and its display name, dbc.dat and the connection-text scramble.
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <optional>
#include <string>

#include "file_test_util.h"
#include "platform/local_time.h"
#include "shared/exception_family.h"
#include "shared/global_defs.h"
#include "shared/registry_key.h"
#include "shared/sql_time.h"
#include "shared/trace.h"
#include "support/test_support.h"

namespace qm {
namespace {

using test::RaisedText;

// Sets (or, with nullopt, removes) an environment variable for a scope.
class EnvValue {
 public:
  EnvValue(const char* name, std::optional<std::string> value) : name_(name) {
    if (const char* old = std::getenv(name)) old_ = old;
    if (value) {
      setenv(name, value->c_str(), 1);
    } else {
      unsetenv(name);
    }
  }
  ~EnvValue() {
    if (old_) {
      setenv(name_, old_->c_str(), 1);
    } else {
      unsetenv(name_);
    }
  }

 private:
  const char* name_;
  std::optional<std::string> old_;
};

std::string StdfunText(const std::string& text, const std::string& method) {
  return text + " (Module:STDFUN,Method:" + method + ")";
}

class GlobalDefsTest : public ::testing::Test {
 protected:
  test::ConfiguredHome home_;
};

TEST_F(GlobalDefsTest, EveryFolderKindResolves) {
  const std::string h = home_.Home();
  const std::string g = home_.Data() + "Groups/PUBLIC/";
  CGlobalDefs defs;
  const std::pair<FolderKind, std::string> expected[] = {
      {FolderKind::Home, h},
      {FolderKind::HomeConfig, h + "Config/"},
      {FolderKind::System, h + "System/"},
      {FolderKind::Log, h + "Log/"},
      {FolderKind::Tasks, h + "Tasks/"},
      {FolderKind::Data, home_.Data()},
      {FolderKind::Language, home_.Data() + "Language/"},
      {FolderKind::Converters, home_.Data() + "Converters/"},
      {FolderKind::Groups, home_.Data() + "Groups/"},
      {FolderKind::Group, g},
      {FolderKind::Indexes, g + "Indexes/"},
      {FolderKind::Orders, g + "Orders/"},
      {FolderKind::GroupConfig, g + "Config/"},
      {FolderKind::Repositories, g + "Repositories/"},
      {FolderKind::Repositories2, g + "Repositories/"},
      {FolderKind::Definitions, g + "Definitions/"},
      {FolderKind::Queries, g + "Queries/"},
      {FolderKind::WorkData, g + "WorkData/"},
      {FolderKind::DataStore, g + "DataStore/"},
  };
  for (const auto& [kind, path] : expected) {
    EXPECT_EQ(defs.GetFolder(kind), path) << static_cast<int>(kind);
  }
  EXPECT_EQ(RaisedText<CSTDFUNException>([&] { defs.GetFolder(static_cast<FolderKind>(19)); }),
            StdfunText("Unknown folder kind: 19", "GetFolder"));
  EXPECT_EQ(RaisedText<CSTDFUNException>([&] { defs.GetHomePath(FolderKind::Indexes); }),
            StdfunText("Unknown folder kind: 12", "GetHomePath"));
  EXPECT_EQ(RaisedText<CSTDFUNException>([&] { defs.GetFullDataPath(FolderKind::Log); }),
            StdfunText("Unknown folder kind: 11", "GetFullDataPath"));
}

TEST_F(GlobalDefsTest, DataRootChoiceSlashAndGroupSpelling) {
  CGlobalDefs defs;
  {
    EnvValue path("MORVIL_PATH", "/srv/D");
    EXPECT_EQ(defs.GetFolder(FolderKind::Indexes), "/srv/D/Groups/PUBLIC/Indexes/");
    EXPECT_EQ(defs.GetFolder(FolderKind::GroupConfig, true),
              "[QUILLMERE_HOME]\\Data/Groups/PUBLIC/Config/");
    EXPECT_EQ(defs.GetFolder(FolderKind::HomeConfig, true), "[QUILLMERE_HOME]\\Config/");
    defs.SetDataPath("/caller/data");
    EXPECT_EQ(defs.GetFolder(FolderKind::Data), "/caller/data/");
    EXPECT_EQ(defs.GetFolder(FolderKind::Data, true), "/caller/data/");
  }
  defs.SetGroup("grüne Bücher");
  EXPECT_EQ(defs.GetFolder(FolderKind::Orders), "/caller/data/Groups/GRÜNE BÜCHER/Orders/");
  for (const char* bad : {"", ".", "..", "../etc", "a/b"}) {
    defs.SetGroup(bad);
    EXPECT_EQ(RaisedText<CSTDFUNException>([&] { defs.GetFolder(FolderKind::Group); }),
              StdfunText("Invalid group name: " + std::string(bad), "GetFullDataPath"));
    EXPECT_EQ(defs.GetFolder(FolderKind::Groups), "/caller/data/Groups/");
  }
}

TEST_F(GlobalDefsTest, MissingRootsAreReportedOrLeftEmpty) {
  EnvValue path("MORVIL_PATH", std::nullopt);
  EnvValue home("MORVIL_HOME", std::nullopt);
  CGlobalDefs defs;
  EXPECT_EQ(RaisedText<CSTDFUNException>([&] { defs.GetFolder(FolderKind::WorkData); }),
            StdfunText("Data path is not set", "GetFullDataPath"));
  EXPECT_EQ(defs.GetFolder(FolderKind::HomeConfig), "");
  EXPECT_EQ(RaisedText<CSTDFUNException>(
                [&] { defs.GetHomePathRequired(FolderKind::HomeConfig, "SLGetTempConfigFilePath"); }),
            StdfunText("Home path is not set", "SLGetTempConfigFilePath"));
  // Text without data placeholders needs no data root.
  EXPECT_EQ(defs.ExpandPlaceholders("plain text"), "plain text");
}

TEST_F(GlobalDefsTest, PlaceholdersExpandAndTheDataRootCollapsesKeepingCase) {
  CGlobalDefs defs;
  defs.SetDataPath(home_.Data() + "Mixed/Root");
  const std::string data = home_.Data() + "Mixed/Root/";
  const std::string text =
      "[QUILLMERE_HOME]\\a;[QUILLMERE_CONFIG]\\b;[QUILLMERE_DATA]\\c;[QUILLMERE_DATA_GROUP]\\d;"
      "[QUILLMERE_DATA_CONVERTERS]\\e;[QUILLMERE_DATA_STORE]\\f;[QUILLMERE_DATA]\\g";
  EXPECT_EQ(defs.ExpandPlaceholders(text),
            home_.Home() + "a;" + home_.Home() + "Config/b;" + data + "c;" + data + "Groups/d;" +
                data + "Converters/e;" + data + "Groups/PUBLIC/DataStore/f;" + data + "g");
  EXPECT_EQ(defs.ExpandHomePlaceholders(text),
            home_.Home() + "a;" + home_.Home() +
                "Config/b;[QUILLMERE_DATA]\\c;[QUILLMERE_DATA_GROUP]\\d;"
                "[QUILLMERE_DATA_CONVERTERS]\\e;[QUILLMERE_DATA_STORE]\\f;[QUILLMERE_DATA]\\g");
  // Lower-case placeholders are not placeholders.
  EXPECT_EQ(defs.ExpandPlaceholders("[quillmere_home]\\x"), "[quillmere_home]\\x");

  const std::string stored = data + "Groups/PUBLIC/Repositories/Doc.HTML|" + data + "x";
  const std::string collapsed = defs.CollapseDataPath(stored);
  EXPECT_EQ(collapsed,
            "[QUILLMERE_DATA]\\Groups/PUBLIC/Repositories/Doc.HTML|[QUILLMERE_DATA]\\x");
  EXPECT_EQ(defs.ExpandPlaceholders(collapsed), stored);
  // Another spelling of the root names another folder here and stays.
  const std::string other = home_.Data() + "MIXED/ROOT/y";
  EXPECT_EQ(defs.CollapseDataPath(other), other);
}

TEST_F(GlobalDefsTest, ConfigurationValuesAndTheirMessages) {
  EXPECT_EQ(GetRegKey("home"), home_.Home());
  EXPECT_EQ(RaisedText<CSTDFUNException>([] { GetRegKey("client_piport"); }),
            StdfunText("Morvil registry key client_piport does not exists", "getregkey"));
  {
    EnvValue path("MORVIL_PATH", std::nullopt);
    EnvValue home("MORVIL_HOME", std::nullopt);
    EXPECT_EQ(RaisedText<CSTDFUNException>([] { GetRegKey("home"); }),
              StdfunText("Morvil registry key does not exists", "getregkey"));
  }
  test::ScratchDir dir("registry");
  test::WriteFile(dir.Path() + "registry.conf", "client_piport = 4100\n");
  EnvValue registry("MORVIL_REGISTRY", dir.Path() + "registry.conf");
  EXPECT_EQ(GetRegKey("client_piport"), "4100");
}

TEST_F(GlobalDefsTest, DsnConnectionIsTracedWithoutItsPassword) {
  test::WriteFile(home_.Home() + "Log/traceStat.log", "Trace Level 1\n");
  CGlobalDefs defs;
  EXPECT_TRUE(defs.TraceLevel1());
  EXPECT_FALSE(defs.TraceLevel2());
  EXPECT_FALSE(defs.IsConnectionSet());
  defs.SetConnectionDsn("Books", "reader", "s3cret");
  std::filesystem::remove(home_.Home() + "Log/traceStat.log");
  InitTraceLevels();

  EXPECT_TRUE(defs.IsConnectionSet());
  EXPECT_EQ(defs.GetConnectionMode(), ConnectionMode::Dsn);
  EXPECT_EQ(defs.GetConnectionString(), "DSN=Books;UID=reader;PWD=s3cret;");
  EXPECT_EQ(defs.GetDisplayName(), "Books");
  std::string logs;
  for (const auto& entry : std::filesystem::directory_iterator(home_.Home() + "Log")) {
    logs += entry.path().filename().string() + ":" + test::ReadFile(entry.path().string());
  }
  EXPECT_NE(logs.find("CGlobalDefs.set_connection - Connection set: DSN; Books\r\n"),
            std::string::npos)
      << logs;
  EXPECT_NE(logs.find("trace_PILIB_"), std::string::npos);
  EXPECT_NE(logs.find("trace_FILIB_"), std::string::npos);
  EXPECT_EQ(logs.find("s3cret"), std::string::npos);
}

TEST_F(GlobalDefsTest, ConnectionStringsAndTheirDisplayNames) {
  CGlobalDefs defs;
  defs.SetConnection("default", "Local store");
  EXPECT_EQ(defs.GetConnectionMode(), ConnectionMode::ConnectionString);
  EXPECT_EQ(defs.GetConnectionString(), "Driver=SQLite3;Database=" + home_.Data() +
                                            "Groups/PUBLIC/DataStore/Default.db;StepAPI=1;");
  EXPECT_EQ(defs.GetDisplayName(), "Local store");

  defs.SetConnectionString("", "ignored");
  EXPECT_EQ(defs.GetDisplayName(), "Local store");

  const std::pair<std::string, std::string> names[] = {
      {"dsn=books;uid=x;pwd=y", "BOOKS"},
      {"Driver=PostgreSQL;Server=h;db=Sales;", "SALES"},
      {"Driver=x;DSN=Last", "LAST"},
      {"Driver=SQLite3;Database=/d/Default.db;", "No Display Name"},
  };
  for (const auto& [text, name] : names) {
    defs.SetConnection(text, "");
    EXPECT_EQ(defs.GetConnectionString(), text);
    EXPECT_EQ(defs.GetDisplayName(), name) << text;
  }

  CGlobalDefs copy(defs);
  defs.SetConnectionDsn("Other", "", "");
  EXPECT_EQ(copy.GetConnectionString(), "Driver=SQLite3;Database=/d/Default.db;");
  EXPECT_EQ(copy.GetConnectionMode(), ConnectionMode::ConnectionString);
}

TEST_F(GlobalDefsTest, GroupConnectionComesFromAScrambledDbcDat) {
  CGlobalDefs defs;
  defs.SetGroup("sales");
  defs.SetConnection("DSN=Before;", "before");
  defs.SetConnection("SQL_GROUP_DEFAULT", "unused");  // no dbc.dat: nothing changes
  EXPECT_EQ(defs.GetConnectionString(), "DSN=Before;");

  std::string stored = "DSN=Orders;UID=clerk;PWD=p\tw d;";
  ScrambleConnectionText(stored);
  EXPECT_NE(stored, "DSN=Orders;UID=clerk;PWD=p\tw d;");
  test::WriteFile(home_.Data() + "Groups/SALES/Config/dbc.dat", stored + std::string(1, '\0'));
  defs.SetConnection("sql_group_default", "unused");
  EXPECT_EQ(defs.GetConnectionString(), "DSN=Orders;UID=clerk;PWD=p\tw d;");
  EXPECT_EQ(defs.GetDisplayName(), "sales");
}

TEST(ConnectionScrambleTest, TheSubstitutionIsItsOwnInverseOverEveryByte) {
  for (int b = 0; b < 256; ++b) {
    const auto once = ScrambleConnectionByte(static_cast<uint8_t>(b));
    EXPECT_EQ(ScrambleConnectionByte(once), b) << b;
  }
  const std::pair<int, int> pairs[] = {{9, 2},    {10, 3},   {13, 4},   {32, 1},  {34, 84},
                                       {83, 133}, {134, 184}, {183, 233}, {0, 0},  {5, 5},
                                       {31, 31},  {33, 33},  {234, 234}, {255, 255}};
  for (const auto& [from, to] : pairs) {
    EXPECT_EQ(ScrambleConnectionByte(static_cast<uint8_t>(from)), to) << from;
  }
  std::string text = "Driver={x};PWD=\xC3\xA9t\xC3\xA9;";
  const std::string original = text;
  ScrambleConnectionText(text);
  ScrambleConnectionText(text);
  EXPECT_EQ(text, original);
}

TEST(SqlTimeTest, LocalTimeBecomesADateAndDatesPrintWithoutLeadingZeros) {
  const platform::LocalTime now{2004, 3, 9, 14, 5, 7};
  const DateTimeValue date = SystemTimeToSQLTime(now);
  EXPECT_EQ(date, (DateTimeValue{2004, 3, 9, 14, 5, 7, 0}));
  EXPECT_EQ(SQLTimeToString(date), "2004-3-9 14:5:7");
  EXPECT_EQ(SQLTimeToString(DateTimeValue{1999, 12, 31, 0, 0, 9, 250}, true),
            "1999-12-31 0:0:9.250");
}

}  // namespace
}  // namespace qm
