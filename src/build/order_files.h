// The names of an order's files, and reading the info of an existing order.
// Order names are upper-cased whenever a file or lock name is formed; the info
// keeps the name as written.
#pragma once

#include <string>
#include <string_view>

#include "shared/order_info.h"

namespace qm {

class CGlobalDefs;

// The order folder of the current group + the upper-cased name + extension
// (".sri", ".srt").
std::string OrderFilePath(const CGlobalDefs& defs, std::string_view name,
                          std::string_view extension);

// The info in block 0 of name.sri, read under a reader unit of the order's lock.
COrderInfo ReadOrderInfoShared(const CGlobalDefs& defs, std::string_view name);

}  // namespace qm
