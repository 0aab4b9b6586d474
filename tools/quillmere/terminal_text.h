// The text of an engine failure for a terminal.
#pragma once

#include <string>

#include "base/exception.h"

namespace qm::cli {

// text with its "\r\n" line ends (those of a message chain) as "\n".
inline std::string TerminalLines(std::string text) {
  for (auto at = text.find("\r\n"); at != std::string::npos; at = text.find("\r\n", at)) {
    text.erase(at, 1);
  }
  return text;
}

// The whole message chain, its lines ending in "\n".
inline std::string TerminalText(const CExceptionBase& e) {
  return TerminalLines(e.GetFullTextUtf8(kLevelWritten));
}

}  // namespace qm::cli
