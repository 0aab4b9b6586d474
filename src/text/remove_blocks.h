// Removal of marked-up blocks (tags, scripts) from a text.
#pragma once

#include <string>
#include <string_view>

namespace qm {

// Removes, in place and in one pass, every stretch from an occurrence of open
// to the next occurrence of close after it, both included; an open without a
// close after it removes the rest of the text. An empty open removes nothing.
void RemoveBlocks(std::u16string& text, std::u16string_view open, std::u16string_view close);
void RemoveBlocks(std::string& text, std::string_view open, std::string_view close);

}  // namespace qm
