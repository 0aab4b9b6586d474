// Helpers for the core tests: catching a family exception and reading back
// the trace lines a test produced.
#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <filesystem>
#include <string>
#include <vector>

#include "platform/text_encoding.h"
#include "shared/checked_allocation.h"
#include "shared/exception.h"
#include "support/test_support.h"

namespace qm::test {

// The chain of an exception as UTF-8 texts, outermost first.
inline std::vector<std::string> EntryTexts(const CExceptionBase& e) {
  std::vector<std::string> texts;
  for (const auto& entry : e.GetEntries()) texts.push_back(Utf16ToUtf8(entry.text));
  return texts;
}

// Runs f and returns the chain of the E it throws; records a failure when f
// throws nothing or something else.
template <class E, class F>
std::vector<std::string> ThrownTexts(F&& f) {
  try {
    f();
  } catch (const E& e) {
    return EntryTexts(e);
  } catch (...) {
    ADD_FAILURE() << "threw an exception of another type";
    return {};
  }
  ADD_FAILURE() << "threw nothing";
  return {};
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

// Makes every allocation above `bytes` fail while it lives.
class AllocationLimit {
 public:
  explicit AllocationLimit(std::size_t bytes) { SetAllocationLimitForTesting(bytes); }
  ~AllocationLimit() { SetAllocationLimitForTesting(0); }
  AllocationLimit(const AllocationLimit&) = delete;
  AllocationLimit& operator=(const AllocationLimit&) = delete;
};

}  // namespace qm::test
