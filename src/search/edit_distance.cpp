#include "search/edit_distance.h"

#include <algorithm>
#include <cstdlib>
#include <vector>

namespace qm {

int32_t BoundedEditDistance(std::u32string_view a, std::u32string_view b, int32_t bound) {
  if (bound < 0) return kDistanceBeyondBound;
  const int64_t n = static_cast<int64_t>(a.size());
  const int64_t m = static_cast<int64_t>(b.size());
  if (std::abs(n - m) > bound) return kDistanceBeyondBound;
  const int64_t k = bound;
  const int64_t big = k + 1;  // stands for "above the bound"
  // Row i holds the distances of a[0..i) to b[0..j) for |i - j| <= k.
  std::vector<int64_t> previous(static_cast<std::size_t>(m + 1), big);
  std::vector<int64_t> current(static_cast<std::size_t>(m + 1), big);
  for (int64_t j = 0; j <= std::min(m, k); ++j) previous[static_cast<std::size_t>(j)] = j;
  for (int64_t i = 1; i <= n; ++i) {
    const int64_t from = std::max<int64_t>(1, i - k);
    const int64_t to = std::min(m, i + k);
    std::fill(current.begin(), current.end(), big);
    if (i <= k) current[0] = i;
    int64_t row_min = current[0];
    for (int64_t j = from; j <= to; ++j) {
      const auto sj = static_cast<std::size_t>(j);
      const int64_t substitute = previous[sj - 1] + (a[static_cast<std::size_t>(i - 1)] == b[sj - 1] ? 0 : 1);
      const int64_t remove = previous[sj] + 1;
      const int64_t insert = current[sj - 1] + 1;
      current[sj] = std::min({substitute, remove, insert, big});
      row_min = std::min(row_min, current[sj]);
    }
    if (row_min > k) return kDistanceBeyondBound;
    std::swap(previous, current);
  }
  const int64_t d = previous[static_cast<std::size_t>(m)];
  return d <= k ? static_cast<int32_t>(d) : kDistanceBeyondBound;
}

}  // namespace qm
