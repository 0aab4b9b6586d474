// The keyless byte substitution that hides connection texts in dbc.dat and in
// index headers. It is its own inverse: the same call scrambles and unscrambles.
#pragma once

#include <cstdint>
#include <string>

namespace qm {

uint8_t ScrambleConnectionByte(uint8_t b);
void ScrambleConnectionText(std::string& text);

}  // namespace qm
