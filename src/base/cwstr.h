// CWStr: the engine's growable wide (UTF-16) string.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "base/engine_string.h"

namespace qm {

struct CWStrNames {
  static constexpr const char* kCtor = "CWStr::CWStr";
  static constexpr const char* kTraceTag = "ShareLib.Value.CWStr";
  static constexpr const char* kSCopy = "CWStr::SCopy";
  static constexpr const char* kSCat = "CWStr::SCat";
  static constexpr const char* kAddChar = "CWStr::AddChar";
  static constexpr const char* kReserve = "CWStr::Reserve";
  static constexpr const char* kSCopy0 = "CWStr::SCopy0";
  static constexpr const char* kGetChar = "CWStr::GetChar";
  static constexpr const char* kReplaceChar = "CWStr::ReplaceChar";
};

class CWStr : public EngineString<char16_t, CWStrNames> {
 public:
  using EngineString::EngineString;
  CWStr(const std::u16string& text) : EngineString(std::u16string_view(text)) {}

  std::u16string_view View() const { return View_(); }
  // The text as UTF-8.
  std::string Narrow() const;

  // Index of the first occurrence of other, or -1.
  int Find(std::u16string_view other) const;
  // Tries up to 100 entries in order, stopping at the first empty one; returns
  // the position of the first entry that occurs here and sets index to it
  // (-1 and -1 when none does).
  int FindInList(const std::vector<std::u16string>& list, int& index) const;
  // Removes the first and last unit if they are open and close.
  void StripEnclosing(char16_t open, char16_t close);
  // True if the unit at position is one of set; "#", "*" and "?" count only
  // when a backslash stands before them.
  bool IsSpecialAt(std::size_t position, std::u16string_view set) const;
};

}  // namespace qm
