// How the file checks word a failure met on the way: the message chain on
// one line, so that each problem they report stays one line.
#pragma once

#include <string>

#include "base/exception.h"

namespace qm {

inline std::string DamageText(const CExceptionBase& e) {
  std::string text = e.GetFullTextUtf8(kLevelGeneral);
  for (auto at = text.find("\r\n"); at != std::string::npos; at = text.find("\r\n", at)) {
    text.replace(at, 2, "; ");
  }
  while (!text.empty() && (text.back() == ' ' || text.back() == ';' || text.back() == '\n')) {
    text.pop_back();
  }
  return text;
}

}  // namespace qm
