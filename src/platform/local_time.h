// The local wall-clock time, broken down as the engine stores dates.
#pragma once

namespace qm::platform {

struct LocalTime {
  int year = 0;
  int month = 0;  // 1-12
  int day = 0;    // 1-31
  int hour = 0;
  int minute = 0;
  int second = 0;
};

LocalTime CurrentLocalTime();

}  // namespace qm::platform
