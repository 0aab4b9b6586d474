// CColumnSet: which 32-bit columns the item rows of a findex or result set
// carry beside the key: a score (s), a position (p) and two groups of option
// columns (a, b). Row layout: key, [score], [position], a options, b options.
#pragma once

#include <cstdint>

namespace qm {

struct CColumnSet {
  uint16_t s = 0;  // score column: 0 or 1
  uint16_t p = 0;  // position column: 0 or 1
  uint16_t a = 0;  // option columns shared by merged arrays
  uint16_t b = 0;  // option columns that merging appends side by side

  // General option flags of a findex header: bit 1 scores, bit 2 positions.
  static CColumnSet FromGeneralFlags(int32_t flags) {
    CColumnSet set;
    set.s = (flags & 1) != 0 ? 1 : 0;
    set.p = (flags & 2) != 0 ? 1 : 0;
    return set;
  }

  // Row width in integers and row size in bytes.
  int32_t Width() const { return 1 + s + p + a + b; }
  int32_t Size() const { return 4 * Width(); }

  // Columns of the row: the score, the position, and option column i.
  int32_t ScoreColumn() const { return 1; }
  int32_t PositionColumn() const { return 1 + s; }
  int32_t OptionColumn(int32_t i) const { return 1 + s + p + i; }
  int32_t OptionCount() const { return a + b; }

  // s, p and b agree; a is not compared.
  bool Equals(const CColumnSet& other) const {
    return s == other.s && p == other.p && b == other.b;
  }

  // The set of an array that holds the rows of both: s and p when either has
  // them, the b columns of both side by side; a stays this set's.
  void Merge(const CColumnSet& other) {
    s = (s != 0 || other.s != 0) ? 1 : 0;
    p = (p != 0 || other.p != 0) ? 1 : 0;
    b = static_cast<uint16_t>(b + other.b);
  }
};

}  // namespace qm
