// OrderSource: the rows an order build reads. Connects (with the settings'
// connection, else the one stored with the order), runs the order's SELECT
// (for updates restricted to the keys, or the date/time update key values,
// not read before) and walks the rows, handing each order column's value in
// the column's own type.
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <span>
#include <string>
#include <vector>

#include "format/order_layout.h"
#include "config/global_defs.h"
#include "format/order_info.h"
#include "base/value.h"

namespace qm {

class CShareDatabase;

class OrderSource {
 public:
  // One row: its key, and per order column its value or nullptr for NULL.
  // The values are valid during the call only.
  using RowVisitor = std::function<void(int32_t key, std::span<const CValue* const> values)>;

  // Runs the selection of definition and describes its columns; a column
  // that is missing or binary raises a PiOrderSort error naming method.
  // Progress goes to defs, which must outlive this.
  OrderSource(CGlobalDefs& defs, const COrderInfo& definition, const char* method);
  ~OrderSource();
  OrderSource(const OrderSource&) = delete;
  OrderSource& operator=(const OrderSource&) = delete;

  // True when an order column is text: such an order stores ranks (type 2).
  bool HasTextColumn() const;
  // For an update: a text column that stored is text too is read in stored's
  // form (narrow or wide), whatever form the driver gives it in, so the new
  // values merge with the stored ones. Columns pair by position.
  void KeepTextForms(const COrderInfo& stored);
  // The column layouts of an order of ranks (one slot each, in the column's
  // own type) or of values (one slot for an integer, two for a double or a
  // date/time).
  std::vector<OrderColumnLayout> Layouts(bool ranks) const;

  // Reads every row (tracing every 100,000th under trace_tag). Returns the
  // number of rows. A NULL or non-integer key, or a date/time update key
  // that is no date/time, raises a PiOrderSort error naming method.
  int64_t ReadRows(const RowVisitor& visit, const char* trace_tag, const char* method);

  // What the rows gave: the highest key (not below the definition's), the
  // highest date/time update key, and the NULL values read.
  int32_t SortMax() const { return sort_max_; }
  const DateTimeValue& MaxDateTimeKey() const { return max_date_key_; }
  int64_t Nulls() const { return nulls_; }
  // When the selection ran (local time).
  const DateTimeValue& StartTime() const { return start_time_; }
  // The connection the rows came through.
  std::string ConnectionString() const { return source_.GetConnectionString(); }
  std::string DisplayName() const { return source_.GetDisplayName(); }

 private:
  struct Plan;

  CGlobalDefs& defs_;
  CGlobalDefs source_;  // the settings with the connection in force
  std::unique_ptr<CShareDatabase> database_;
  std::unique_ptr<Plan> plan_;
  int32_t sort_max_;
  DateTimeValue max_date_key_;
  int64_t nulls_ = 0;
  DateTimeValue start_time_;
};

}  // namespace qm
