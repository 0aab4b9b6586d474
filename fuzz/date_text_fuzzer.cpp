// Dates from text: either every field is in range or a "Value" error is raised.
#include <cstddef>
#include <cstdint>
#include <string_view>

#include "fuzz_check.h"
#include "base/exception_family.h"
#include "base/value.h"

using qm::fuzz::Require;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, std::size_t size) {
  if (size < 1) return 0;
  const bool upper = (data[0] & 1) != 0;
  const std::string_view text(reinterpret_cast<const char*>(data + 1), size - 1);
  qm::CValue value;
  try {
    value.SetDateFromText(text, upper);
  } catch (const qm::CValueException&) {
    return 0;
  }
  const qm::DateTimeValue& d = value.GetDateTime();
  Require(value.GetType() == qm::VALUE_TYPE::DateTime);
  Require(d.month <= 12 && d.day <= 31);
  Require(d.hour <= 23 || (upper && d.hour == 25));
  Require(d.minute <= 59 || (upper && d.minute == 61));
  Require(d.second <= 59 || (upper && d.second == 61));
  return 0;
}
