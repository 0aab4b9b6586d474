#include "base/sql_time.h"

#include <algorithm>
#include <cstdio>

namespace qm {

DateTimeValue SystemTimeToSQLTime(const platform::LocalTime& time) {
  DateTimeValue d;
  d.year = static_cast<int16_t>(time.year);
  d.month = static_cast<uint16_t>(time.month);
  d.day = static_cast<uint16_t>(time.day);
  d.hour = static_cast<uint16_t>(time.hour);
  d.minute = static_cast<uint16_t>(time.minute);
  d.second = static_cast<uint16_t>(time.second);
  d.fraction = 0;
  return d;
}

std::string SQLTimeToString(const DateTimeValue& time, bool with_fraction) {
  std::string s = std::to_string(time.year) + "-" + std::to_string(time.month) + "-" +
                  std::to_string(time.day) + " " + std::to_string(time.hour) + ":" +
                  std::to_string(time.minute) + ":" + std::to_string(time.second);
  if (with_fraction) {
    // The fraction counts nanoseconds: 5,000,000 is ".005", never ".5000000".
    std::string digits = std::to_string(time.fraction % 1000000000u);
    digits.insert(0, 9 - digits.size(), '0');
    digits.erase(std::max<std::size_t>(digits.find_last_not_of('0') + 1, 1));
    s += "." + digits;
  }
  return s;
}

std::string SQLTimeToSqlLiteral(const DateTimeValue& time, bool with_fraction) {
  char text[64];
  int n = std::snprintf(text, sizeof text, "%04d-%02u-%02u %02u:%02u:%02u", int{time.year},
                        unsigned{time.month}, unsigned{time.day}, unsigned{time.hour},
                        unsigned{time.minute}, unsigned{time.second});
  if (with_fraction && n > 0) {
    std::snprintf(text + n, sizeof text - static_cast<std::size_t>(n), ".%09u",
                  static_cast<unsigned>(time.fraction));
  }
  return text;
}

}  // namespace qm
