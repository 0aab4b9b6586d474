#include "search/attached_value.h"

#include <bit>
#include <charconv>
#include <cmath>
#include <limits>

#include "base/byte_layout.h"
#include "format/order_layout.h"

namespace qm {

namespace {

constexpr uint64_t kSignBit = uint64_t{1} << 63;
constexpr uint32_t kBias = 0x80000000u;

bool IsDouble(const AttachedColumn& column) {
  return !column.ranks && column.type == VALUE_TYPE::Double;
}

bool IsSortableNull(const int32_t* c) { return c[0] == kNullSlot && c[1] == kNullSlot; }

int32_t TruncatedValue(double value) {
  const double v = std::trunc(value);
  if (std::isnan(v)) return 0;
  if (v >= static_cast<double>(std::numeric_limits<int32_t>::max())) {
    return std::numeric_limits<int32_t>::max();
  }
  if (v <= static_cast<double>(std::numeric_limits<int32_t>::min())) {
    return std::numeric_limits<int32_t>::min();
  }
  return static_cast<int32_t>(v);
}

std::string DoubleText(double value) {
  char buffer[32];
  const auto result = std::to_chars(buffer, buffer + sizeof buffer, value);
  return std::string(buffer, result.ptr);
}

// The rank of a value of a text order's number column, or -1 (a NULL).
int32_t RankOf(const AttachedColumn& column, const int32_t* c) {
  if (!column.ranks || column.rank_values.empty()) return -1;
  const int32_t rank = c[0];
  return rank >= 0 && static_cast<std::size_t>(rank) < column.rank_values.size() ? rank : -1;
}

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

void TakeRankValues(AttachedColumn& column, const std::vector<std::vector<uint8_t>>& values) {
  column.rank_values.clear();
  column.rank_texts.clear();
  for (const std::vector<uint8_t>& value : values) {
    switch (column.type) {
      case VALUE_TYPE::Integer: {
        if (value.size() < 4) return;
        const int32_t v = bytes::LoadI32(value.data());
        column.rank_values.push_back(v);
        column.rank_texts.push_back(std::to_string(v));
        break;
      }
      case VALUE_TYPE::Double: {
        if (value.size() < 8) return;
        const double v = bytes::LoadDouble(value.data());
        column.rank_values.push_back(TruncatedValue(v));
        column.rank_texts.push_back(DoubleText(v));
        break;
      }
      case VALUE_TYPE::DateTime: {
        if (value.size() < bytes::kDateBytes) return;
        CValue date;
        date.SetDateTime(bytes::LoadDate(value.data()));
        const auto key = static_cast<int32_t>(date.DateKey());
        column.rank_values.push_back(key);
        column.rank_texts.push_back(std::to_string(key));
        break;
      }
      default: return;  // texts keep their ranks
    }
  }
}

int32_t GroupValue(const AttachedColumn& column, const int32_t* row_columns) {
  if (const int32_t rank = RankOf(column, row_columns); rank >= 0) {
    return column.rank_values[static_cast<std::size_t>(rank)];
  }
  if (!IsDouble(column)) return row_columns[0];
  if (IsSortableNull(row_columns)) return kNullSlot;
  return TruncatedValue(DoubleOf(row_columns));
}

std::string GroupText(const AttachedColumn& column, const int32_t* row_columns) {
  if (const int32_t rank = RankOf(column, row_columns); rank >= 0) {
    return column.rank_texts[static_cast<std::size_t>(rank)];
  }
  if (!IsDouble(column) || IsSortableNull(row_columns)) {
    return std::to_string(GroupValue(column, row_columns));
  }
  return DoubleText(DoubleOf(row_columns));
}

}  // namespace qm
