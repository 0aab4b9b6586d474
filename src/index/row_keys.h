// RowKeys: the keys of the rows a findex or an order build reads. Each row's
// key is an integer, or a double that holds a whole 32-bit number; the
// highest key and the highest date/time update key read are kept for the
// next update.
#pragma once

#include <cstdint>

#include "base/value.h"

namespace qm {

class CShareDatabase;

class RowKeys {
 public:
  // 1-based result columns; date_key_index 0 when the date/time update key
  // is not in use. sort_max and max_date_key: the highest ones read before.
  RowKeys(int key_index, VALUE_TYPE key_type, int date_key_index, int32_t sort_max,
          const DateTimeValue& max_date_key);

  // The key of the current cached row of database, its date/time update key
  // taken into the highest one (a row without one leaves it as it is). A
  // NULL key, a key that is no whole number or a date/time update key column
  // of another type raises Error naming method.
  template <class Error>
  int32_t Read(CShareDatabase& database, const char* method) {
    int32_t key = 0;
    if (const char* fault = TryRead(database, key)) throw Error::Text(fault, method, nullptr);
    return key;
  }

  int32_t SortMax() const { return sort_max_; }
  DateTimeValue MaxDateTimeKey() const { return max_date_.GetDateTime(); }

 private:
  // Null, or the message of what is wrong with the row.
  const char* TryRead(CShareDatabase& database, int32_t& key);

  int key_index_;
  VALUE_TYPE key_type_;
  int date_key_index_;
  int32_t sort_max_;
  CValue max_date_{VALUE_TYPE::DateTime};
  CValue key_value_;
  CValue date_value_;
};

}  // namespace qm
