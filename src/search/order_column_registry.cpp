#include "search/order_column_registry.h"

#include "platform/text_encoding.h"

namespace qm {

const AttachedColumn* COrderColumnRegistry::Find(std::string_view name) const {
  const std::string wanted = ToUpper(name);
  for (const AttachedColumn& column : columns_) {
    if (column.name == wanted) return &column;
  }
  return nullptr;
}

}  // namespace qm
