#include "index/order_source.h"

#include <sqlext.h>

#include <algorithm>

#include "index/row_keys.h"
#include "index/row_selection.h"
#include "platform/local_time.h"
#include "base/exception_family.h"
#include "base/sql_time.h"
#include "base/trace.h"
#include "sources/column_conversion.h"
#include "sources/share_database.h"

namespace qm {

namespace {

constexpr int64_t kRowTraceStep = 100000;

bool IsBinary(int16_t sql_type) {
  return sql_type == SQL_BINARY || sql_type == SQL_VARBINARY || sql_type == SQL_LONGVARBINARY;
}

}  // namespace

struct OrderSource::Plan {
  struct Column {
    int index = 0;  // 1-based, in the result set
    VALUE_TYPE type = VALUE_TYPE::Integer;
  };
  int key_index = 0;
  VALUE_TYPE key_type = VALUE_TYPE::Integer;
  int date_key_index = 0;  // 0: the date/time update key is not in use
  std::vector<Column> columns;
};

OrderSource::OrderSource(CGlobalDefs& defs, const COrderInfo& definition, const char* method)
    : defs_(defs),
      source_(defs),
      sort_max_(definition.SortMax),
      max_date_key_(definition.MaxDateTimeKey) {
  // The connection stored with the order serves when the caller set none;
  // the caller's settings stay as they are.
  if (!source_.IsConnectionSet() && !definition.ConnectionString.empty()) {
    source_.SetConnection(definition.ConnectionString, definition.DisplayName);
  }
  database_ = std::make_unique<CShareDatabase>(source_);
  database_->Connect();

  const RowSelection selection = RowSelection::FromHeader(definition);
  start_time_ = SystemTimeToSQLTime(platform::CurrentLocalTime());
  selection.Execute(*database_, defs_.TraceLevel1(), "PILIB.PiOrderSort.SortRawData");

  CShareDatabase& db = *database_;
  auto require = [&](const std::string& name) {
    const int index = db.GetColumnIndex(name);
    if (index == 0) {
      throw CPiOrderSortException::Text("Column name %S does not exist", method, nullptr, name);
    }
    return index;
  };
  plan_ = std::make_unique<Plan>();
  const bool by_name = definition.SqlUsedAsTable != 0;
  plan_->key_index = by_name ? require(definition.KeyColumn) : 1;
  plan_->key_type = db.MapColumnType(plan_->key_index);
  if (selection.UsesDateTimeKey()) plan_->date_key_index = require(definition.DateTimeKeyColumn);
  int next = 2;
  for (const OrderColumn& column : definition.Columns) {
    Plan::Column c;
    c.index = by_name ? require(column.Name) : next++;
    // A binary value reaches the row loop as the path of a temporary copy:
    // nothing an order could sort by.
    if (IsBinary(db.GetColumnDescription(c.index).sql_type)) {
      throw CPiOrderSortException::Text("Column %S holds binary data, which cannot be ordered",
                                        method, nullptr, column.Name);
    }
    c.type = db.GetFieldType(c.index);
    plan_->columns.push_back(c);
  }
}

OrderSource::~OrderSource() = default;

bool OrderSource::HasTextColumn() const {
  return std::any_of(plan_->columns.begin(), plan_->columns.end(),
                     [](const Plan::Column& c) { return IsTextType(c.type); });
}

void OrderSource::KeepTextForms(const COrderInfo& stored) {
  for (std::size_t i = 0; i < plan_->columns.size() && i < stored.Columns.size(); ++i) {
    const VALUE_TYPE form = OrderColumnLayout::Of(stored.Columns[i]).type;
    if (IsTextType(plan_->columns[i].type) && IsTextType(form)) plan_->columns[i].type = form;
  }
}

std::vector<OrderColumnLayout> OrderSource::Layouts(bool ranks) const {
  std::vector<OrderColumnLayout> layouts;
  int32_t first = 1;
  for (const Plan::Column& c : plan_->columns) {
    OrderColumnLayout layout{c.type, first, ranks ? 1 : ValueSlots(c.type)};
    first += layout.slots;
    layouts.push_back(layout);
  }
  return layouts;
}

int64_t OrderSource::ReadRows(const RowVisitor& visit, const char* trace_tag, const char* method) {
  CShareDatabase& db = *database_;
  const Plan& plan = *plan_;
  db.AllocateCache();
  std::vector<CValue> values(plan.columns.size());
  std::vector<const CValue*> present(plan.columns.size());
  RowKeys keys(plan.key_index, plan.key_type, plan.date_key_index, sort_max_, max_date_key_);
  int64_t rows = 0;

  defs_.SetProgress(5);
  while (db.IsRowAvailable()) {
    try {
      db.CacheColumns();
    } catch (const CShareDatabaseWarning& warning) {
      Trace(true, trace_tag,
            // Text kept as written: callers match on it. Do not correct.
            "Fetching database rows interupted because of database warning (probably a harmless "
            "no rows available): %S",
            warning.GetCurrentEntry().text);
      break;
    }
    const int32_t key = keys.Read<CPiOrderSortException>(db, method);

    for (std::size_t i = 0; i < plan.columns.size(); ++i) {
      const Plan::Column& c = plan.columns[i];
      if (db.GetColumnValueFromCache(c.index, c.type, values[i]) == CShareDatabase::kValueNull) {
        present[i] = nullptr;
        ++nulls_;
      } else {
        present[i] = &values[i];
      }
    }
    visit(key, present);
    db.CleanCacheColumns();
    ++rows;
    if (rows % kRowTraceStep == 0)
      Trace(defs_.TraceLevel1(), trace_tag, "------ Reading row %i\n", rows);
    if (db.MoveNext() != CShareDatabase::kRowFetched) break;
  }
  sort_max_ = keys.SortMax();
  max_date_key_ = keys.MaxDateTimeKey();
  Trace(defs_.TraceLevel1(), trace_tag, "------ %i nulls\n", nulls_);
  return rows;
}

}  // namespace qm
