// The column list of an order definition: column names separated by commas
// (outside double quotes), kept in statement order.
#pragma once

#include <string_view>

#include "format/order_info.h"

namespace qm {

// Replaces columns by the names of the list, in list order, blanks around each
// name removed. An empty list or name, or an unterminated double quote, is
// PiCmd error 17 raised with method; columns is then left as it was.
void ParseOrderColumns(std::u16string_view list, OrderColumnList& columns, const char* method);

}  // namespace qm
