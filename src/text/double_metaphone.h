// The primary code of Lawrence Philips' Double Metaphone, over the whole word:
// the code is not cut to four characters.
#pragma once

#include <string>
#include <string_view>

namespace qm::text {

// Replaces out by the primary code of an upper-case word. Letters other than
// A-Z, Ç and Ñ contribute nothing.
void DoubleMetaphonePrimary(std::u16string_view word, std::u16string& out);

}  // namespace qm::text
