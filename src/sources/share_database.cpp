#include "sources/share_database.h"

#include <sql.h>
#include <sqlext.h>
#include <sqlucode.h>

#include <algorithm>
#include <bit>
#include <cstring>
#include <limits>
#include <new>

#include "platform/file_io.h"
#include "base/error_numbers.h"
#include "platform/text_encoding.h"
#include "base/exception_family.h"
#include "config/file_operations.h"
#include "config/global_defs.h"
#include "format/mfile.h"
#include "config/temp_names.h"
#include "base/trace.h"
#include "sources/column_conversion.h"
#include "sources/column_text.h"

namespace qm {

namespace {

constexpr const char* kNoExplanation = "No explanation from database";
constexpr std::size_t kColumnNameBytes = 200;
constexpr uint32_t kLongColumnSize = 2000;
// SQLGetData pieces of text: the first for a column starts small and grows to
// fit its values; later pieces of a long value take the whole buffer.
constexpr std::size_t kTextPieceBytes = 8192;
constexpr std::size_t kFirstTextPieceBytes = 256;
constexpr std::size_t kFirstNumberPieceBytes = 64;
// Enough bytes for kMaxColumnCharacters of any UTF-8 or UTF-16 text: reading
// stops there, the rest would be cut anyway.
constexpr std::size_t kEnoughTextBytes = kMaxColumnCharacters * 4 + 8;
constexpr std::size_t kBinaryPieceBytes = 2000;
constexpr int kMaxTypindexTries = 100;
// The index name prefix "typindex" is kept as written: existing indexes carry it.
constexpr std::string_view kTypindex = "typindex";

SQLHSTMT Stmt(const OdbcHandle& h) { return static_cast<SQLHSTMT>(h.Get()); }
SQLHDBC Dbc(const OdbcHandle& h) { return static_cast<SQLHDBC>(h.Get()); }

SQLCHAR* SqlText(const std::string& s) {
  return reinterpret_cast<SQLCHAR*>(const_cast<char*>(s.c_str()));
}

SQLWCHAR* SqlText(const std::u16string& s) {
  static_assert(sizeof(SQLWCHAR) == sizeof(char16_t));
  return reinterpret_cast<SQLWCHAR*>(const_cast<char16_t*>(s.c_str()));
}

// Text that only survives a trip through the driver unchanged when the driver
// takes UTF-16 itself: the driver manager narrows wide text for drivers
// without wide entry points, one code unit at a time.
constexpr std::u16string_view kWideProbe = u"select '\u00e9\u4e2d\U0001F600'";

// Whether the driver behind a connection takes UTF-16 text without the driver
// manager converting it.
bool TakesWideText(SQLHDBC connection) {
  std::u16string probe(kWideProbe);
  SQLWCHAR answer[64] = {};
  SQLINTEGER length = 0;
  const SQLRETURN rc = SQLNativeSqlW(connection, SqlText(probe), static_cast<SQLINTEGER>(probe.size()),
                                     answer, static_cast<SQLINTEGER>(std::size(answer)), &length);
  return SQL_SUCCEEDED(rc) && length == static_cast<SQLINTEGER>(probe.size()) &&
         std::memcmp(answer, probe.data(), probe.size() * sizeof(char16_t)) == 0;
}

// A name cut by the driver's buffer may end inside a character: drop that tail.
std::string WholeCharacters(std::string_view name) {
  std::size_t start = name.size();
  int back = 0;
  while (start > 0 && back < 4 && (static_cast<unsigned char>(name[start - 1]) & 0xC0) == 0x80) {
    --start;
    ++back;
  }
  if (start == 0) return std::string(name.substr(0, name.size() - back));
  const auto lead = static_cast<unsigned char>(name[start - 1]);
  const std::size_t need = lead >= 0xF0 ? 4 : lead >= 0xE0 ? 3 : lead >= 0xC0 ? 2 : 1;
  const std::size_t have = name.size() - (start - 1);
  return std::string(name.substr(0, have < need ? start - 1 : name.size()));
}

bool IsBlank(char c) { return c == ' ' || c == '\t' || c == '\r' || c == '\n'; }

// What follows "CREATE INDEX name" in a statement; a quoted name may hold blanks.
std::string RestAfterIndexName(std::string_view statement) {
  std::size_t pos = 0;
  auto skip_blanks = [&] {
    while (pos < statement.size() && IsBlank(statement[pos])) ++pos;
  };
  auto skip_word = [&] {
    const char open = pos < statement.size() ? statement[pos] : '\0';
    const char close = open == '"' ? '"' : open == '[' ? ']' : open == '`' ? '`' : '\0';
    if (close != '\0') {
      const auto end = statement.find(close, pos + 1);
      pos = end == std::string_view::npos ? statement.size() : end + 1;
    }
    while (pos < statement.size() && !IsBlank(statement[pos])) ++pos;
  };
  for (int word = 0; word < 3; ++word) {
    skip_blanks();
    skip_word();
  }
  skip_blanks();
  return std::string(statement.substr(pos));
}

bool IsEmptyKeyword(const std::string& s) { return AsciiUpper(s) == "EMPTY"; }

// The module boundary of every public operation: the module's own errors, and
// the end-of-rows warning, pass on; another module's error becomes this
// module's general error with the cause chained; anything else the unknown one.
template <class Body>
decltype(auto) Guarded(const char* method, Body&& body) {
  try {
    return body();
  } catch (const CShareDatabaseException&) {
    throw;
  } catch (const CShareDatabaseWarning&) {
    throw;
  } catch (const CException& e) {
    throw CShareDatabaseException::General(method, &e);
  } catch (const CShareDatabaseUnknownException&) {
    throw;
  } catch (...) {
    throw CShareDatabaseUnknownException::Unknown(method);
  }
}

}  // namespace

CShareDatabase::CShareDatabase(CGlobalDefs& defs)
    : defs_(defs),
      last_diagnostic_(kNoExplanation),
      last_diagnostic_w_(Utf8ToUtf16(kNoExplanation)) {
  read_buffer_.resize(kTextPieceBytes);
}

CShareDatabase::~CShareDatabase() {
  try {
    Disconnect();
  } catch (...) {
    // Nothing can be reported from here; the handles are released regardless.
  }
  for (const auto& path : cache_files_) {
    platform::UnlinkFile(path);  // best effort: the file may be gone already
  }
}

// ---------------------------------------------------------------- connection

void CShareDatabase::Connect() {
  Guarded("Connect", [&] {
    if (IsConnected() || environment_) Disconnect();
    if (!defs_.IsConnectionSet()) defs_.LoadGroupConnection();

    OdbcHandle environment;
    OdbcHandle connection;
    if (!environment.Allocate(OdbcHandle::kEnvironment, nullptr)) {
      throw CShareDatabaseException::Text("Error allocating resource", "Connect", nullptr);
    }
    if (!SQL_SUCCEEDED(SQLSetEnvAttr(environment.Get(), SQL_ATTR_ODBC_VERSION,
                                     reinterpret_cast<SQLPOINTER>(SQL_OV_ODBC3), 0))) {
      RaiseFrom(environment, "Connect");
    }
    if (!connection.Allocate(OdbcHandle::kConnection, &environment)) {
      throw CShareDatabaseException::Text("Error allocating resource", "Connect", nullptr);
    }

    wide_calls_ = false;
    const bool by_string = defs_.GetConnectionMode() == ConnectionMode::ConnectionString;
    const std::string text =
        by_string ? defs_.ExpandPlaceholders(defs_.GetConnectionString()) : std::string();
    const std::string dsn = by_string ? std::string() : defs_.GetDsn();
    std::string user = by_string ? std::string() : defs_.GetUserId();
    std::string password = by_string ? std::string() : defs_.GetPassword();
    if (IsEmptyKeyword(user)) user.clear();
    if (IsEmptyKeyword(password)) password.clear();
    const char* method = by_string ? "SQLDriverConnect" : "SQLConnect";

    // The narrow calls first: every driver takes them, and text passes as it is.
    SQLRETURN rc = SQL_ERROR;
    if (by_string) {
      SQLCHAR out[1024];
      SQLSMALLINT out_length = 0;
      rc = SQLDriverConnect(Dbc(connection), nullptr, SqlText(text), SQL_NTS, out, sizeof out,
                            &out_length, SQL_DRIVER_NOPROMPT);
    } else {
      rc = SQLConnect(Dbc(connection), SqlText(dsn), SQL_NTS, SqlText(user), SQL_NTS,
                      SqlText(password), SQL_NTS);
    }
    if (!SQL_SUCCEEDED(rc)) RaiseFrom(connection, method);

    // A driver with wide entry points describes wide text columns as such only
    // on a connection made through the wide calls: connect again that way.
    if (TakesWideText(Dbc(connection))) {
      SQLDisconnect(Dbc(connection));
      wide_calls_ = true;
      if (by_string) {
        const std::u16string wide_text = Utf8ToUtf16(text);
        SQLWCHAR out[1024];
        SQLSMALLINT out_length = 0;
        rc = SQLDriverConnectW(Dbc(connection), nullptr, SqlText(wide_text), SQL_NTS, out,
                               static_cast<SQLSMALLINT>(std::size(out)), &out_length,
                               SQL_DRIVER_NOPROMPT);
      } else {
        const std::u16string wide_dsn = Utf8ToUtf16(dsn);
        const std::u16string wide_user = Utf8ToUtf16(user);
        const std::u16string wide_password = Utf8ToUtf16(password);
        rc = SQLConnectW(Dbc(connection), SqlText(wide_dsn), SQL_NTS, SqlText(wide_user), SQL_NTS,
                         SqlText(wide_password), SQL_NTS);
      }
      if (!SQL_SUCCEEDED(rc)) RaiseFrom(connection, method);
    }

    OdbcHandle statement;
    if (!statement.Allocate(OdbcHandle::kStatement, &connection)) {
      TakeDiagnostic(connection);
      SQLDisconnect(Dbc(connection));
      // "SQLAllocStmtv" (the method) is kept as written: callers match on it. Do not correct.
      throw CShareDatabaseException::Text("%S", "SQLAllocStmtv", nullptr, last_diagnostic_);
    }
    environment_ = std::move(environment);
    connection_ = std::move(connection);
    statement_ = std::move(statement);
    row_available_ = false;
    end_of_data_ = true;
    first_fetch_empty_ = false;
    cache_valid_ = false;
  });
}

void CShareDatabase::Disconnect() {
  Guarded("Disconnect", [&] {
    row_available_ = false;
    end_of_data_ = true;
    first_fetch_empty_ = false;
    cache_valid_ = false;
    wide_calls_ = false;
    // Release everything first, then report the first refusal.
    const char* failure = nullptr;
    if (statement_) {
      SQLFreeStmt(Stmt(statement_), SQL_CLOSE);
      if (!statement_.Free()) failure = "Error freeing resource: SQLFreeStmt";
    }
    if (connection_) {
      SQLDisconnect(Dbc(connection_));
      if (!connection_.Free() && failure == nullptr)
        failure = "Error freeing resource: SQLFreeConnect";
    }
    if (environment_) {
      if (!environment_.Free() && failure == nullptr)
        failure = "Error freeing resource: SQLFreeEnv";
    }
    if (failure != nullptr) throw CShareDatabaseException::Text(failure, "Disconnect", nullptr);
  });
}

// ---------------------------------------------------------------- diagnostics

std::string CShareDatabase::TakeDiagnostic(const OdbcHandle& handle) {
  OdbcDiagnostic d = ReadDiagnostic(handle, wide_calls_);
  last_diagnostic_ = d.text.empty() ? std::string(kNoExplanation) : std::move(d.text);
  last_diagnostic_w_ = Utf8ToUtf16(last_diagnostic_);
  return d.sqlstate;
}

void CShareDatabase::RaiseFrom(const OdbcHandle& handle, const char* method,
                               std::string_view argument) {
  TakeDiagnostic(handle);
  std::string text = last_diagnostic_;
  if (!argument.empty()) {
    text += "\r\nArgument: ";
    text += argument;
    text += "\r\n";
  }
  throw CShareDatabaseException::Text("%S", method, nullptr, text);
}

void CShareDatabase::RaiseRead(const char* method) {
  const std::string state = TakeDiagnostic(statement_);
  if (state == "24000" || first_fetch_empty_) {
    // No row to read from: the caller takes this as the end of the rows.
    end_of_data_ = true;
    row_available_ = false;
    throw CShareDatabaseWarning::Text("%S", method, nullptr, last_diagnostic_);
  }
  throw CShareDatabaseException::Text("%S", method, nullptr, last_diagnostic_);
}

// ---------------------------------------------------------------- statements

void CShareDatabase::CloseCursor() {
  if (statement_) SQLFreeStmt(Stmt(statement_), SQL_CLOSE);
}

int16_t CShareDatabase::Prepare(const std::string& statement) {
  if (!wide_calls_) return SQLPrepare(Stmt(statement_), SqlText(statement), SQL_NTS);
  const std::u16string wide = Utf8ToUtf16(statement);
  return SQLPrepareW(Stmt(statement_), SqlText(wide), SQL_NTS);
}

void CShareDatabase::ExecuteSql(std::string_view statement, int16_t& column_count) {
  Guarded("ExecuteSql", [&] {
    if (!statement_) {
      throw CShareDatabaseException::Text("Not connected to a database", "ExecuteSql", nullptr);
    }
    CloseCursor();
    row_available_ = false;
    end_of_data_ = true;
    first_fetch_empty_ = false;
    cache_valid_ = false;
    column_count_ = 0;
    column_count = 0;
    columns_.clear();
    statement_text_.assign(statement);

    if (!SQL_SUCCEEDED(Prepare(statement_text_))) {
      RaiseFrom(statement_, "ExecuteSql", statement_text_);
    }
    const SQLRETURN executed = SQLExecute(Stmt(statement_));
    // SQL_NO_DATA: a searched UPDATE or DELETE that touched no row.
    if (!SQL_SUCCEEDED(executed) && executed != SQL_NO_DATA) {
      RaiseFrom(statement_, "ExecuteSql", statement_text_);
    }
    SQLSMALLINT count = 0;
    if (!SQL_SUCCEEDED(SQLNumResultCols(Stmt(statement_), &count))) {
      RaiseFrom(statement_, "ExecuteSql", statement_text_);
    }
    if (count > kMaxColumns) {
      CloseCursor();
      throw CShareDatabaseException::Text("Too many table columns", "ExecuteSql", nullptr);
    }
    DescribeColumns(count);
    column_count_ = count;
    column_count = count;
    if (count == 0) return;

    const SQLRETURN fetched = SQLFetch(Stmt(statement_));
    if (fetched == SQL_NO_DATA) {
      // An empty result shows itself on the first column read (the warning).
      first_fetch_empty_ = true;
    } else if (!SQL_SUCCEEDED(fetched)) {
      RaiseFrom(statement_, "ExecuteSql", statement_text_);
    }
    row_available_ = true;
    end_of_data_ = false;
  });
}

// What the engine makes of each SQL type: the value type it stores, how a
// value is read, and whether the driver's size means nothing (long and
// unknown columns get the engine's own size). Anything else is narrow text.
struct CShareDatabase::SqlTypeTraits {
  int16_t sql_type;
  VALUE_TYPE value_type;
  ReadKind read_kind;
  bool long_column;
};

const CShareDatabase::SqlTypeTraits& CShareDatabase::TraitsOf(int16_t sql_type) {
  using V = VALUE_TYPE;
  using R = ReadKind;
  static constexpr SqlTypeTraits kTable[] = {
      {SQL_INTEGER, V::Integer, R::Integer, false},
      {SQL_SMALLINT, V::Integer, R::Integer, false},
      {SQL_TINYINT, V::Integer, R::Integer, false},
      {SQL_NUMERIC, V::Double, R::Double, false},
      {SQL_DECIMAL, V::Double, R::Double, false},
      {SQL_FLOAT, V::Double, R::Double, false},
      {SQL_REAL, V::Double, R::Double, false},
      {SQL_DOUBLE, V::Double, R::Double, false},
      {SQL_DATE, V::DateTime, R::Timestamp, false},
      {SQL_TIMESTAMP, V::DateTime, R::Timestamp, false},
      {SQL_TYPE_DATE, V::DateTime, R::Timestamp, false},
      {SQL_TYPE_TIMESTAMP, V::DateTime, R::Timestamp, false},
      {SQL_TIME, V::DateTime, R::Time, false},
      {SQL_TYPE_TIME, V::DateTime, R::Time, false},
      {SQL_UNKNOWN_TYPE, V::UnicodeString, R::WideText, true},
      {SQL_WLONGVARCHAR, V::UnicodeString, R::WideText, true},
      {SQL_WVARCHAR, V::UnicodeString, R::WideText, false},
      {SQL_WCHAR, V::UnicodeString, R::WideText, false},
      {SQL_LONGVARCHAR, V::AsciiString, R::NarrowText, true},
      {SQL_BINARY, V::AsciiString, R::Binary, false},
      {SQL_VARBINARY, V::AsciiString, R::Binary, true},
      {SQL_LONGVARBINARY, V::AsciiString, R::Binary, true},
  };
  static constexpr SqlTypeTraits kNarrowText{0, V::AsciiString, R::NarrowText, false};
  for (const SqlTypeTraits& t : kTable) {
    if (t.sql_type == sql_type) return t;
  }
  return kNarrowText;
}

void CShareDatabase::DescribeColumns(int16_t count) {
  columns_.resize(static_cast<std::size_t>(count));
  for (int16_t i = 1; i <= count; ++i) {
    SQLSMALLINT name_length = 0;
    SQLSMALLINT type = 0;
    SQLULEN size = 0;
    SQLSMALLINT digits = 0;
    SQLSMALLINT nullable = 0;
    std::string name;
    if (wide_calls_) {
      SQLWCHAR wide_name[kColumnNameBytes] = {};
      if (!SQL_SUCCEEDED(SQLDescribeColW(Stmt(statement_), static_cast<SQLUSMALLINT>(i),
                                         wide_name, static_cast<SQLSMALLINT>(std::size(wide_name)),
                                         &name_length, &type, &size, &digits, &nullable))) {
        RaiseFrom(statement_, "ExecuteSql", statement_text_);
      }
      std::u16string units(reinterpret_cast<const char16_t*>(wide_name));
      // A name cut by the buffer may end between the halves of a pair.
      if (!units.empty() && units.back() >= 0xD800 && units.back() <= 0xDBFF) units.pop_back();
      name = Utf16ToUtf8(units);
      name.resize(Utf8CutLength(name, kColumnNameBytes - 1));
    } else {
      SQLCHAR narrow_name[kColumnNameBytes] = {};
      if (!SQL_SUCCEEDED(SQLDescribeCol(Stmt(statement_), static_cast<SQLUSMALLINT>(i), narrow_name,
                                        sizeof narrow_name, &name_length, &type, &size, &digits,
                                        &nullable))) {
        RaiseFrom(statement_, "ExecuteSql", statement_text_);
      }
      name = WholeCharacters(reinterpret_cast<const char*>(narrow_name));
    }
    Column& c = columns_[static_cast<std::size_t>(i - 1)];
    c.description.name = std::move(name);
    c.description.upper_name = ToUpper(c.description.name);
    c.description.sql_type = type;
    c.description.decimal_digits = digits;
    c.description.nullable = nullable;
    const SqlTypeTraits& traits = TraitsOf(type);
    c.description.size =
        traits.long_column
            ? kLongColumnSize
            : static_cast<uint32_t>(std::min<SQLULEN>(size, std::numeric_limits<uint32_t>::max()));
    c.value_type = traits.value_type;
    c.read_kind = traits.read_kind;
    c.piece_bytes = traits.read_kind == ReadKind::Integer || traits.read_kind == ReadKind::Double
                        ? kFirstNumberPieceBytes
                        : kFirstTextPieceBytes;
  }
}

int CShareDatabase::MoveNext() {
  return Guarded("MoveNext", [&] {
    cache_valid_ = false;
    if (end_of_data_ || first_fetch_empty_ || !statement_) {
      end_of_data_ = true;
      row_available_ = false;
      return kNoMoreRows;
    }
    const SQLRETURN rc = SQLFetch(Stmt(statement_));
    if (SQL_SUCCEEDED(rc)) {
      row_available_ = true;
      return kRowFetched;
    }
    row_available_ = false;
    if (rc == SQL_NO_DATA) {
      end_of_data_ = true;
      return kNoMoreRows;
    }
    RaiseFrom(statement_, "MoveNext", statement_text_);
  });
}

// ---------------------------------------------------------------- columns

VALUE_TYPE CShareDatabase::ValueTypeOf(int16_t sql_type) { return TraitsOf(sql_type).value_type; }

void CShareDatabase::CheckIndex(int index, const char* method) const {
  if (index < 1 || index > column_count_) {
    throw CShareDatabaseException::Text("Column does not exist", method, nullptr);
  }
}

const ColumnDescription& CShareDatabase::GetColumnDescription(int index) const {
  CheckIndex(index, "GetColumnDescription");
  return columns_[static_cast<std::size_t>(index - 1)].description;
}

int CShareDatabase::GetColumnIndex(std::string_view name) const {
  std::string unquoted(name);
  std::erase(unquoted, '"');
  const std::string upper = ToUpper(unquoted);
  for (std::size_t i = 0; i < static_cast<std::size_t>(column_count_); ++i) {
    if (columns_[i].description.upper_name == upper) return static_cast<int>(i + 1);
  }
  return 0;
}

VALUE_TYPE CShareDatabase::MapColumnType(int index) const {
  CheckIndex(index, "MapColumnType");
  return columns_[static_cast<std::size_t>(index - 1)].value_type;
}

VALUE_TYPE CShareDatabase::GetFieldType(int index) const {
  CheckIndex(index, "GetFieldType");
  const Column& c = columns_[static_cast<std::size_t>(index - 1)];
  Trace(defs_.TraceLevel2(), "PILIB,FILIB.(SHARELIB) CShareDatabase->GetFieldType",
        "Field Name: %s, Raw Field Type: %i", c.description.name, c.description.sql_type);
  return c.value_type;
}

// ---------------------------------------------------------------- reading

bool CShareDatabase::ReadTextBytes(int index, int16_t c_type, std::string_view& bytes) {
  Column& column = columns_[static_cast<std::size_t>(index - 1)];
  const std::size_t terminator = c_type == SQL_C_WCHAR ? 2 : 1;
  chunk_.clear();
  // The first piece is sized to the column's values so far: drivers may fill
  // the whole buffer they are given (strncpy), so a large one costs on every row.
  std::size_t length = column.piece_bytes;
  for (bool first = true;; first = false) {
    SQLLEN indicator = 0;
    const SQLRETURN rc = SQLGetData(Stmt(statement_), static_cast<SQLUSMALLINT>(index), c_type,
                                    read_buffer_.data(), static_cast<SQLLEN>(length), &indicator);
    if (rc == SQL_NO_DATA) {
      // Only a column read before has no data left at the first call.
      if (first) {
        throw CShareDatabaseException::Text("Column value already read", "GetColumnValue", nullptr);
      }
      break;
    }
    if (!SQL_SUCCEEDED(rc)) RaiseRead("GetColumnValue");
    if (indicator == SQL_NULL_DATA) return false;
    // SQLSTATE 01004: the piece filled the buffer and more follows.
    const bool more = rc == SQL_SUCCESS_WITH_INFO && ReadSqlState(statement_) == "01004";
    const std::size_t room = length - terminator;
    const std::size_t got = (more || indicator == SQL_NO_TOTAL || indicator < 0)
                                ? room
                                : std::min(static_cast<std::size_t>(indicator), room);
    if (first && !more) {
      bytes = std::string_view(read_buffer_.data(), got);
      return true;
    }
    chunk_.append(read_buffer_.data(), got);
    if (!more || chunk_.size() >= kEnoughTextBytes) break;
    length = read_buffer_.size();
  }
  column.piece_bytes = std::min(std::bit_ceil(chunk_.size() + terminator), read_buffer_.size());
  bytes = chunk_;
  return true;
}

bool CShareDatabase::ReadBinaryToFile(int index, CValue& value) {
  std::string piece(kBinaryPieceBytes, '\0');
  std::string path;
  MFile file;
  // Removes a half-written copy when reading or writing fails.
  struct Discard {
    std::string* path;
    bool armed = true;
    ~Discard() {
      if (armed && !path->empty()) {
        platform::UnlinkFile(*path);  // best effort: the file may be gone already
      }
    }
  } discard{&path};

  for (bool first = true;; first = false) {
    SQLLEN indicator = 0;
    const SQLRETURN rc =
        SQLGetData(Stmt(statement_), static_cast<SQLUSMALLINT>(index), SQL_C_BINARY, piece.data(),
                   static_cast<SQLLEN>(piece.size()), &indicator);
    if (rc == SQL_NO_DATA) {
      if (first) {
        throw CShareDatabaseException::Text("Column value already read", "GetColumnValue", nullptr);
      }
      break;
    }
    if (!SQL_SUCCEEDED(rc)) RaiseRead("GetColumnValue");
    if (indicator == SQL_NULL_DATA) return false;
    if (first) {
      path = SLGetTempWorkFilePath(defs_, kTempCallerBinaryColumn);
      file.OpenFile(path, MFile::kCreate);
    }
    const bool more = rc == SQL_SUCCESS_WITH_INFO && ReadSqlState(statement_) == "01004";
    const std::size_t got = (more || indicator == SQL_NO_TOTAL || indicator < 0)
                                ? piece.size()
                                : std::min(static_cast<std::size_t>(indicator), piece.size());
    file.mwrite(piece.data(), got);
    if (!more) break;
  }
  file.MCommit();
  file.Close();
  discard.armed = false;
  value.SetText(path);
  return true;
}

int CShareDatabase::ReadColumn(int index, CValue& value, bool reserve) {
  const Column& c = columns_[static_cast<std::size_t>(index - 1)];
  auto null_value = [&] {
    ++null_count_;
    value.SetType(c.value_type);
    return kValueNull;
  };
  std::string_view bytes;
  // Drivers turn numbers they cannot convert into NULL, 0 or a wrapped number
  // without a word: numbers are read as text and parsed here.
  auto read_number = [&](auto parse, auto set) {
    if (!ReadTextBytes(index, SQL_C_CHAR, bytes)) return null_value();
    if (!parse(bytes)) {
      throw CShareDatabaseException::Text("Could not convert column value into appropriate type",
                                          "GetColumnValue", nullptr);
    }
    set();
    return kValueRead;
  };
  switch (c.read_kind) {
    case ReadKind::Integer: {
      int32_t v = 0;
      return read_number([&](std::string_view b) { return ParseInteger32(b, v); },
                         [&] { value.SetInteger(v); });
    }
    case ReadKind::Double: {
      double v = 0;
      return read_number([&](std::string_view b) { return ParseDouble(b, v); },
                         [&] { value.SetDouble(v); });
    }
    case ReadKind::Timestamp: {
      SQL_TIMESTAMP_STRUCT ts{};
      SQLLEN indicator = 0;
      if (!SQL_SUCCEEDED(SQLGetData(Stmt(statement_), static_cast<SQLUSMALLINT>(index),
                                    SQL_C_TYPE_TIMESTAMP, &ts, sizeof ts, &indicator))) {
        RaiseRead("GetColumnValue");
      }
      if (indicator == SQL_NULL_DATA) return null_value();
      value.SetDateTime(
          DateTimeValue{ts.year, ts.month, ts.day, ts.hour, ts.minute, ts.second, ts.fraction});
      return kValueRead;
    }
    case ReadKind::Time: {
      // A time read as a timestamp would carry today's date.
      SQL_TIME_STRUCT t{};
      SQLLEN indicator = 0;
      if (!SQL_SUCCEEDED(SQLGetData(Stmt(statement_), static_cast<SQLUSMALLINT>(index),
                                    SQL_C_TYPE_TIME, &t, sizeof t, &indicator))) {
        RaiseRead("GetColumnValue");
      }
      if (indicator == SQL_NULL_DATA) return null_value();
      value.SetDateTime(DateTimeValue{0, 0, 0, t.hour, t.minute, t.second, 0});
      return kValueRead;
    }
    case ReadKind::NarrowText:
      try {
        if (reserve) {
          value.ReserveNarrow(
              std::min<std::size_t>(c.description.size + 1ull, kMaxColumnCharacters));
        }
        if (!ReadTextBytes(index, SQL_C_CHAR, bytes)) return null_value();
        AssignColumnText(bytes, kMaxColumnCharacters, value.NarrowBuffer());
        value.SetType(VALUE_TYPE::AsciiString);
        return kValueRead;
      } catch (const std::bad_alloc&) {
        throw CShareDatabaseException::Text("Error allocating memory", "GetColumnValue", nullptr);
      }
    case ReadKind::WideText:
      try {
        if (reserve) {
          value.ReserveWide(std::min<std::size_t>(c.description.size + 1ull, kMaxColumnCharacters));
        }
        if (!ReadTextBytes(index, SQL_C_WCHAR, bytes)) return null_value();
        // SQLWCHAR units in the machine's own order, as the driver wrote them.
        wide_units_.resize(bytes.size() / sizeof(char16_t));
        std::memcpy(wide_units_.data(), bytes.data(), wide_units_.size() * sizeof(char16_t));
        AssignColumnText(wide_units_, kMaxColumnCharacters, value.WideBuffer());
        value.SetType(VALUE_TYPE::UnicodeString);
        return kValueRead;
      } catch (const std::bad_alloc&) {
        // Text kept as written: callers match on it. Do not correct.
        throw CShareDatabaseException::Text("Eror allocating memory", "GetColumnValue", nullptr);
      }
    case ReadKind::Binary:
      if (!ReadBinaryToFile(index, value)) return null_value();
      return kValueRead;
  }
  return kValueRead;
}

int CShareDatabase::GetColumnValue(int index, CValue& value, bool reserve, int32_t requested_type) {
  return Guarded("GetColumnValue", [&] {
    CheckIndex(index, "GetColumnValue");
    if (!row_available_)
      throw CShareDatabaseException::Text("No current row", "GetColumnValue", nullptr);
    const int result = ReadColumn(index, value, reserve);
    if (result == kValueRead && requested_type != 0 &&
        requested_type != static_cast<int32_t>(value.GetType())) {
      ConvertColumnValue(value, static_cast<VALUE_TYPE>(requested_type), value, "GetColumnValue");
    }
    return result;
  });
}

// ---------------------------------------------------------------- cache

void CShareDatabase::AllocateCache() {
  Guarded("AllocateCache", [&] {
    cache_.Release();
    cache_valid_ = false;
    cache_null_.assign(static_cast<std::size_t>(column_count_), false);
    for (int i = 1; i <= column_count_; ++i) {
      const Column& c = columns_[static_cast<std::size_t>(i - 1)];
      cache_.AddColumn(GetFieldType(i), static_cast<std::size_t>(c.description.size) + 1);
    }
  });
}

void CShareDatabase::CacheColumns() {
  Guarded("CacheColumns", [&] {
    if (cache_.Count() < static_cast<std::size_t>(column_count_)) {
      throw CShareDatabaseException::Text("Column cache not allocated for all columns",
                                          "CacheColumns", nullptr);
    }
    cache_valid_ = false;
    if (!row_available_) {
      throw CShareDatabaseException::Text("No current row", "CacheColumns", nullptr);
    }
    for (int i = 1; i <= column_count_; ++i) {
      const auto slot = static_cast<std::size_t>(i - 1);
      CValue& value = cache_[slot];
      const int result = ReadColumn(i, value, false);
      cache_null_[slot] = result == kValueNull;
      // Only a copy this read made is the cache's to remove: the current
      // statement's column decides, not the one the cache was allocated for.
      if (result == kValueRead && columns_[slot].read_kind == ReadKind::Binary) {
        cache_files_.emplace_back(value.Narrow());
      }
    }
    cache_valid_ = true;
  });
}

int CShareDatabase::GetColumnValueFromCache(std::string_view name, VALUE_TYPE requested,
                                            CValue& value) {
  const int index = GetColumnIndex(name);
  if (index == 0) {
    throw CShareDatabaseException::Text("Column name %S does not exist", "GetColumnValueFromCache",
                                        nullptr, name);
  }
  return GetColumnValueFromCache(index, requested, value);
}

int CShareDatabase::GetColumnValueFromCache(int index, VALUE_TYPE requested, CValue& value) {
  return Guarded("GetColumnValueFromCache", [&] {
    if (index < 1 || static_cast<std::size_t>(index) > cache_.Count()) {
      throw CShareDatabaseException::Text("Column does not exist in cache",
                                          "GetColumnValueFromCache", nullptr);
    }
    // A cache that does not hold the current row would hand out another row's values.
    if (!row_available_ || !cache_valid_) {
      throw CShareDatabaseException::Text("No current row", "GetColumnValueFromCache", nullptr);
    }
    const auto slot = static_cast<std::size_t>(index - 1);
    if (cache_null_[slot]) return kValueNull;
    const CValue& cached = cache_[slot];
    if (requested == VALUE_TYPE::Integer && cached.GetType() == VALUE_TYPE::Integer) {
      value.SetInteger(cached.GetInteger());  // keys: the most frequent read
    } else {
      ConvertColumnValue(cached, requested, value, "GetColumnValueFromCache");
    }
    return kValueRead;
  });
}

void CShareDatabase::CleanCacheColumns() {
  Guarded("CleanCacheColumns", [&] {
    if (cache_.Count() < static_cast<std::size_t>(column_count_)) {
      throw CShareDatabaseException::Text("Column cache not allocated for all columns",
                                          "CleanCacheColumns", nullptr);
    }
    while (!cache_files_.empty()) {
      DropFile(cache_files_.back());
      cache_files_.pop_back();
    }
  });
}

// ---------------------------------------------------------------- indexes

void CShareDatabase::CreateIndex(std::string_view statement) {
  Guarded("CreateIndex", [&] {
    try {
      Connect();
    } catch (const CException& e) {
      throw CShareDatabaseException::Text("Error connecting to database", "CreateIndex", &e);
    }
    // Leaves no connection behind when the index cannot be made.
    struct QuietDisconnect {
      CShareDatabase* db;
      ~QuietDisconnect() {
        try {
          db->Disconnect();
        } catch (...) {
        }
      }
    } guard{this};

    auto refused = [this] {
      const CShareDatabaseException cause =
          CShareDatabaseException::Text("%S", "CreateIndex", nullptr, last_diagnostic_);
      return CShareDatabaseException::Numbered(kErrCreateIndexRefused, "CreateIndex", &cause);
    };

    const std::string rest = RestAfterIndexName(statement);
    // The plain name only tests that the data source takes the statement.
    const std::string probe = "create index " + std::string(kTypindex) + " " + rest;
    if (!SQL_SUCCEEDED(Prepare(probe))) {
      TakeDiagnostic(statement_);
      throw refused();
    }
    bool created = false;
    for (int i = 1; i <= kMaxTypindexTries && !created; ++i) {
      CloseCursor();
      const std::string sql =
          "create index " + std::string(kTypindex) + std::to_string(i) + " " + rest;
      if (SQL_SUCCEEDED(Prepare(sql)) &&
          SQL_SUCCEEDED(SQLExecute(Stmt(statement_)))) {
        created = true;
      } else {
        TakeDiagnostic(statement_);
      }
    }
    if (!created) throw refused();
    Disconnect();
  });
}

}  // namespace qm
