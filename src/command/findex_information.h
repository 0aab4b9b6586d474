// The information values of a findex and of an order as text (GetFindexInfo,
// GetOrderInfo; the values are idxInfoEnum and odrInfoEnum).
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "format/order_info.h"

namespace qm {

class CGlobalDefs;

// One value of the findex name in the current group of defs, summed over its
// add-on findexes where the value is a count. Raises when the findex cannot
// be opened; "" for a value that is not answered.
std::string FindexInformation(CGlobalDefs& defs, std::string_view name, int32_t info);

// One value of an order's info, lower-cased whole; "" for a value that is not
// answered.
std::string OrderInformation(const COrderInfo& info, int32_t value);

// The type names of findexes and orders ("Error" for a code that is neither).
std::string_view FindexTypeName(int32_t type);
std::string_view OrderTypeName(int32_t type);

}  // namespace qm
