// CShareDatabase against real drivers: SQLite through the SQLite ODBC driver,
// and the PostgreSQL server that scripts/test starts, through the ANSI and the
// Unicode PostgreSQL drivers.
#include "sources/share_database.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <string>

#include "base/exception_family.h"
#include "config/global_defs.h"
#include "support/test_support.h"

namespace qm {
namespace {

namespace fs = std::filesystem;

enum class Source { SQLite, PostgresAnsi, PostgresUnicode };

std::string SourceName(const ::testing::TestParamInfo<Source>& info) {
  const char* names[] = {"SQLite", "PostgresAnsi", "PostgresUnicode"};
  return names[static_cast<int>(info.param)];
}

const char* EnvName(Source s) {
  return s == Source::PostgresAnsi ? "QM_TEST_PG_ANSI" : "QM_TEST_PG_UNICODE";
}

std::string FullText(CExceptionBase& e) { return e.GetFullTextUtf8(100); }

// The text a ShareDatabase error shows the host, or "no error".
template <class F>
std::string ErrorText(F&& f) {
  try {
    f();
  } catch (CShareDatabaseException& e) {
    return FullText(e);
  }
  return "no error";
}

// A table name no other test process uses at the same time.
std::string UniqueTable(const char* stem) {
  static int counter = 0;
  return std::string(stem) + "_" + std::to_string(getpid()) + "_" + std::to_string(++counter);
}

class DatabaseTest : public ::testing::Test {
 protected:
  void SetUp() override {
    const fs::path group = fs::path(scratch_.Path()) / "Groups" / "PUBLIC";
    for (const char* folder : {"WorkData", "Config", "DataStore"}) {
      fs::create_directories(group / folder);
    }
    work_folder_ = (group / "WorkData").string();
    defs_.SetDataPath(scratch_.Path());
  }

  void UseSqlite(const std::string& file = "test.db") {
    defs_.SetConnectionString("Driver=SQLite3;Database=" + scratch_.Path() + file + ";StepAPI=1",
                              "test");
  }

  void Run(CShareDatabase& db, const std::string& sql) {
    int16_t n = -1;
    db.ExecuteSql(sql, n);
  }

  std::size_t WorkFiles() const {
    return static_cast<std::size_t>(
        std::distance(fs::directory_iterator(work_folder_), fs::directory_iterator()));
  }

  test::ScratchDir scratch_{"odbc"};
  CGlobalDefs defs_;
  std::string work_folder_;
};

class SourceTest : public DatabaseTest, public ::testing::WithParamInterface<Source> {
 protected:
  void SetUp() override {
    DatabaseTest::SetUp();
    if (GetParam() == Source::SQLite) {
      UseSqlite();
      return;
    }
    const char* connection = std::getenv(EnvName(GetParam()));
    if (connection == nullptr || *connection == '\0') {
      GTEST_SKIP() << EnvName(GetParam())
                   << " is not set: run through scripts/test, which starts PostgreSQL";
    }
    defs_.SetConnectionString(connection, "test");
  }

  bool Postgres() const { return GetParam() != Source::SQLite; }
  bool Wide() const { return GetParam() == Source::PostgresUnicode; }
  std::string Blob(const char* hex) const {
    return Postgres() ? "'\\x" + std::string(hex) + "'::bytea" : "X'" + std::string(hex) + "'";
  }
};

// The first piece of 255 bytes ends inside a character.
std::string LongBody() {
  std::string s = "ab";
  for (int i = 0; i < 5000; ++i) s += "é";
  return s;
}

TEST_P(SourceTest, EveryColumnKindReadsTheSameThroughEveryDriver) {
  CShareDatabase db(defs_);
  db.Connect();
  const std::string t = UniqueTable("kinds");
  Run(db, "CREATE TABLE " + t +
              " (id INTEGER, Title VARCHAR(100), body TEXT, r REAL, dbl DOUBLE "
              "PRECISION, price NUMERIC(12,2), d DATE, ts TIMESTAMP, data " +
              (Postgres() ? "BYTEA" : "BLOB") + ")");
  Run(db, "INSERT INTO " + t + " VALUES (1, 'Ärger café Москва', '" + LongBody() +
              "', 3.25, 3.25, 1234.56, '2024-02-29', '2024-02-29 13:45:59.123456', " +
              Blob("00ff41") + ")");
  Run(db, "INSERT INTO " + t + " (id) VALUES (2)");
  Run(db, "INSERT INTO " + t +
              " VALUES (3, '42', 'Привет, мир', -0.5, 1e10, -0.5, '1999-12-31', "
              "'1999-12-31 23:59:59', " +
              Blob("") + ")");

  int16_t n = 0;
  db.ExecuteSql("SELECT id, Title, body, r, dbl, price, d, ts, data FROM " + t + " ORDER BY id", n);
  ASSERT_EQ(n, 9);
  // Only the Unicode PostgreSQL driver describes its text columns as wide.
  const VALUE_TYPE text = Wide() ? VALUE_TYPE::UnicodeString : VALUE_TYPE::AsciiString;
  const VALUE_TYPE types[] = {VALUE_TYPE::Integer,  text,
                              text,                 VALUE_TYPE::Double,
                              VALUE_TYPE::Double,   VALUE_TYPE::Double,
                              VALUE_TYPE::DateTime, VALUE_TYPE::DateTime,
                              VALUE_TYPE::AsciiString};
  for (int i = 1; i <= n; ++i) EXPECT_EQ(db.MapColumnType(i), types[i - 1]) << i;
  EXPECT_EQ(db.GetColumnDescription(2).sql_type, Wide() ? -9 : 12);
  EXPECT_EQ(db.GetColumnDescription(3).sql_type, Wide() ? -10 : -1);
  EXPECT_EQ(db.GetColumnIndex("title"), 2);
  EXPECT_EQ(db.GetColumnIndex("TITLE"), 2);
  EXPECT_EQ(db.GetColumnIndex("\"Title\""), 2);
  EXPECT_EQ(db.GetColumnIndex("nothing"), 0);
  db.AllocateCache();

  // Row 1: every kind with a value.
  db.CacheColumns();
  CValue v;
  ASSERT_EQ(db.GetColumnValueFromCache(1, VALUE_TYPE::Integer, v), 0);
  EXPECT_EQ(v.GetInteger(), 1);
  db.GetColumnValueFromCache("title", VALUE_TYPE::AsciiString, v);
  EXPECT_EQ(v.Narrow(), "Ärger café Москва");
  db.GetColumnValueFromCache("TITLE", VALUE_TYPE::UnicodeString, v);
  EXPECT_EQ(v.Wide(), u"Ärger café Москва");
  db.GetColumnValueFromCache(3, VALUE_TYPE::AsciiString, v);
  EXPECT_EQ(v.Narrow(), LongBody().substr(0, 2 + 1998 * 2));  // 2,000 characters
  db.GetColumnValueFromCache(4, VALUE_TYPE::Double, v);
  EXPECT_EQ(v.GetDouble(), 3.25);
  db.GetColumnValueFromCache(5, VALUE_TYPE::AsciiString, v);
  EXPECT_EQ(v.Narrow(), "3.25");
  db.GetColumnValueFromCache(6, VALUE_TYPE::Double, v);
  EXPECT_EQ(v.GetDouble(), 1234.56);
  db.GetColumnValueFromCache(6, VALUE_TYPE::Integer, v);
  EXPECT_EQ(v.GetInteger(), 1234);
  db.GetColumnValueFromCache(7, VALUE_TYPE::DateTime, v);
  EXPECT_EQ(v.GetDateTime(), (DateTimeValue{2024, 2, 29, 0, 0, 0, 0}));
  db.GetColumnValueFromCache(8, VALUE_TYPE::DateTime, v);
  EXPECT_EQ(v.GetDateTime(), (DateTimeValue{2024, 2, 29, 13, 45, 59, 123456000}));
  db.GetColumnValueFromCache(8, VALUE_TYPE::AsciiString, v);
  EXPECT_EQ(v.Narrow(), "2024-2-29 13:45:59.123456");
  db.GetColumnValueFromCache(9, VALUE_TYPE::AsciiString, v);
  const std::string blob_path(v.Narrow());
  EXPECT_EQ(blob_path.rfind(work_folder_, 0), 0u) << blob_path;
  EXPECT_EQ(test::ReadFile(blob_path), std::string("\x00\xFF\x41", 3));
  db.CleanCacheColumns();
  EXPECT_FALSE(fs::exists(blob_path));

  // Row 2: NULLs are reported as such and leave the value alone.
  ASSERT_EQ(db.MoveNext(), 0);
  db.CacheColumns();
  EXPECT_EQ(db.GetNullCount(), 8);
  for (int i = 2; i <= n; ++i) {
    CValue untouched;
    untouched.SetText("sentinel");
    EXPECT_EQ(db.GetColumnValueFromCache(i, VALUE_TYPE::Integer, untouched), 2) << i;
    EXPECT_EQ(untouched.GetType(), VALUE_TYPE::AsciiString);
    EXPECT_EQ(untouched.Narrow(), "sentinel");
  }
  EXPECT_EQ(WorkFiles(), 0u);  // no copy of a NULL binary

  // Row 3: text that is a number, big and negative numbers, an empty binary.
  ASSERT_EQ(db.MoveNext(), 0);
  db.CacheColumns();
  db.GetColumnValueFromCache(2, VALUE_TYPE::Integer, v);
  EXPECT_EQ(v.GetInteger(), 42);
  db.GetColumnValueFromCache(3, VALUE_TYPE::UnicodeString, v);
  EXPECT_EQ(v.Wide(), u"Привет, мир");
  db.GetColumnValueFromCache(4, VALUE_TYPE::Integer, v);
  EXPECT_EQ(v.GetInteger(), 0);
  db.GetColumnValueFromCache(5, VALUE_TYPE::AsciiString, v);
  EXPECT_EQ(v.Narrow(), "1e+10");
  db.GetColumnValueFromCache(6, VALUE_TYPE::Double, v);
  EXPECT_EQ(v.GetDouble(), -0.5);
  db.GetColumnValueFromCache(8, VALUE_TYPE::DateTime, v);
  EXPECT_EQ(v.GetDateTime(), (DateTimeValue{1999, 12, 31, 23, 59, 59, 0}));
  db.GetColumnValueFromCache(9, VALUE_TYPE::AsciiString, v);
  EXPECT_EQ(test::ReadFile(std::string(v.Narrow())), "");
  EXPECT_EQ(WorkFiles(), 1u);
  db.CleanCacheColumns();
  EXPECT_EQ(WorkFiles(), 0u);

  EXPECT_EQ(db.MoveNext(), 1);
  EXPECT_TRUE(db.IsEndOfData());
  EXPECT_EQ(db.MoveNext(), 1);
  Run(db, "DROP TABLE " + t);
  db.Disconnect();
}

TEST_P(SourceTest, WholeTextIsReadToItsLimitAndCutBetweenCharacters) {
  CShareDatabase db(defs_);
  db.Connect();
  const std::string t = UniqueTable("whole");
  Run(db, "CREATE TABLE " + t + " (id INTEGER, body TEXT)");
  std::string long_text = "x";
  for (int i = 0; i < 3000; ++i) long_text += "é";  // 6,001 bytes, 3,001 characters
  Run(db, "INSERT INTO " + t + " VALUES (1, '" + long_text + "'), (2, 'short')");
  int16_t n = 0;
  db.ExecuteSql("SELECT body FROM " + t + " ORDER BY id", n);
  db.AllocateCache();
  // 3,000 bytes as the driver sends them: UTF-8 "x" and 1,499 whole "é" (the
  // next one would end past the limit), or 1,500 UTF-16 units.
  db.SetWholeText(1, 3000);
  CValue v;
  db.CacheColumns();
  EXPECT_TRUE(db.WasCut(1));
  db.GetColumnValueFromCache(1, VALUE_TYPE::UnicodeString, v);
  EXPECT_EQ(v.Wide().size(), 1500u);
  EXPECT_EQ(v.Wide().back(), u'\u00e9');
  ASSERT_EQ(db.MoveNext(), 0);
  db.CacheColumns();
  EXPECT_FALSE(db.WasCut(1));

  // Without a limit the engine's cut of 2,000 characters holds.
  db.ExecuteSql("SELECT body FROM " + t + " ORDER BY id", n);
  db.AllocateCache();
  db.CacheColumns();
  db.GetColumnValueFromCache(1, VALUE_TYPE::UnicodeString, v);
  EXPECT_EQ(v.Wide().size(), 2000u);
  EXPECT_FALSE(db.WasCut(1));
  Run(db, "DROP TABLE " + t);
}

TEST_P(SourceTest, EmptyResultWarnsOnFirstReadAndEndsTheRows) {
  CShareDatabase db(defs_);
  db.Connect();
  int16_t n = 0;
  const std::string t = UniqueTable("empty");
  Run(db, "CREATE TABLE " + t + " (id INTEGER, name VARCHAR(10))");
  db.ExecuteSql("SELECT id, name FROM " + t, n);
  EXPECT_EQ(n, 2);
  EXPECT_FALSE(db.IsEndOfData());
  db.AllocateCache();
  try {
    db.CacheColumns();
    FAIL() << "an empty result must raise the warning";
  } catch (CShareDatabaseWarning& w) {
    EXPECT_NE(FullText(w).find("Invalid cursor state"), std::string::npos) << FullText(w);
  }
  EXPECT_TRUE(db.IsEndOfData());
  EXPECT_EQ(db.MoveNext(), 1);
  Run(db, "DROP TABLE " + t);
}

TEST_P(SourceTest, DataSourceErrorCarriesDriverTextAndStatement) {
  CShareDatabase db(defs_);
  db.Connect();
  const std::string sql = "SELECT id FROM no_such_table_here";
  int16_t n = 0;
  const std::string text = ErrorText([&] { db.ExecuteSql(sql, n); });
  // The driver's own words (naming the table), then the statement.
  EXPECT_NE(text.find("no_such_table_here"), std::string::npos) << text;
  EXPECT_NE(text.find("\r\nArgument: " + sql + "\r\n (Module:ShareDatabase,Method:ExecuteSql)"),
            std::string::npos)
      << text;
  EXPECT_EQ(text.find("No explanation from database"), std::string::npos) << text;
  EXPECT_NE(db.GetLastDiagnostic().find("no_such_table_here"), std::string::npos);
  // The connection stays usable.
  db.ExecuteSql("SELECT 1", n);
  EXPECT_EQ(n, 1);
}

TEST_P(SourceTest, ResultsOfMoreThan99ColumnsAreRefused) {
  CShareDatabase db(defs_);
  db.Connect();
  auto select_of = [](int columns) {
    std::string sql = "SELECT 1 AS c1";
    for (int i = 2; i <= columns; ++i)
      sql += ", " + std::to_string(i) + " AS c" + std::to_string(i);
    return sql;
  };
  int16_t n = 0;
  db.ExecuteSql(select_of(99), n);
  EXPECT_EQ(n, 99);
  db.AllocateCache();
  db.CacheColumns();
  CValue v;
  db.GetColumnValueFromCache("C99", VALUE_TYPE::Integer, v);
  EXPECT_EQ(v.GetInteger(), 99);
  EXPECT_EQ(ErrorText([&] { db.ExecuteSql(select_of(100), n); }),
            "Too many table columns (Module:ShareDatabase,Method:ExecuteSql)\r\n");
}

INSTANTIATE_TEST_SUITE_P(Drivers, SourceTest,
                         ::testing::Values(Source::SQLite, Source::PostgresAnsi,
                                           Source::PostgresUnicode),
                         SourceName);

TEST_F(DatabaseTest, IntegerColumnsNeverWrapNorTurnGarbageIntoNull) {
  UseSqlite();
  CShareDatabase db(defs_);
  db.Connect();
  Run(db, "CREATE TABLE n (i INTEGER)");
  Run(db, "INSERT INTO n VALUES (2147483647)");
  Run(db, "INSERT INTO n VALUES (2147483648)");
  Run(db, "INSERT INTO n VALUES ('abc')");
  int16_t count = 0;
  db.ExecuteSql("SELECT i FROM n ORDER BY rowid", count);
  CValue v;
  EXPECT_EQ(db.GetColumnValue(1, v, false), 0);
  EXPECT_EQ(v.GetInteger(), 2147483647);
  for (int row = 2; row <= 3; ++row) {
    ASSERT_EQ(db.MoveNext(), 0);
    EXPECT_EQ(ErrorText([&] { db.GetColumnValue(1, v, false); }),
              "Could not convert column value into appropriate type "
              "(Module:ShareDatabase,Method:GetColumnValue)\r\n")
        << row;
  }
  EXPECT_EQ(db.GetNullCount(), 0);
}

TEST_F(DatabaseTest, CacheMisuseIsReportedByName) {
  UseSqlite();
  CShareDatabase db(defs_);
  db.Connect();
  int16_t n = 0;
  db.ExecuteSql("SELECT 1 AS a, 2 AS b", n);
  CValue v;
  EXPECT_EQ(
      ErrorText([&] { db.CacheColumns(); }),
      "Column cache not allocated for all columns (Module:ShareDatabase,Method:CacheColumns)\r\n");
  EXPECT_EQ(ErrorText([&] { db.CleanCacheColumns(); }),
            "Column cache not allocated for all columns "
            "(Module:ShareDatabase,Method:CleanCacheColumns)\r\n");
  db.AllocateCache();
  // Nothing cached for this row yet: no other row's values are handed out.
  EXPECT_EQ(ErrorText([&] { db.GetColumnValueFromCache(1, VALUE_TYPE::Integer, v); }),
            "No current row (Module:ShareDatabase,Method:GetColumnValueFromCache)\r\n");
  db.CacheColumns();
  EXPECT_EQ(
      ErrorText([&] { db.GetColumnValueFromCache("c", VALUE_TYPE::Integer, v); }),
      "Column name c does not exist (Module:ShareDatabase,Method:GetColumnValueFromCache)\r\n");
  EXPECT_EQ(
      ErrorText([&] { db.GetColumnValueFromCache(3, VALUE_TYPE::Integer, v); }),
      "Column does not exist in cache (Module:ShareDatabase,Method:GetColumnValueFromCache)\r\n");
  EXPECT_EQ(ErrorText([&] { db.GetColumnValue(3, v, false); }),
            "Column does not exist (Module:ShareDatabase,Method:GetColumnValue)\r\n");
  EXPECT_EQ(db.MoveNext(), 1);
  EXPECT_EQ(ErrorText([&] { db.GetColumnValue(1, v, false); }),
            "No current row (Module:ShareDatabase,Method:GetColumnValue)\r\n");
}

TEST_F(DatabaseTest, CacheRemovesOnlyTheCopiesItMade) {
  UseSqlite();
  const std::string bystander = scratch_.Path() + "keep.txt";
  test::WriteFile(bystander, "data");
  {
    CShareDatabase db(defs_);
    db.Connect();
    Run(db, "CREATE TABLE f (data BLOB, name TEXT)");
    Run(db, "INSERT INTO f VALUES (X'01', '" + bystander + "')");
    int16_t n = 0;
    db.ExecuteSql("SELECT data FROM f", n);
    db.AllocateCache();
    db.CacheColumns();
    db.CleanCacheColumns();
    // The same cache, a statement whose first column is text naming a file.
    db.ExecuteSql("SELECT name FROM f", n);
    db.CacheColumns();
    db.CleanCacheColumns();
    EXPECT_TRUE(fs::exists(bystander));
    // A copy nobody cleaned goes with the object.
    db.ExecuteSql("SELECT data FROM f", n);
    db.CacheColumns();
    EXPECT_EQ(WorkFiles(), 1u);
  }
  EXPECT_EQ(WorkFiles(), 0u);
}

TEST_F(DatabaseTest, ConnectionStringPlaceholdersAndConnectFailures) {
  // The store folder's placeholder is expanded before the driver sees the text.
  defs_.SetConnectionString("Driver=SQLite3;Database=[QUILLMERE_DATA_STORE]\\Default.db;StepAPI=1",
                            "store");
  {
    CShareDatabase db(defs_);
    db.Connect();
    Run(db, "CREATE TABLE s (x INTEGER)");
    db.Disconnect();
    EXPECT_FALSE(db.IsConnected());
  }
  EXPECT_TRUE(fs::exists(fs::path(scratch_.Path()) / "Groups/PUBLIC/DataStore/Default.db"));

  defs_.SetConnectionString("Driver=SQLite3;Database=" + scratch_.Path() + "missing.db;NoCreat=1",
                            "missing");
  CShareDatabase db(defs_);
  const std::string text = ErrorText([&] { db.Connect(); });
  EXPECT_NE(text.find("connect failed (Module:ShareDatabase,Method:SQLDriverConnect)"),
            std::string::npos)
      << text;
  EXPECT_FALSE(db.IsConnected());
}

TEST_F(DatabaseTest, CreateIndexTakesFirstFreeTypindexName) {
  UseSqlite();
  {
    CShareDatabase db(defs_);
    db.Connect();
    Run(db, "CREATE TABLE books (title VARCHAR(50), year INTEGER)");
    Run(db, "CREATE INDEX typindex1 ON books (year)");
  }
  CShareDatabase db(defs_);
  db.CreateIndex("CREATE INDEX \"My Index\" ON books (title)");
  EXPECT_FALSE(db.IsConnected());

  db.Connect();
  int16_t n = 0;
  db.ExecuteSql("SELECT group_concat(name) FROM sqlite_master WHERE type = 'index'", n);
  CValue names;
  db.GetColumnValue(1, names, true);
  EXPECT_EQ(names.Narrow(), "typindex1,typindex2");
  db.Disconnect();

  // A statement the source refuses: error 36 with the source's own words below it.
  int number = 0;
  try {
    db.CreateIndex("CREATE INDEX x ON no_such_table (title)");
  } catch (CShareDatabaseException& e) {
    number = e.GetErrorNumber();
    EXPECT_NE(FullText(e).find("no_such_table"), std::string::npos) << FullText(e);
  }
  EXPECT_EQ(number, 36);
  EXPECT_FALSE(db.IsConnected());
}

class PostgresTest : public DatabaseTest {
 protected:
  void SetUp() override {
    DatabaseTest::SetUp();
    const char* c = std::getenv("QM_TEST_PG_UNICODE");
    if (c == nullptr || *c == '\0') {
      GTEST_SKIP() << "QM_TEST_PG_UNICODE is not set: run through scripts/test, which starts "
                      "PostgreSQL";
    }
    connection_ = c;
  }
  std::string connection_;
};

TEST_F(PostgresTest, LostConnectionInMidResultFailsInsteadOfEnding) {
  // Rows come from the server in batches of 10, so the loss is met mid-result.
  defs_.SetConnectionString(connection_ + ";UseDeclareFetch=1;Fetch=10", "reader");
  CShareDatabase reader(defs_);
  reader.Connect();
  int16_t n = 0;
  reader.ExecuteSql("SELECT pg_backend_pid()", n);
  CValue pid;
  reader.GetColumnValue(1, pid, false);

  reader.ExecuteSql("SELECT g, 'row ' || g FROM generate_series(1, 1000) AS g", n);
  reader.AllocateCache();
  int rows = 0;
  for (; rows < 25; ++rows) {
    reader.CacheColumns();
    ASSERT_EQ(reader.MoveNext(), 0);
  }

  CGlobalDefs killer_defs;
  killer_defs.SetConnectionString(connection_, "killer");
  CShareDatabase killer(killer_defs);
  killer.Connect();
  killer.ExecuteSql("SELECT pg_terminate_backend(" + std::to_string(pid.GetInteger()) + ")", n);

  const std::string text = ErrorText([&] {
    while (reader.MoveNext() == 0) {
      reader.CacheColumns();
      ++rows;
    }
  });
  EXPECT_NE(text.find("(Module:ShareDatabase,Method:MoveNext)"), std::string::npos)
      << text << " after " << rows << " of 1000 rows";
  EXPECT_EQ(text.find("No explanation from database"), std::string::npos) << text;
  EXPECT_LT(rows, 1000);
}

TEST_P(SourceTest, TextOutsideLatin1PassesWholeInStatementsNamesValuesAndMessages) {
  CShareDatabase db(defs_);
  db.Connect();
  EXPECT_EQ(db.UsesWideCalls(), Wide());
  const std::string t = UniqueTable("names");
  const std::string word = "Grüße 中文 😀";
  // Pieces of 4-byte characters (or surrogate pairs) end inside them.
  std::string astral = "a";
  for (int i = 0; i < 3000; ++i) astral += "😀";
  Run(db, "CREATE TABLE " + t + " (id INTEGER, \"Größe\" VARCHAR(40), astral TEXT)");
  Run(db, "INSERT INTO " + t + " VALUES (1, '" + word + "', '" + astral + "')");
  Run(db, "INSERT INTO " + t + " VALUES (2, 'other', NULL)");
  // The literal must reach the data source as written to find its row.
  int16_t n = 0;
  db.ExecuteSql("SELECT id, \"Größe\", astral FROM " + t + " WHERE \"Größe\" = '" + word + "'",
                n);
  EXPECT_EQ(db.GetColumnDescription(2).name, "Größe");
  ASSERT_EQ(db.GetColumnIndex("größe"), 2);
  db.AllocateCache();
  db.CacheColumns();
  CValue v;
  db.GetColumnValueFromCache(1, VALUE_TYPE::Integer, v);
  EXPECT_EQ(v.GetInteger(), 1);
  db.GetColumnValueFromCache("Größe", VALUE_TYPE::AsciiString, v);
  EXPECT_EQ(v.Narrow(), word);
  db.GetColumnValueFromCache("astral", VALUE_TYPE::AsciiString, v);
  EXPECT_EQ(v.Narrow(), astral.substr(0, 1 + 1999 * 4));  // 2,000 whole characters
  EXPECT_EQ(db.MoveNext(), 1);

  // The driver's own message quotes the name as written.
  const std::string missing = "kein_größe_表";
  ErrorText([&] { db.ExecuteSql("SELECT x FROM " + missing, n); });
  EXPECT_NE(db.GetLastDiagnostic().find(missing), std::string::npos) << db.GetLastDiagnostic();
  Run(db, "DROP TABLE " + t);
}

TEST_F(DatabaseTest, BinaryColumnWithoutWorkFolderFailsWithTheCause) {
  UseSqlite();
  CGlobalDefs no_data_path;  // nowhere to put the binary copy
  no_data_path.SetConnectionString(defs_.GetConnectionString(), "test");
  CShareDatabase db(no_data_path);
  db.Connect();
  Run(db, "CREATE TABLE b (data BLOB)");
  Run(db, "INSERT INTO b VALUES (X'01')");
  int16_t n = 0;
  db.ExecuteSql("SELECT data FROM b", n);
  db.AllocateCache();
  try {
    db.CacheColumns();
    FAIL() << "the copy cannot be made";
  } catch (CShareDatabaseException& e) {
    EXPECT_EQ(e.GetEntries().front().text,
              u"General Error (Module:ShareDatabase,Method:CacheColumns)");
    EXPECT_NE(FullText(e).find("Data path is not set"), std::string::npos) << FullText(e);
  }
}

}  // namespace
}  // namespace qm
