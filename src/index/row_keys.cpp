#include "index/row_keys.h"

#include <algorithm>
#include <cmath>

#include "base/exception_family.h"
#include "sources/column_conversion.h"
#include "sources/share_database.h"

namespace qm {

RowKeys::RowKeys(int key_index, VALUE_TYPE key_type, int date_key_index, int32_t sort_max,
                 const DateTimeValue& max_date_key)
    : key_index_(key_index),
      key_type_(key_type),
      date_key_index_(date_key_index),
      sort_max_(sort_max) {
  max_date_.SetDateTime(max_date_key);
}

const char* RowKeys::TryRead(CShareDatabase& database, int32_t& key) {
  constexpr const char* kNotNumeric = "Unique key is not numeric";
  // A double would convert by truncation; a key must be a whole number as it is.
  const bool as_double = key_type_ == VALUE_TYPE::Double;
  int result = CShareDatabase::kValueRead;
  try {
    result = database.GetColumnValueFromCache(
        key_index_, as_double ? VALUE_TYPE::Double : VALUE_TYPE::Integer, key_value_);
  } catch (const CShareDatabaseException&) {
    return kNotNumeric;
  }
  if (result == CShareDatabase::kValueNull) return "Unique key column contains NULL values";
  if (as_double) {
    const double d = key_value_.GetDouble();
    if (!std::isfinite(d) || d != std::trunc(d) || !DoubleToInteger32(d, key)) return kNotNumeric;
  } else {
    key = key_value_.GetInteger();
  }
  sort_max_ = std::max(sort_max_, key);

  if (date_key_index_ != 0) {
    if (database.MapColumnType(date_key_index_) != VALUE_TYPE::DateTime) {
      return "DateTime key is not a datetime column";
    }
    if (database.GetColumnValueFromCache(date_key_index_, VALUE_TYPE::DateTime, date_value_) ==
            CShareDatabase::kValueRead &&
        date_value_.Compare(max_date_) > 0) {
      max_date_.SetDateTime(date_value_.GetDateTime());
    }
  }
  return nullptr;
}

}  // namespace qm
