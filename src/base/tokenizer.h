// Narrow tokenizers and trims used by the command parser and the trace writer.
#pragma once

#include <string>
#include <string_view>

namespace qm {

// Skips leading delimiters, then copies into token up to the first delimiter
// outside double quotes and "#...#" date quotes. Two double quotes in a row
// give one; a single one toggles quoting and is kept; "#" toggles date quoting
// and is dropped with drop_hash. When a delimiter ends the token, source keeps
// what follows it and the result is true; when source ends first, the result
// is false, token is empty and source is left as it was.
bool GetToken(std::string& source, std::string& token, char delimiter, bool drop_hash);

// Skips leading characters of set and copies up to the next one; removes token
// and that delimiter from source and returns the delimiter. At the end of the
// source the remainder is the token, source becomes empty and the result is -1.
int GetTokenBySet(std::string& source, std::string& token, std::string_view set);

// Remove leading / trailing blanks in place; more than 1,999 characters raise
// the STDFUN error "String too long".
void STrimLeft(std::string& text);
void STrimRight(std::string& text);

// Removes every double-quote character.
void RemoveQuotes(std::string& text);
// Trims double quotes at both ends and collapses each pair of double quotes to one.
void TrimQuotes(std::string& text);

}  // namespace qm
