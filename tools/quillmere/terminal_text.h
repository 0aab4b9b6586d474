// The text of an engine failure for a terminal.
#pragma once

#include <string>

#include "shared/exception.h"

namespace qm::cli {

// The whole message chain, its lines ending in "\n" rather than "\r\n".
inline std::string TerminalText(const CExceptionBase& e) {
  std::string text = e.GetFullTextUtf8(kLevelWritten);
  for (auto at = text.find("\r\n"); at != std::string::npos; at = text.find("\r\n", at)) {
    text.erase(at, 1);
  }
  return text;
}

}  // namespace qm::cli
