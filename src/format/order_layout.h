// The layout of an order's rows. An order of type 1 stores, per key, the
// values themselves: an integer in one 32-bit slot, a double in two (its low
// then its high 32 bits), a date/time in two (its date key, then its time
// key); a NULL puts kNullSlot in the first slot and 0 in the second. An order
// of type 2 stores, per key, one rank per column: the position of the key's
// value among the column's distinct values, kNullSlot for a NULL.
//
// The header records each column's layout in the three values the order
// builder owns (OrderColumn::BuilderValues): the VALUE_TYPE code of the
// column's values, the row column of its first slot (the key is column 0),
// and its number of slots.
#pragma once

#include <cstdint>
#include <span>

#include "format/order_info.h"
#include "base/value.h"

namespace qm {

// Order types (COrderInfo::OrderType).
inline constexpr int32_t kOrderTypeValues = 1;
inline constexpr int32_t kOrderTypeRanks = 2;

// A NULL value's first slot, and a NULL's rank: after every other value.
inline constexpr int32_t kNullSlot = 2147483647;

struct OrderColumnLayout {
  VALUE_TYPE type = VALUE_TYPE::Integer;
  int32_t first = 1;
  int32_t slots = 1;

  bool operator==(const OrderColumnLayout&) const = default;

  static OrderColumnLayout Of(const OrderColumn& column) {
    return {static_cast<VALUE_TYPE>(column.BuilderValues[0]), column.BuilderValues[1],
            column.BuilderValues[2]};
  }
  void StoreIn(OrderColumn& column) const {
    column.BuilderValues = {static_cast<int32_t>(type), first, slots};
  }
};

inline bool IsTextType(VALUE_TYPE type) {
  return type == VALUE_TYPE::AsciiString || type == VALUE_TYPE::UnicodeString;
}

// Slots of a value of this type in a type 1 row.
inline int32_t ValueSlots(VALUE_TYPE type) {
  return type == VALUE_TYPE::Double || type == VALUE_TYPE::DateTime ? 2 : 1;
}

// The row width (key included) the header's column layouts describe.
inline int32_t StoredRowWidth(const COrderInfo& info) {
  int32_t width = 1;
  for (const OrderColumn& column : info.Columns) width += OrderColumnLayout::Of(column).slots;
  return width;
}

// Writes a type 1 column value into its slots (one or two, by its type).
void EncodeOrderSlots(const CValue& value, std::span<int32_t> slots);
// A NULL in slots of a column of this many slots.
inline void EncodeNullSlots(std::span<int32_t> slots) {
  slots[0] = kNullSlot;
  if (slots.size() > 1) slots[1] = 0;
}

}  // namespace qm
