// CStr: the engine's growable narrow (UTF-8) string.
#pragma once

#include <string>
#include <string_view>

#include "base/engine_string.h"

namespace qm {

struct CStrNames {
  static constexpr const char* kCtor = "CStr::CStr";
  static constexpr const char* kTraceTag = "ShareLib.Value.CStr";
  static constexpr const char* kSCopy = "CStr::SCopy";
  static constexpr const char* kSCat = "CStr::SCopy";
  static constexpr const char* kAddChar = "CStr::AddChar";
  static constexpr const char* kReserve = "CStr::Reserve";
  static constexpr const char* kSCopy0 = "CStr::SCopy0";
  static constexpr const char* kGetChar = "CStr::GetChar";
  static constexpr const char* kReplaceChar = "CStr::ReplaceChar";
};

class CStr : public EngineString<char, CStrNames> {
 public:
  using EngineString::EngineString;
  CStr(const std::string& text) : EngineString(std::string_view(text)) {}

  std::string_view View() const { return View_(); }
  // The text as UTF-16.
  std::u16string Wide() const;
};

}  // namespace qm
