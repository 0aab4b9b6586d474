// The trace log: one text file per module and day under the home Log folder.
// Trace never throws; a line that cannot be written is dropped.
#pragma once

#include <atomic>
#include <ctime>
#include <string>
#include <string_view>

#include "base/message_format.h"

namespace qm {

// Process-wide mirrors of the three trace flags (set by InitTraceLevels).
extern std::atomic<bool> TraceLevel1;
extern std::atomic<bool> TraceLevel2;
extern std::atomic<bool> TraceLevel3;

struct TraceLevels {
  bool level1 = false;
  bool level2 = false;
  bool level3 = false;
};

// Reads home/Log/traceStat.log and sets the process-wide flags; returns them.
TraceLevels InitTraceLevels();

// Writes one formatted line into the day's file of each module named in the tag
// ("MOD1,MOD2.Area.Method"). Does nothing when flag is false.
void TraceMessage(std::string_view tag, std::string_view message) noexcept;

template <class... A>
void Trace(bool flag, std::string_view tag, std::string_view format, const A&... args) noexcept {
  if (!flag) return;
  try {
    TraceMessage(tag, FormatNarrow(format, kMaxTraceMessage, args...));
  } catch (...) {
    // Tracing must never replace the failure being reported.
  }
}

// The day part of a trace file name and the line written for one call, both
// without leading zeros: "2004-3-9" and "2004-3-9 14:5:7 Block.InsertRow - text\r\n".
std::string TraceDate(const std::tm& when);
std::string TraceLine(const std::tm& when, std::string_view area, std::string_view message);

// The trace roll-over limit: a day's file above this many bytes continues in
// base_1.log, base_2.log, ... Adjustable only for tests.
void SetTraceFileLimitForTesting(long long bytes);

}  // namespace qm
