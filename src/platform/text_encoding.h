// UTF-8 <-> UTF-16 conversion and simple case mapping, independent of the
// process locale. Invalid input never fails: it becomes U+FFFD.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace qm {

std::u16string Utf8ToUtf16(std::string_view text);
std::string Utf16ToUtf8(std::u16string_view text);

// Appending forms, for loops that reuse their output buffers.
void AppendUtf8AsUtf16(std::string_view text, std::u16string& out);
void AppendUtf16AsUtf8(std::u16string_view text, std::string& out);

// Simple (one-to-one) case mapping per code point.
char32_t ToUpperCodePoint(char32_t c);
char32_t ToLowerCodePoint(char32_t c);
std::u16string ToUpper(std::u16string_view text);
std::u16string ToLower(std::u16string_view text);
std::string ToUpper(std::string_view utf8);
std::string ToLower(std::string_view utf8);
void ToUpperInPlace(std::u16string& text);

// ASCII-only upper-casing, for keywords and names that are compared as bytes.
std::string AsciiUpper(std::string_view text);

// Largest length <= max_bytes that does not cut a UTF-8 sequence.
std::size_t Utf8CutLength(std::string_view text, std::size_t max_bytes);
// Largest length <= max_units that does not cut a surrogate pair.
std::size_t Utf16CutLength(std::u16string_view text, std::size_t max_units);

// Decodes one code point at text[pos], advancing pos by at least one byte;
// invalid bytes give U+FFFD. At the end of text it returns U+FFFD and leaves pos.
char32_t DecodeUtf8(std::string_view text, std::size_t& pos);
// Surrogates and values above U+10FFFF are written as U+FFFD.
void EncodeUtf8(char32_t c, std::string& out);
void EncodeUtf16(char32_t c, std::u16string& out);

}  // namespace qm
