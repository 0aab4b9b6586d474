#include "index/row_selection.h"

#include <algorithm>

#include "platform/text_encoding.h"
#include "base/exception_family.h"
#include "format/index_header.h"
#include "format/order_info.h"
#include "base/sql_time.h"
#include "base/trace.h"
#include "sources/share_database.h"

namespace qm {

namespace {

bool SameColumn(const std::string& a, const std::string& b) { return ToUpper(a) == ToUpper(b); }

}  // namespace

namespace {

// The fields findex headers and order infos share.
template <class Definition>
RowSelection CommonSelection(const Definition& definition) {
  RowSelection s;
  s.Table = definition.TableName;
  s.SqlUsedAsTable = definition.SqlUsedAsTable;
  s.SqlSelect = definition.SqlSelect;
  s.KeyColumn = definition.KeyColumn;
  s.SortMax = definition.SortMax;
  s.UpdateFlags = definition.UpdateFlags;
  s.DateTimeKeyColumn = definition.DateTimeKeyColumn;
  s.MaxDateTimeKey = definition.MaxDateTimeKey;
  return s;
}

}  // namespace

RowSelection RowSelection::FromHeader(const CIndexHeader& header) {
  RowSelection s = CommonSelection(header);
  for (const auto& [name, tags] : header.Columns) s.Columns.push_back(name);
  s.IndexMaxSize = header.IndexMaxSize;
  s.IndexStartValue = header.IndexStartValue;
  return s;
}

RowSelection RowSelection::FromHeader(const COrderInfo& info) {
  RowSelection s = CommonSelection(info);
  for (const OrderColumn& column : info.Columns) s.Columns.push_back(column.Name);
  return s;
}

std::string RowSelection::BaseSelect() const {
  if (SqlUsedAsTable != 0) return "select * from (" + SqlSelect + ") as temp_table";
  std::string sql = "select " + KeyColumn;
  for (const std::string& column : Columns) sql += "," + column;
  if (UsesDateTimeKey() && !SameColumn(DateTimeKeyColumn, KeyColumn) &&
      std::none_of(Columns.begin(), Columns.end(),
                   [&](const std::string& c) { return SameColumn(c, DateTimeKeyColumn); })) {
    sql += "," + DateTimeKeyColumn;
  }
  return sql + " from " + Table;
}

std::vector<std::string> RowSelection::Statements() const {
  const std::string base = BaseSelect();
  if (SortMax < 1 && IndexMaxSize < 1) return {base};
  if (UsesDateTimeKey() && IndexMaxSize < 1) {
    const std::string time =
        SQLTimeToSqlLiteral(MaxDateTimeKey, (UpdateFlags & kDateTimeFraction) != 0);
    const std::string where = " where " + DateTimeKeyColumn + ">";
    return {base + where + "'" + time + "'", base + where + "#" + time + "#"};
  }
  int64_t lower = SortMax;
  std::string sql = base + " where " + KeyColumn + ">";
  if (IndexMaxSize >= 1) {
    if (SortMax < IndexStartValue) lower = static_cast<int64_t>(IndexStartValue) - 1;
    const int64_t upper = static_cast<int64_t>(IndexMaxSize) * kKeysPerSizeUnit + lower;
    return {sql + std::to_string(lower) + " AND " + KeyColumn + "<" + std::to_string(upper)};
  }
  return {sql + std::to_string(lower)};
}

void RowSelection::Execute(CShareDatabase& database, bool trace,
                           std::string_view trace_tag) const {
  const std::vector<std::string> statements = Statements();
  for (std::size_t i = 0; i < statements.size(); ++i) {
    Trace(trace, trace_tag, "Executing SQL. SQL: %s", statements[i]);
    try {
      int16_t columns = 0;
      database.ExecuteSql(statements[i], columns);
      return;
    } catch (const CShareDatabaseException&) {
      // The date literal forms differ between data sources: try the next one.
      if (i + 1 == statements.size()) throw;
    }
  }
}

}  // namespace qm
