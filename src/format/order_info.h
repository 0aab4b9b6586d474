// COrderInfo: the definition and build statistics of one order, as kept in
// memory. The same fields, in this order, make up block 0 of the .sri file
// (ReadInfo/WriteInfo; docs/formats.md has the byte layout).
#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <vector>

#include "base/value.h"

namespace qm {

class BFile;

// One order column; the three values belong to the order builder and are
// carried through unchanged.
struct OrderColumn {
  std::string Name;
  std::array<int32_t, 3> BuilderValues{};

  bool operator==(const OrderColumn&) const = default;
};

// The order columns in statement order (unlike a findex's column map).
using OrderColumnList = std::vector<OrderColumn>;

struct COrderInfo {
  int32_t Version = 0;  // the file writer stamps the engine's version (614, "6.14")
  std::string VersionText;
  int32_t OrderType = 0;  // VALUE_TYPE code of the order values; 0 before a build
  std::string OrderName;
  std::string TableName;
  int32_t SqlUsedAsTable = 0;
  std::string SqlSelect;
  OrderColumnList Columns;
  std::string KeyColumn;
  int32_t Count = 0;  // set by the order builder
  int32_t SortMax = 0;
  std::string ConnectionString;  // plain here; scrambled only in the file
  std::string DisplayName;
  DateTimeValue BuildTime;
  DateTimeValue LastUpdateTime;
  std::string DateTimeKeyColumn;
  DateTimeValue MaxDateTimeKey;
  int32_t GeneralFlags = 0;      // bit 1 ignore case, bit 2 save connection
  std::u16string IgnoreChars;    // ignored when comparing order values
  int32_t UpdateFlags = 0;       // bit 1 date/time key, bit 2 with fractions
  int32_t UpdateSupport = 0;     // in memory only: not part of block 0

  // As CIndexHeader::ReadInfo; the version is the first field. UpdateSupport
  // is not part of the file and stays.
  void ReadInfo(BFile& file);
  // As CIndexHeader::WriteInfo; the connection string is always written
  // (scrambled): the order builder decides whether to set it.
  void WriteInfo(BFile& file) const;
  int64_t EncodedSize() const;
  bool FitsHeaderBlock() const;

  // The SELECT that reads the order's data: the SQL as a table, or the key
  // and order columns of the table; with SortMax above 0 restricted to later
  // rows, by the date/time key (update flag 1; "'" literals, or "#" ones
  // with date_style) or by the key.
  std::string GetSelectDataSQL(bool date_style) const;

  bool operator==(const COrderInfo&) const = default;

  void Reset() { *this = COrderInfo{}; }

  std::string ColumnNames() const {
    std::string out;
    for (const auto& column : Columns) {
      if (!out.empty()) out += ',';
      out += column.Name;
    }
    return out;
  }
};

}  // namespace qm
