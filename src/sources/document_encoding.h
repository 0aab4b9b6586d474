// Document bytes as engine text: documents arrive in whatever encoding their
// author used, the engine works in UTF-8.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace qm {

// UTF-8 from a document's bytes: a UTF-8 byte-order mark is dropped, text
// with a UTF-16 byte-order mark (either byte order) is converted, and any
// byte sequence that is not UTF-8 becomes U+FFFD.
std::string DecodeDocumentBytes(std::string_view bytes);

// The first max_chars characters of a UTF-8 text (never a split character).
std::string_view FirstCharacters(std::string_view text, std::size_t max_chars);

}  // namespace qm
