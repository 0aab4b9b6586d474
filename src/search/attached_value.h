// How an order's stored values lie in result rows once attached: in 32-bit
// columns whose signed comparison, column after column, orders the values
// as the values themselves order, NULLs last. Integers, ranks and date/time
// keys (date key, then time key) are stored that way already. A double is
// stored as its low then its high 32 bits; in the rows it becomes its bits
// made order-preserving (the sign bit set for positives, all bits inverted
// for negatives), high half first, each half biased by 2^31.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "search/order_column_registry.h"

namespace qm {

// For a number or date/time column of a text order: takes its encoded
// values by rank (the order's column file), so that its groups read values
// rather than ranks.
void TakeRankValues(AttachedColumn& column, const std::vector<std::vector<uint8_t>>& values);

// Writes the row columns of one value from its stored slots.
void ToSortable(const AttachedColumn& column, const int32_t* stored, int32_t* out);
// The row columns of a key the order does not hold: after every value.
void SortableNull(const AttachedColumn& column, int32_t* out);

// The value as a 32-bit integer for a caller: an integer, a date key or the
// rank of a text as it stands; a double truncated toward zero and held to the 32-bit
// range. A NULL reads as 2147483647.
int32_t GroupValue(const AttachedColumn& column, const int32_t* row_columns);
// The value in decimal for an SQL "in" list: a double in its shortest exact
// form, anything else as GroupValue.
std::string GroupText(const AttachedColumn& column, const int32_t* row_columns);

}  // namespace qm
