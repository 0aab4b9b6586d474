// Conversions between the platform's local time and the engine's dates.
#pragma once

#include <string>

#include "platform/local_time.h"
#include "base/value.h"

namespace qm {

// The local time as a date with fraction 0.
DateTimeValue SystemTimeToSQLTime(const platform::LocalTime& time);

// "Y-M-D h:m:s" in decimal without leading zeros, then, when asked for, "."
// and the fraction of a second (nanoseconds, trailing zeros dropped: ".123"),
// so the text reads back as the same time.
std::string SQLTimeToString(const DateTimeValue& time, bool with_fraction = false);

// The form for date literals inside SQL: "2024-03-09 14:05:07", zero-padded,
// then "." and the fraction as 9 digits of nanoseconds when asked for.
std::string SQLTimeToSqlLiteral(const DateTimeValue& time, bool with_fraction = false);

}  // namespace qm
