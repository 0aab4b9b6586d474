#include "shared/sql_time.h"

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
  if (with_fraction) s += "." + std::to_string(time.fraction);
  return s;
}

}  // namespace qm
