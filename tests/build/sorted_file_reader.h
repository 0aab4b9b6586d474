// Test-side reading of sorted entry files, written from the byte layout alone
// (item row of little-endian 32-bit integers, then the value), and a data
// root with settings for the word sort tests.
#pragma once

#include <gtest/gtest.h>

#include <bit>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

#include "shared/global_defs.h"
#include "shared/mfile.h"
#include "shared/value.h"
#include "support/test_support.h"

namespace qm::test {

struct SortedEntry {
  std::vector<int32_t> row;  // key, then weight and/or position
  CValue value;
};

inline uint32_t LoadLe(const std::string& b, std::size_t at, int bytes) {
  uint32_t v = 0;
  for (int i = bytes - 1; i >= 0; --i) v = (v << 8) | static_cast<unsigned char>(b[at + i]);
  return v;
}

// Every entry of file from its start to its end, for entries of this width and type.
inline std::vector<SortedEntry> ReadSortedEntries(MFile& file, int width, VALUE_TYPE type) {
  std::string bytes(static_cast<std::size_t>(file.FileSize(false)), '\0');
  if (!bytes.empty()) file.mread(bytes.data(), bytes.size());
  std::vector<SortedEntry> entries;
  std::size_t at = 0;
  while (at < bytes.size()) {
    SortedEntry e;
    e.value.SetType(type);
    for (int i = 0; i < width; ++i, at += 4) {
      e.row.push_back(static_cast<int32_t>(LoadLe(bytes, at, 4)));
    }
    switch (type) {
      case VALUE_TYPE::AsciiString: {
        const std::size_t n = LoadLe(bytes, at, 2);
        e.value.SetText(std::string_view(bytes).substr(at + 2, n));
        at += 2 + n;
        break;
      }
      case VALUE_TYPE::UnicodeString: {
        const std::size_t n = LoadLe(bytes, at, 2);
        std::u16string text;
        for (std::size_t i = 0; i < n; ++i) text.push_back(static_cast<char16_t>(LoadLe(bytes, at + 2 + 2 * i, 2)));
        e.value.SetTextW(text);
        at += 2 + 2 * n;
        break;
      }
      case VALUE_TYPE::Integer:
        e.value.SetInteger(static_cast<int32_t>(LoadLe(bytes, at, 4)));
        at += 4;
        break;
      case VALUE_TYPE::Double: {
        const uint64_t bits = LoadLe(bytes, at, 4) | (uint64_t{LoadLe(bytes, at + 4, 4)} << 32);
        e.value.SetDouble(std::bit_cast<double>(bits));
        at += 8;
        break;
      }
      case VALUE_TYPE::DateTime: {
        auto u16 = [&](int i) { return static_cast<uint16_t>(LoadLe(bytes, at + 2 * i, 2)); };
        e.value.SetDateTime({static_cast<int16_t>(u16(0)), u16(1), u16(2), u16(3), u16(4), u16(5),
                             LoadLe(bytes, at + 12, 4)});
        at += 16;
        break;
      }
    }
    EXPECT_LE(at, bytes.size()) << "the file ends inside an entry";
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
    const int c = a.value.Compare(b.value);
    ASSERT_NE(c, kNotComparable) << i;
    ASSERT_LE(c, 0) << "value order broken at " << i;
    if (c == 0) {
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
