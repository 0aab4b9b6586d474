// The number of single-character insertions, deletions and substitutions
// between two words, computed only as far as a bound: the similarity scan
// asks "within D?" of every word of a findex, so the work is a band of width
// 2D + 1 rather than the whole table.
#pragma once

#include <cstdint>
#include <string_view>

namespace qm {

// What BoundedEditDistance answers for a distance above its bound.
inline constexpr int32_t kDistanceBeyondBound = 1048575;

// The exact distance when it is at most bound (bound >= 0), else
// kDistanceBeyondBound. Characters are code points.
int32_t BoundedEditDistance(std::u32string_view a, std::u32string_view b, int32_t bound);

}  // namespace qm
