#include "base/connection_scramble.h"

#include <array>
#include <utility>

namespace qm {

namespace {

constexpr std::array<uint8_t, 256> MakeTable() {
  std::array<uint8_t, 256> t{};
  for (int b = 0; b < 256; ++b) {
    int m = b;
    if (b >= 34 && b <= 83) m = b + 50;
    if (b >= 84 && b <= 133) m = b - 50;
    if (b >= 134 && b <= 183) m = b + 50;
    if (b >= 184 && b <= 233) m = b - 50;
    t[b] = static_cast<uint8_t>(m);
  }
  constexpr std::pair<int, int> kSwaps[] = {{9, 2}, {10, 3}, {13, 4}, {32, 1}};
  for (const auto& [a, b] : kSwaps) {
    t[a] = static_cast<uint8_t>(b);
    t[b] = static_cast<uint8_t>(a);
  }
  return t;
}

constexpr std::array<uint8_t, 256> kTable = MakeTable();

}  // namespace

uint8_t ScrambleConnectionByte(uint8_t b) { return kTable[b]; }

void ScrambleConnectionText(std::string& text) {
  for (char& c : text) c = static_cast<char>(kTable[static_cast<unsigned char>(c)]);
}

}  // namespace qm
