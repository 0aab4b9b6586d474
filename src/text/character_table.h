// The character table of a language: 256 rows of eight numbers from 0 to 255.
// Row n fills entry n of five byte maps from its 3rd, 4th, 6th, 7th and 8th
// numbers; the engine uses the sound map (6th) and the plain map (8th).
#pragma once

#include <array>
#include <cstdint>
#include <string_view>

namespace qm::text {

class CharacterTable {
 public:
  using Map = std::array<uint8_t, 256>;

  // False when the text is not exactly 256 rows of 8 decimal numbers 0-255.
  static bool Parse(std::string_view bytes, CharacterTable& out);

  // Accent removal: a Latin-1 letter to its base letter, upper case; 0 ends a word.
  const Map& Plain() const { return maps_[4]; }
  // Table-based phonetic code: letters that sound alike share an entry; 0 drops.
  const Map& Sound() const { return maps_[2]; }
  // Maps 0-4 are the 3rd, 4th, 6th, 7th and 8th numbers of each row.
  const Map& ColumnMap(int index) const { return maps_[static_cast<std::size_t>(index)]; }

  static constexpr int kRows = 256;
  static constexpr int kNumbersPerRow = 8;

 private:
  std::array<Map, 5> maps_{};
};

}  // namespace qm::text
