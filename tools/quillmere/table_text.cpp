#include "table_text.h"

#include <algorithm>

namespace qm::cli {

namespace {

// Characters, not bytes: continuation bytes of UTF-8 do not count.
std::size_t Width(std::string_view text) {
  const auto starts_character = [](char c) { return (static_cast<unsigned char>(c) & 0xC0) != 0x80; };
  return static_cast<std::size_t>(std::count_if(text.begin(), text.end(), starts_character));
}

}  // namespace

std::string TableText(const std::vector<TableRow>& rows, bool aligned) {
  std::vector<std::size_t> widths;
  for (const TableRow& row : rows) {
    if (widths.size() < row.size()) widths.resize(row.size(), 0);
    for (std::size_t i = 0; i < row.size(); ++i) widths[i] = std::max(widths[i], Width(row[i]));
  }
  std::string out;
  for (const TableRow& row : rows) {
    for (std::size_t i = 0; i < row.size(); ++i) {
      if (i > 0) out += aligned ? "  " : "\t";
      out += row[i];
      if (aligned && i + 1 < row.size()) out.append(widths[i] - Width(row[i]), ' ');
    }
    out += '\n';
  }
  return out;
}

std::string CellText(std::string_view value) {
  std::string out;
  out.reserve(value.size());
  for (char c : value) {
    switch (c) {
      case '\\': out += "\\\\"; break;
      case '\t': out += "\\t"; break;
      case '\n': out += "\\n"; break;
      case '\r': out += "\\r"; break;
      default: out += c;
    }
  }
  return out;
}

}  // namespace qm::cli
