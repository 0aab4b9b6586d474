// Test-side reading of sorted entry files, written from the byte layout alone
// (item row of little-endian 32-bit integers, then the value in the encoding
// of findex blocks), and a data root with settings for the word sort tests.
#pragma once

#include <gtest/gtest.h>

#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

#include "support/findex_decoder.h"
#include "config/global_defs.h"
#include "format/mfile.h"
#include "base/value.h"
#include "support/test_support.h"

namespace qm::test {

struct SortedEntry {
  std::vector<int32_t> row;  // key, then weight and/or position
  WordValue value;
};

// Every entry of file from its start to its end, for entries of this width and type.
inline std::vector<SortedEntry> ReadSortedEntries(MFile& file, int width, VALUE_TYPE type) {
  std::string bytes(static_cast<std::size_t>(file.FileSize(false)), '\0');
  if (!bytes.empty()) file.mread(bytes.data(), bytes.size());
  std::vector<SortedEntry> entries;
  std::size_t at = 0;
  while (at < bytes.size()) {
    SortedEntry e;
    for (int i = 0; i < width; ++i, at += 4) e.row.push_back(LoadInt32(bytes, at));
    const auto value = DecodeValue(bytes, at, bytes.size(), static_cast<int32_t>(type));
    if (!value) {
      ADD_FAILURE() << "the file ends inside an entry";
      break;
    }
    e.value = *value;
    entries.push_back(std::move(e));
  }
  return entries;
}

// Value, then key; with a marker column (the raw-file order, or the position),
// the marker ascends among equal value and key.
inline void ExpectSortedAndStable(const std::vector<SortedEntry>& entries, int marker = -1) {
  for (std::size_t i = 1; i < entries.size(); ++i) {
    const SortedEntry& a = entries[i - 1];
    const SortedEntry& b = entries[i];
    ASSERT_FALSE(b.value < a.value) << "value order broken at " << i;
    if (a.value == b.value) {
      ASSERT_LE(a.row[0], b.row[0]) << "key order broken at " << i;
      if (marker >= 0 && a.row[0] == b.row[0]) {
        ASSERT_LT(a.row[marker], b.row[marker]) << "unstable at " << i;
      }
    }
  }
}

// A configured home with trace level 2 on, and a data root whose PUBLIC group
// has its Config, WorkData and Converters folders.
class SortHome {
 public:
  SortHome() : trace_on_(home_) {
    for (const char* sub : {"Converters", "Groups/PUBLIC/Config", "Groups/PUBLIC/WorkData"}) {
      std::filesystem::create_directories(home_.Data() + sub);
    }
    defs_.SetDataPath(home_.Data());
  }

  CGlobalDefs& Defs() { return defs_; }
  const std::string& Data() const { return home_.Data(); }
  std::string WorkData() const { return home_.Data() + "Groups/PUBLIC/WorkData/"; }

  std::vector<std::string> WorkFiles() const {
    std::vector<std::string> names;
    for (const auto& e : std::filesystem::directory_iterator(WorkData())) {
      names.push_back(e.path().filename().string());
    }
    return names;
  }

  // Every trace line written so far.
  std::string TraceText() const {
    std::string text;
    for (const auto& e : std::filesystem::directory_iterator(home_.Home() + "Log/")) {
      if (e.path().filename() != "traceStat.log") text += ReadFile(e.path().string());
    }
    return text;
  }

 private:
  struct TraceOn {
    explicit TraceOn(const ConfiguredHome& home) {
      WriteFile(home.Home() + "Log/traceStat.log", "TRACE LEVEL 2\r\n");
    }
  };
  ConfiguredHome home_;
  TraceOn trace_on_;
  CGlobalDefs defs_;  // reads the trace level file
};

}  // namespace qm::test
