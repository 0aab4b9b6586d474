#include "search_rows.h"

#include <sqlext.h>

#include <algorithm>
#include <charconv>
#include <cstdio>
#include <unordered_map>
#include <vector>

#include "base/exception_family.h"
#include "base/sql_time.h"
#include "base/value.h"
#include "config/global_defs.h"
#include "index/findex_files.h"
#include "platform/file_io.h"
#include "platform/terminal.h"
#include "platform/text_encoding.h"
#include "search/cmd_tree.h"
#include "sources/column_conversion.h"
#include "sources/share_database.h"
#include "table_text.h"
#include "terminal_text.h"

namespace qm::cli {

namespace {

// The keys of a key string in its order: "(4,9,2)", or "70;(4,9);35;(2);"
// while ordered by score (the numbers outside parentheses are scores).
std::vector<int64_t> KeysOf(std::string_view key_string) {
  std::vector<int64_t> keys;
  bool inside = false;
  const char* at = key_string.data();
  const char* const end = at + key_string.size();
  while (at < end) {
    const char c = *at;
    if (c == '(' || c == ')') inside = c == '(';
    if (inside && c != '(' && c != ',') {
      int64_t key = 0;
      const auto [next, error] = std::from_chars(at, end, key);
      if (error == std::errc()) {
        keys.push_back(key);
        at = next;
        continue;
      }
    }
    ++at;
  }
  return keys;
}

// Points defs at the data source of the rows; false after the message when
// there is none to use. command: the statement, parsed.
bool UseConnection(HostSession& session, const GlobalOptions& global, const CGiCmdTree& command,
                   CGlobalDefs& defs) {
  if (!global.connect.empty()) {
    defs.SetConnection(global.connect, CGlobalDefs::DisplayNameOf(global.connect));
    return true;
  }
  if (!global.dsn.empty()) {
    defs.SetConnectionString(DsnConnectionString(global.dsn, global.user, global.password),
                             global.dsn);
    return true;
  }
  // The first findex searched: its header keeps the connection its rows
  // came from.
  const std::string findex = Utf16ToUtf8(CGiCmdTree::FindFirstIndexW(command.Root()));
  CIndexHeader header;
  try {
    header = ReadFindexHeaderShared(defs, findex);
  } catch (const CExceptionBase& e) {
    session.Fail("cannot read the connection of findex " + findex + "; name the data source with "
                 "--connect or --dsn\n" + TerminalText(e));
    return false;
  }
  if (header.ConnectionString.empty()) {
    session.Fail("findex " + findex + " was built without saving its connection; name the data "
                 "source with --connect or --dsn");
    return false;
  }
  defs.SetConnection(header.ConnectionString, header.DisplayName);
  return true;
}

bool IsBinary(int16_t sql_type) {
  return sql_type == SQL_BINARY || sql_type == SQL_VARBINARY || sql_type == SQL_LONGVARBINARY;
}

// A column of the current row as text; NULL is empty.
std::string ValueText(CShareDatabase& db, int index, CValue& value) {
  if (db.GetColumnValue(index, value, false) == CShareDatabase::kValueNull) return {};
  if (IsBinary(db.GetColumnDescription(index).sql_type)) {
    // The data source's bytes went to a work file named by the value.
    const std::string file(value.Narrow());
    const int64_t bytes = platform::PathFileSize(file);
    platform::UnlinkFile(file);
    std::string text = std::to_string(std::max<int64_t>(bytes, 0));
    text.insert(text.begin(), '(');
    return text.append(" bytes)");
  }
  switch (value.GetType()) {
    case VALUE_TYPE::Integer: return std::to_string(value.GetInteger());
    case VALUE_TYPE::Double: return DoubleToText(value.GetDouble());
    case VALUE_TYPE::DateTime:
      return SQLTimeToString(value.GetDateTime(), value.GetDateTime().fraction != 0);
    case VALUE_TYPE::UnicodeString: return Utf16ToUtf8(value.Wide());
    default: return std::string(value.Narrow());
  }
}

struct FetchedRow {
  std::size_t place = 0;  // in the search's order
  TableRow cells;
};

}  // namespace

int PrintSearchRows(HostSession& session, const GlobalOptions& global,
                    const std::string& statement, bool ordered_by_host) {
  APISearch& search = session.Search();
  BSTR sql;
  BSTR key_string;
  BSTR key_column;
  if (search.GetSql(0, 0, &sql) != S_OK || search.GetRawKeyString(0, 0, &key_string) != S_OK ||
      search.GetSqlKeyName(&key_column) != S_OK) {
    return session.Fail();
  }
  TableRow heading;
  std::vector<FetchedRow> rows;
  try {
    CGlobalDefs defs(session.Defs());
    // Parsed again here (the search object keeps its commands to itself) for
    // its first findex and its own ORDER BY.
    CGiCmdTree command(defs);
    command.SplitSqlW(Utf8ToUtf16(statement));
    if (!UseConnection(session, global, command, defs)) return kExitError;
    CShareDatabase db(defs);
    db.Connect();
    int16_t columns = 0;
    db.ExecuteSql(Utf16ToUtf8(sql), columns);
    for (int i = 1; i <= columns; ++i) heading.push_back(CellText(db.GetColumnDescription(i).name));

    const std::vector<int64_t> keys = KeysOf(Utf16ToUtf8(key_string));
    std::unordered_map<int64_t, std::size_t> places;
    for (std::size_t i = 0; i < keys.size(); ++i) places.emplace(keys[i], i);
    const bool ordered = ordered_by_host || command.HasOrder();
    const int key_index =
        !ordered || key_column.empty() ? 0 : db.GetColumnIndex(Utf16ToUtf8(key_column));

    CValue value;
    while (columns > 0 && db.IsRowAvailable()) {
      FetchedRow row;
      row.place = keys.size();
      try {
        for (int i = 1; i <= columns; ++i) {
          const std::string text = ValueText(db, i, value);
          if (i == key_index) {
            int64_t key = 0;
            const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), key);
            const auto found = places.find(key);
            if (error == std::errc() && end == text.data() + text.size() && found != places.end()) {
              row.place = found->second;
            }
          }
          row.cells.push_back(CellText(text));
        }
      } catch (const CShareDatabaseWarning&) {
        // A result without rows shows itself on the first read.
        if (!rows.empty() || !row.cells.empty()) throw;
        break;
      }
      rows.push_back(std::move(row));
      db.MoveNext();
    }
    db.Disconnect();
  } catch (const CExceptionBase& e) {
    return session.Fail(TerminalText(e));
  }
  std::stable_sort(rows.begin(), rows.end(),
                   [](const FetchedRow& a, const FetchedRow& b) { return a.place < b.place; });
  std::vector<TableRow> table{std::move(heading)};
  for (FetchedRow& row : rows) table.push_back(std::move(row.cells));
  std::fputs(TableText(table, platform::IsTerminal(stdout)).c_str(), stdout);
  return kExitOk;
}

}  // namespace qm::cli
