// Text read from a data source, made fit for the engine: valid UTF-8 (or
// UTF-16) and at most a given number of characters, cut on a character
// boundary. Drivers hand out text in pieces that end anywhere and report
// column sizes that are no limit, so the cut is made here, after joining.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace qm {

// The longest column text the engine keeps, in characters.
inline constexpr std::size_t kMaxColumnCharacters = 2000;

// out = the first max_chars characters of bytes; invalid UTF-8 sequences
// become U+FFFD (each one counts as a character).
void AssignColumnText(std::string_view bytes, std::size_t max_chars, std::string& out);

// out = the first max_chars characters of units; a surrogate pair counts as one
// character and is never split; a lone surrogate becomes U+FFFD.
void AssignColumnText(std::u16string_view units, std::size_t max_chars, std::u16string& out);

}  // namespace qm
