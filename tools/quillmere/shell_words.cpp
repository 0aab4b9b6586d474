#include "shell_words.h"

namespace qm::cli {

namespace {

bool IsBlank(char c) { return c == ' ' || c == '\t' || c == '\r' || c == '\n'; }

}  // namespace

bool SplitShellWords(std::string_view line, std::vector<ShellWord>& words, std::string& error) {
  words.clear();
  std::size_t i = 0;
  const std::size_t n = line.size();
  while (true) {
    while (i < n && IsBlank(line[i])) ++i;
    if (i >= n) return true;
    ShellWord word;
    while (i < n && !IsBlank(line[i])) {
      const char c = line[i];
      if (c == '\'') {
        const std::size_t close = line.find('\'', i + 1);
        if (close == std::string_view::npos) {
          error = "a single quote is not closed";
          return false;
        }
        word.text.append(line.substr(i + 1, close - i - 1));
        word.quoted = true;
        i = close + 1;
      } else if (c == '"') {
        word.quoted = true;
        ++i;
        while (i < n && line[i] != '"') {
          // Inside double quotes a backslash escapes only " and itself.
          if (line[i] == '\\' && i + 1 < n && (line[i + 1] == '"' || line[i + 1] == '\\')) ++i;
          word.text += line[i++];
        }
        if (i >= n) {
          error = "a double quote is not closed";
          return false;
        }
        ++i;
      } else if (c == '\\') {
        if (i + 1 >= n) {
          error = "a backslash ends the line";
          return false;
        }
        word.text += line[i + 1];
        word.quoted = true;
        i += 2;
      } else {
        word.text += c;
        ++i;
      }
    }
    words.push_back(std::move(word));
  }
}

}  // namespace qm::cli
