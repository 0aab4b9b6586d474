// Rows of text cells as the host prints them: columns aligned for a reader
// on a terminal, tab-separated for a program reading a pipe.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace qm::cli {

using TableRow = std::vector<std::string>;

// One line per row. Aligned: cells padded to their column's width in
// characters (UTF-8 sequences count once) and two blanks apart, the last
// cell unpadded. Otherwise the cells joined by tabs.
std::string TableText(const std::vector<TableRow>& rows, bool aligned);

// A value as one cell: a backslash, tab, line feed or carriage return in it
// becomes "\\", "\t", "\n" or "\r", so that a cell never breaks its line or
// its column.
std::string CellText(std::string_view value);

}  // namespace qm::cli
