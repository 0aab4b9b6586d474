#include "format/items_row.h"

#include <new>

#include "base/error_numbers.h"
#include "base/checked_allocation.h"
#include "base/exception_family.h"

namespace qm {

void CItemsRow::SetColumns(const CColumnSet& set) {
  set_ = set;
  width_ = set.Width();
  row_.clear();
  allocated_ = false;
}

void CItemsRow::AllocateRow() {
  if (allocated_) return;
  try {
    ReserveChecked(row_, static_cast<std::size_t>(width_));
    row_.assign(static_cast<std::size_t>(width_), 0);
  } catch (const std::bad_alloc&) {
    throw CFreeItemException::Numbered(kErrOutOfMemory, "CItemsRow::AllocateRow", nullptr);
  }
  allocated_ = true;
}

int32_t CItemsRow::Get(ItemKind kind) const {
  const int32_t column = KindColumn(set_, kind);
  if (!allocated_ || column < 0) throw CFreeItemException::General("CItemsRow::Get");
  return row_[static_cast<std::size_t>(column)];
}

void CItemsRow::Set(ItemKind kind, int32_t value) {
  const int32_t column = kind == ItemKind::Option ? -1 : KindColumn(set_, kind);
  if (!allocated_ || column < 0) throw CFreeItemException::General("CItemsRow::Set");
  row_[static_cast<std::size_t>(column)] = value;
}

void CItemsRow::SetOption(int32_t i, int32_t value) {
  if (!allocated_ || i < 0 || i >= set_.OptionCount()) {
    throw CFreeItemException::General("CItemsRow::SetOption");
  }
  row_[static_cast<std::size_t>(set_.OptionColumn(i))] = value;
}

int32_t CItemsRow::GetOption(int32_t i) const {
  if (!allocated_ || i < 0 || i >= set_.OptionCount()) {
    throw CFreeItemException::General("CItemsRow::GetOption");
  }
  return row_[static_cast<std::size_t>(set_.OptionColumn(i))];
}

}  // namespace qm
