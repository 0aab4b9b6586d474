// Reading the files of a language folder: whole-file reads that fail with the
// file layer's messages, the blank-separated tokens of 8-bit files, and the
// UTF-16LE text of stop.txt and lang.txt.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace qm::text {

// The file's bytes, read through WinFile: a file that cannot be opened raises
// its "Error opening file: %s", one that cannot be read "Error reading from
// file".
std::string ReadLanguageFile(const std::string& path);

// Tokens of an 8-bit file: runs between space, line feed, carriage return,
// form feed and tab.
std::vector<std::string_view> SplitBlankTokens(std::string_view bytes);

// Decodes UTF-16LE bytes, dropping a leading byte-order mark. False for an odd
// byte count (a cut file).
bool DecodeUtf16Le(std::string_view bytes, std::u16string& out);

// Tokens of a UTF-16 language file: runs between space, line feed and carriage
// return.
std::vector<std::u16string_view> SplitUtf16Tokens(std::u16string_view text);

}  // namespace qm::text
