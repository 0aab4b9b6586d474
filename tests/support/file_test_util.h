// Helpers for the core tests: the texts of a raised exception chain, the trace
// lines a test produced, recorded retry pauses, an allocation limit and typed
// values.
#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <chrono>
#include <filesystem>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/text_encoding.h"
#include "base/checked_allocation.h"
#include "base/exception.h"
#include "config/retry_pause.h"
#include "base/value.h"
#include "support/test_support.h"

namespace qm::test {

// The chain of an exception as UTF-8 texts, outermost first.
inline std::vector<std::string> EntryTexts(const CExceptionBase& e) {
  std::vector<std::string> texts;
  for (const auto& entry : e.GetEntries()) texts.push_back(Utf16ToUtf8(entry.text));
  return texts;
}

// Runs body, expects an exception of type E and returns its chain's texts
// (empty, with a failure recorded, when anything else happens).
template <class E, class Body>
std::vector<std::string> RaisedChain(Body&& body) {
  try {
    body();
  } catch (const E& e) {
    return EntryTexts(e);
  } catch (...) {
  }
  ADD_FAILURE() << "the expected exception was not raised";
  return {};
}

// The first (outermost) text of the raised chain.
template <class E, class Body>
std::string RaisedText(Body&& body) {
  const auto chain = RaisedChain<E>(std::forward<Body>(body));
  return chain.empty() ? std::string() : chain.front();
}

// Everything written to the trace files of one module (all days, all parts).
inline std::string TraceOf(const ConfiguredHome& home, const std::string& module) {
  std::vector<std::string> files;
  const std::string prefix = "trace_" + module + "_";
  for (const auto& entry : std::filesystem::directory_iterator(home.Home() + "Log")) {
    const std::string name = entry.path().filename().string();
    // The date follows the module name, so "SHARELIB" does not pick up "SHARELIB_ERROR".
    if (name.rfind(prefix, 0) == 0 && name.size() > prefix.size() &&
        std::isdigit(static_cast<unsigned char>(name[prefix.size()]))) {
      files.push_back(entry.path().string());
    }
  }
  std::sort(files.begin(), files.end());
  std::string all;
  for (const auto& f : files) all += ReadFile(f);
  return all;
}

inline bool Has(const std::string& text, const std::string& part) {
  return text.find(part) != std::string::npos;
}

// Makes every allocation above `bytes` fail while it lives.
class AllocationLimit {
 public:
  explicit AllocationLimit(std::size_t bytes) { SetAllocationLimitForTesting(bytes); }
  ~AllocationLimit() { SetAllocationLimitForTesting(0); }
  AllocationLimit(const AllocationLimit&) = delete;
  AllocationLimit& operator=(const AllocationLimit&) = delete;
};

// Records every retry pause instead of sleeping; on_pause (if given) runs at
// each pause with its 1-based count, so a test can change the world between
// attempts.
class PauseRecorder {
 public:
  explicit PauseRecorder(std::function<void(std::size_t)> on_pause = {})
      : on_pause_(std::move(on_pause)) {
    SetRetryPauseHookForTesting([this](std::chrono::milliseconds d) {
      pauses_.push_back(d);
      if (on_pause_) on_pause_(pauses_.size());
    });
  }
  ~PauseRecorder() { SetRetryPauseHookForTesting({}); }
  PauseRecorder(const PauseRecorder&) = delete;
  PauseRecorder& operator=(const PauseRecorder&) = delete;

  const std::vector<std::chrono::milliseconds>& Pauses() const { return pauses_; }
  // True when there were count pauses, each of ms milliseconds.
  bool Were(std::size_t count, long ms) const {
    return pauses_ == std::vector<std::chrono::milliseconds>(count, std::chrono::milliseconds(ms));
  }

 private:
  std::function<void(std::size_t)> on_pause_;
  std::vector<std::chrono::milliseconds> pauses_;
};

// Typed values, one maker per type.
inline CValue Value(std::string_view s) { CValue v; v.SetText(s); return v; }
inline CValue Value(std::u16string_view s) { CValue v; v.SetTextW(s); return v; }
inline CValue Value(int32_t i) { CValue v; v.SetInteger(i); return v; }
inline CValue Value(double d) { CValue v; v.SetDouble(d); return v; }
inline CValue Value(const DateTimeValue& d) { CValue v; v.SetDateTime(d); return v; }

}  // namespace qm::test
