// A configured home and data root for converter tests: the converters folder,
// the group's Config and WorkData folders, and settings pointing at them.
#pragma once

#include <filesystem>
#include <string>

#include "base/exception.h"
#include "config/global_defs.h"
#include "support/test_support.h"

namespace qm::test {

// The text a host is shown of what f raised, or "no failure".
template <class F>
std::string FailureText(F&& f) {
  try {
    f();
  } catch (CExceptionBase& e) {
    return e.GetFullTextUtf8(kLevelWritten);
  }
  return "no failure";
}

class ConverterHome {
 public:
  // The data root's name has a blank in it, so command lines built from
  // folder placeholders are tested with one.
  ConverterHome() : data_(home_.Data() + "data root/") {
    for (const char* sub : {"Converters", "Groups/PUBLIC/Config", "Groups/PUBLIC/WorkData"}) {
      std::filesystem::create_directories(data_ + sub);
    }
    defs_.SetDataPath(data_);
  }

  CGlobalDefs& Defs() { return defs_; }
  const std::string& Data() const { return data_; }
  const std::string& Home() const { return home_.Home(); }
  std::string Converters() const { return data_ + "Converters/"; }
  std::string WorkData() const { return data_ + "Groups/PUBLIC/WorkData/"; }

  void WriteConverters(const std::string& text) const {
    WriteFile(Converters() + "Converters.txt", text);
  }

  // Files left in the work folder.
  int WorkFileCount() const {
    int n = 0;
    for ([[maybe_unused]] const auto& entry : std::filesystem::directory_iterator(WorkData())) ++n;
    return n;
  }

  // Every trace line written so far, all modules and days together.
  std::string TraceText() const {
    std::string text;
    const std::string log = home_.Home() + "Log/";
    if (!std::filesystem::exists(log)) return text;
    for (const auto& entry : std::filesystem::directory_iterator(log)) {
      text += ReadFile(entry.path().string());
    }
    return text;
  }

 private:
  ConfiguredHome home_;
  std::string data_;
  CGlobalDefs defs_;
};

}  // namespace qm::test
