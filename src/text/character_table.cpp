#include "text/character_table.h"

#include "text/language_file.h"

namespace qm::text {

namespace {

// A decimal number from 0 to 255, or -1.
int ParseByte(std::string_view token) {
  int value = 0;
  for (const char c : token) {
    if (c < '0' || c > '9') return -1;
    value = value * 10 + (c - '0');
    if (value > 255) return -1;
  }
  return value;
}

}  // namespace

bool CharacterTable::Parse(std::string_view bytes, CharacterTable& out) {
  const auto tokens = SplitBlankTokens(bytes);
  if (tokens.size() != static_cast<std::size_t>(kRows * kNumbersPerRow)) return false;
  // Columns 2, 3, 5, 6, 7 (from 0) are kept; 0, 1 and 4 are read for the check only.
  static constexpr std::array<int, 5> kKeptColumns = {2, 3, 5, 6, 7};
  CharacterTable table;
  for (int row = 0; row < kRows; ++row) {
    std::array<int, kNumbersPerRow> numbers{};
    for (int col = 0; col < kNumbersPerRow; ++col) {
      numbers[col] = ParseByte(tokens[static_cast<std::size_t>(row * kNumbersPerRow + col)]);
      if (numbers[col] < 0) return false;
    }
    for (std::size_t m = 0; m < kKeptColumns.size(); ++m) {
      table.maps_[m][static_cast<std::size_t>(row)] = static_cast<uint8_t>(numbers[kKeptColumns[m]]);
    }
  }
  out = table;
  return true;
}

}  // namespace qm::text
