// The order columns attached to a result set's rows, by the name a caller
// reads them under (ORDER.COLUMN, upper case): their value type and where
// their values lie in the rows.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "base/value.h"

namespace qm {

struct AttachedColumn {
  std::string name;      // ORDER.COLUMN, upper case
  VALUE_TYPE type = VALUE_TYPE::Integer;
  bool ranks = false;    // a text order's column: the rows hold ranks, not values
  int32_t first = 0;     // the row column of its first value slot
  int32_t slots = 1;     // value slots, each one sort key
  // A number or date/time column of a text order: its values by rank, as
  // callers read them (attached_value.h).
  std::vector<int32_t> rank_values;
  std::vector<std::string> rank_texts;
};

class COrderColumnRegistry {
 public:
  void Register(AttachedColumn column) { columns_.push_back(std::move(column)); }
  // The column registered under name (compared in upper case), or nullptr.
  const AttachedColumn* Find(std::string_view name) const;
  bool Empty() const { return columns_.empty(); }
  void Clear() { columns_.clear(); }

 private:
  std::vector<AttachedColumn> columns_;
};

}  // namespace qm
