// A line split into words the way a POSIX shell splits a simple command:
// blanks separate words; single quotes keep everything up to the next single
// quote; double quotes keep everything but a backslash before " or \; a
// backslash outside quotes keeps the next character as it is.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace qm::cli {

struct ShellWord {
  std::string text;
  bool quoted = false;  // some part of the word was quoted or escaped
};

// The words of line; false with error set for an unclosed quote or a
// backslash at the end.
bool SplitShellWords(std::string_view line, std::vector<ShellWord>& words, std::string& error);

}  // namespace qm::cli
