// The SELECT that reads the rows of a findex or an order: the key column and
// the indexed columns of a table (or every column of an SQL select used as
// the table), restricted for updates and partial builds to the keys (or the
// date/time update key values) not read before.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "base/value.h"

namespace qm {

class CShareDatabase;
struct CIndexHeader;
struct COrderInfo;

struct RowSelection {
  // Update flags: bit 1 use the date/time key, bit 2 with its fraction.
  static constexpr int32_t kUseDateTimeKey = 1;
  static constexpr int32_t kDateTimeFraction = 2;
  // Keys in one unit of the maximum size.
  static constexpr int64_t kKeysPerSizeUnit = 100000;

  std::string Table;
  int32_t SqlUsedAsTable = 0;
  std::string SqlSelect;
  std::string KeyColumn;
  std::vector<std::string> Columns;  // in the order they are selected
  int32_t SortMax = 0;
  int32_t IndexMaxSize = 0;
  int32_t IndexStartValue = 0;
  int32_t UpdateFlags = 0;
  std::string DateTimeKeyColumn;
  DateTimeValue MaxDateTimeKey;

  // The definition's fields; a findex's columns in its column map's order, an
  // order's in its column order. Orders have no size limits.
  static RowSelection FromHeader(const CIndexHeader& header);
  static RowSelection FromHeader(const COrderInfo& info);

  // The date/time update key is in use: flagged and named.
  bool UsesDateTimeKey() const {
    return (UpdateFlags & kUseDateTimeKey) != 0 && !DateTimeKeyColumn.empty();
  }

  // "select * from (SQL) as temp_table", or "select " + key + "," + column ...
  // + " from " + table. The date/time update key column, when in use and not
  // selected already, is selected last so each row can give its value.
  std::string BaseSelect() const;

  // The statements to run, in order, each tried only when the one before it
  // failed: one statement, or for the date/time update key the quoted literal
  // form and then the #...# form.
  std::vector<std::string> Statements() const;

  // Runs the statements on database in turn until one is taken, each traced
  // under trace_tag when trace is on; raises the last one's failure.
  void Execute(CShareDatabase& database, bool trace, std::string_view trace_tag) const;
};

}  // namespace qm
