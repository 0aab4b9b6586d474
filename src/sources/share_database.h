// CShareDatabase: the engine's one gateway to relational data. Connects to an
// ODBC data source with the settings of a CGlobalDefs, runs one statement at a
// time, describes and types its columns, fetches rows, and reads column values
// straight from the source or through a per-row cache of CValues that converts
// between types on request. Binary columns are copied into temporary work files
// whose paths stand in for the data.
//
// Text goes through the narrow ODBC calls as UTF-8, except to a driver that
// takes UTF-16 itself: that one is connected, sent statements and asked for
// names and diagnostics through the wide calls, so it describes its wide text
// columns as such. Wide columns are read as UTF-16. Every failure raises CShareDatabaseException with the driver's own
// diagnostic text; an empty result raises CShareDatabaseWarning on the first
// column read. One thread at a time.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "base/value.h"
#include "sources/odbc_handle.h"

namespace qm {

class CGlobalDefs;

// One result column as the data source describes it.
struct ColumnDescription {
  std::string name;        // at most 200 bytes, never a split character
  std::string upper_name;  // name in upper case, for lookups
  int16_t sql_type = 0;    // raw ODBC SQL type code
  uint32_t size = 0;       // column size (2,000 for long and unknown types)
  int16_t decimal_digits = 0;
  int16_t nullable = 0;
};

class CShareDatabase {
 public:
  static constexpr int kMaxColumns = 99;
  // GetColumnValue / GetColumnValueFromCache results.
  static constexpr int kValueRead = 0;
  static constexpr int kValueNull = 2;
  // MoveNext results.
  static constexpr int kRowFetched = 0;
  static constexpr int kNoMoreRows = 1;

  // defs supplies the connection and the work folder; it must outlive this.
  explicit CShareDatabase(CGlobalDefs& defs);
  // Disconnects quietly and removes the cache's temporary files.
  ~CShareDatabase();
  CShareDatabase(const CShareDatabase&) = delete;
  CShareDatabase& operator=(const CShareDatabase&) = delete;

  // Connects with the settings' connection (loading the group's dbc.dat first
  // when none is set). A connection already held is closed first.
  void Connect();
  // Frees statement, connection and environment, each only if held.
  void Disconnect();
  bool IsConnected() const { return static_cast<bool>(connection_); }
  // Whether the connection goes through the wide calls (see above).
  bool UsesWideCalls() const { return wide_calls_; }

  // Runs a statement and positions on its first row. REQUIRES: connected.
  void ExecuteSql(std::string_view statement, int16_t& column_count);
  // kRowFetched, or kNoMoreRows at the end (and from then on). A failing fetch
  // (a lost connection, say) raises: the rows read so far are not all there are.
  int MoveNext();
  bool IsEndOfData() const { return end_of_data_; }
  bool IsRowAvailable() const { return row_available_; }

  int16_t GetColumnCount() const { return column_count_; }
  // index is 1-based; raises "Column does not exist" out of range.
  const ColumnDescription& GetColumnDescription(int index) const;
  // 1-based index of a column by name (case-insensitive, double quotes
  // removed), or 0.
  int GetColumnIndex(std::string_view name) const;
  // The VALUE_TYPE of a column; raises "Column does not exist" out of range.
  VALUE_TYPE MapColumnType(int index) const;
  // The same, tracing the column's name and raw type at trace level 2.
  VALUE_TYPE GetFieldType(int index) const;
  // The VALUE_TYPE that a raw ODBC SQL type maps to.
  static VALUE_TYPE ValueTypeOf(int16_t sql_type);

  // Reads column index of the current row into value: kValueRead, or
  // kValueNull (value untouched but for its type). With reserve, the value's
  // text buffer is reserved for the column first. requested_type 0 reads the
  // column in its own type; another VALUE_TYPE code converts as the cache does.
  // Binary columns become a new temporary work file whose path is the value;
  // the caller owns that file.
  int GetColumnValue(int index, CValue& value, bool reserve, int32_t requested_type = 0);

  // One cache column per result column, typed as the column.
  void AllocateCache();
  // Reads every column of the current row into the cache.
  void CacheColumns();
  // Hands out a cached value converted to requested; kValueNull (value
  // untouched) when the column was NULL. The cache itself is not changed, so a
  // column can be asked for in several types.
  int GetColumnValueFromCache(std::string_view name, VALUE_TYPE requested, CValue& value);
  int GetColumnValueFromCache(int index, VALUE_TYPE requested, CValue& value);
  // Removes the temporary files the cache made for binary columns.
  void CleanCacheColumns();

  // Creates a data-source index from "CREATE INDEX name rest" as "create index
  // typindexN rest" with the first free N (1 to 100). Connects and disconnects.
  void CreateIndex(std::string_view statement);

  // Column reads that returned NULL so far.
  int64_t GetNullCount() const { return null_count_; }
  // The last diagnostic text read from the data source.
  const std::string& GetLastDiagnostic() const { return last_diagnostic_; }
  const std::u16string& GetLastDiagnosticW() const { return last_diagnostic_w_; }

 private:
  // How a column's value is fetched, decided once when columns are described.
  enum class ReadKind { Integer, Double, Timestamp, Time, NarrowText, WideText, Binary };
  struct SqlTypeTraits;
  static const SqlTypeTraits& TraitsOf(int16_t sql_type);

  struct Column {
    ColumnDescription description;
    VALUE_TYPE value_type = VALUE_TYPE::AsciiString;
    ReadKind read_kind = ReadKind::NarrowText;
    std::size_t piece_bytes = 0;  // buffer length of the first SQLGetData call
  };

  void CheckIndex(int index, const char* method) const;
  void CloseCursor();
  // SQLPrepare, or SQLPrepareW on a connection through the wide calls.
  int16_t Prepare(const std::string& statement);
  // Reads the first diagnostic record of handle into the last diagnostic and
  // returns its SQLSTATE; "No explanation from database" when there is none.
  std::string TakeDiagnostic(const OdbcHandle& handle);
  [[noreturn]] void RaiseFrom(const OdbcHandle& handle, const char* method,
                              std::string_view argument = {});
  [[noreturn]] void RaiseRead(const char* method);

  void DescribeColumns(int16_t count);
  // Reads the text of a column (bytes as the driver gives them, pieces joined),
  // stopping once there is enough for kMaxColumnCharacters. bytes stays valid
  // until the next read. Returns false for NULL.
  bool ReadTextBytes(int index, int16_t c_type, std::string_view& bytes);
  bool ReadBinaryToFile(int index, CValue& value);
  int ReadColumn(int index, CValue& value, bool reserve);

  CGlobalDefs& defs_;
  CColumnValues cache_;
  std::vector<bool> cache_null_;
  bool cache_valid_ = false;              // the cache holds the current row
  std::vector<std::string> cache_files_;  // temporary files made by CacheColumns
  OdbcHandle environment_;
  OdbcHandle connection_;
  OdbcHandle statement_;
  bool wide_calls_ = false;
  bool row_available_ = false;
  bool end_of_data_ = true;
  bool first_fetch_empty_ = false;
  int64_t null_count_ = 0;
  std::string last_diagnostic_;
  std::u16string last_diagnostic_w_;
  std::vector<Column> columns_;  // columns_[0] is column 1
  int16_t column_count_ = 0;
  std::string statement_text_;
  std::string chunk_;          // bytes of the text being read
  std::string read_buffer_;    // one SQLGetData piece
  std::u16string wide_units_;  // a wide value's units, before the cut
};

}  // namespace qm
