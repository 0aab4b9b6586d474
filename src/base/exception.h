// The exception family: every failure inside the engine travels as one of these,
// carrying a chain of message entries from the outermost module to the cause.
#pragma once

#include <cstdint>
#include <exception>
#include <initializer_list>
#include <string>
#include <string_view>
#include <type_traits>
#include <vector>

#include "base/message_format.h"

namespace qm {

struct ErrorEntry {
  std::u16string text;
  int32_t number = 0;
  int32_t level = 0;
};

inline constexpr int32_t kLevelWritten = 100;  // a message written in the code
inline constexpr int32_t kLevelGeneral = 200;  // "General Error" and unknown numbers

inline constexpr std::string_view kUnknownExceptionText =
    "Unknown exception. This is a critical error, please report this problem to Morvil support";

// Content shared by CException and CUnknownException. Not thrown by itself; a
// handler for it sees both families (the API boundary uses that). It is a
// std::exception so that a handler that knows nothing of the family (a test
// framework, a host's last resort) still reports the whole chain.
class CExceptionBase : public std::exception {
 public:
  // The whole chain, every level, in UTF-8.
  const char* what() const noexcept override { return what_.c_str(); }

  const ErrorEntry& GetCurrentEntry() const { return current_; }
  const std::vector<ErrorEntry>& GetEntries() const { return entries_; }
  int32_t GetErrorNumber() const { return error_number_; }

  // Joins the chain's texts up to maxLevel, each followed by "\r\n"; falls back
  // to level 200, and then to every entry, so a failure is never reported empty.
  // Const so a handler holding a const reference can report; it only refreshes
  // the stored full text.
  const std::u16string& GetFullText(int32_t max_level) const;
  std::string GetFullTextUtf8(int32_t max_level) const;

 protected:
  void BuildGeneral(std::string_view module, const char* method, const CExceptionBase* inner);
  void BuildText(std::string_view module, std::u16string_view text, const char* method,
                 const CExceptionBase* inner, std::initializer_list<FormatArg> args);
  void BuildNumbered(std::string_view module, int32_t number, const char* method,
                     const CExceptionBase* inner, std::initializer_list<FormatArg> args);
  void BuildUnknown(std::string_view module, const char* method, const CExceptionBase* inner,
                    std::string_view trace_tag);

 private:
  void AppendCurrentAndInner(const CExceptionBase* inner);
  void RefreshWhat();

  ErrorEntry current_;
  std::vector<ErrorEntry> entries_;
  mutable std::u16string full_text_;
  std::u16string reserved_;
  std::string what_;
  int32_t error_number_ = 1;
};

class CException : public CExceptionBase {};
class CUnknownException : public CExceptionBase {};

// One exception class per module; Module supplies kName.
template <class Module>
class CModuleException : public CException {
 public:
  static constexpr std::string_view kModule = Module::kName;

  static CModuleException General(const char* method, const CExceptionBase* inner = nullptr) {
    CModuleException e;
    e.BuildGeneral(kModule, method, inner);
    return e;
  }
  template <class... A>
  static CModuleException Text(std::string_view text, const char* method,
                               const CExceptionBase* inner, const A&... args) {
    return Text(std::u16string_view(WidenAscii(text)), method, inner, args...);
  }
  template <class... A>
  static CModuleException Text(std::u16string_view text, const char* method,
                               const CExceptionBase* inner, const A&... args) {
    CModuleException e;
    e.BuildText(kModule, text, method, inner, {FormatArg(args)...});
    return e;
  }
  template <class... A>
  static CModuleException Numbered(int32_t number, const char* method,
                                   const CExceptionBase* inner, const A&... args) {
    CModuleException e;
    e.BuildNumbered(kModule, number, method, inner, {FormatArg(args)...});
    return e;
  }

 private:
  static std::u16string WidenAscii(std::string_view text);
};

// The unknown-exception class of a module; its construction always writes a trace line.
template <class Module>
class CModuleUnknownException : public CUnknownException {
 public:
  static constexpr std::string_view kModule = Module::kName;

  static CModuleUnknownException Unknown(const char* method,
                                         const CExceptionBase* inner = nullptr) {
    CModuleUnknownException e;
    e.BuildUnknown(kModule, method, inner, Module::UnknownTraceTag());
    return e;
  }
};

std::u16string WidenMessage(std::string_view utf8);

template <class Module>
std::u16string CModuleException<Module>::WidenAscii(std::string_view text) {
  return WidenMessage(text);
}

}  // namespace qm
