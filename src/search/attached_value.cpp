#include "search/attached_value.h"

#include <bit>
#include <charconv>
#include <cmath>
#include <limits>

#include "format/order_layout.h"

namespace qm {

namespace {

constexpr uint64_t kSignBit = uint64_t{1} << 63;
constexpr uint32_t kBias = 0x80000000u;

bool IsDouble(const AttachedColumn& column) {
  return !column.ranks && column.type == VALUE_TYPE::Double;
}

bool IsSortableNull(const int32_t* c) { return c[0] == kNullSlot && c[1] == kNullSlot; }

double DoubleOf(const int32_t* c) {
  const uint64_t u = (uint64_t{static_cast<uint32_t>(c[0]) ^ kBias} << 32) |
                     (static_cast<uint32_t>(c[1]) ^ kBias);
  return std::bit_cast<double>((u & kSignBit) != 0 ? u ^ kSignBit : ~u);
}

}  // namespace

void ToSortable(const AttachedColumn& column, const int32_t* stored, int32_t* out) {
  if (!IsDouble(column)) {
    for (int32_t i = 0; i < column.slots; ++i) out[i] = stored[i];
    return;
  }
  if (stored[0] == kNullSlot && stored[1] == 0) {
    SortableNull(column, out);
    return;
  }
  uint64_t u = (uint64_t{static_cast<uint32_t>(stored[1])} << 32) | static_cast<uint32_t>(stored[0]);
  u = (u & kSignBit) != 0 ? ~u : u ^ kSignBit;
  out[0] = static_cast<int32_t>(static_cast<uint32_t>(u >> 32) ^ kBias);
  out[1] = static_cast<int32_t>(static_cast<uint32_t>(u) ^ kBias);
}

void SortableNull(const AttachedColumn& column, int32_t* out) {
  out[0] = kNullSlot;
  for (int32_t i = 1; i < column.slots; ++i) out[i] = IsDouble(column) ? kNullSlot : 0;
}

int32_t GroupValue(const AttachedColumn& column, const int32_t* row_columns) {
  if (!IsDouble(column)) return row_columns[0];
  if (IsSortableNull(row_columns)) return kNullSlot;
  const double v = std::trunc(DoubleOf(row_columns));
  if (std::isnan(v)) return 0;
  if (v >= static_cast<double>(std::numeric_limits<int32_t>::max())) {
    return std::numeric_limits<int32_t>::max();
  }
  if (v <= static_cast<double>(std::numeric_limits<int32_t>::min())) {
    return std::numeric_limits<int32_t>::min();
  }
  return static_cast<int32_t>(v);
}

std::string GroupText(const AttachedColumn& column, const int32_t* row_columns) {
  if (!IsDouble(column) || IsSortableNull(row_columns)) {
    return std::to_string(GroupValue(column, row_columns));
  }
  char buffer[32];
  const auto result = std::to_chars(buffer, buffer + sizeof buffer, DoubleOf(row_columns));
  return std::string(buffer, result.ptr);
}

}  // namespace qm
