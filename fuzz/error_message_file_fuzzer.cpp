// The error-message file parser on arbitrary bytes: only well-formed entries.
#include <cstddef>
#include <cstdint>
#include <string>

#include "fuzz_check.h"
#include "base/error_messages.h"

using qm::fuzz::Require;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, std::size_t size) {
  const std::string bytes(reinterpret_cast<const char*>(data), size);
  for (const auto& [number, entry] : qm::ParseErrorMessages(bytes)) {
    Require(entry.number == number && number != 0 && entry.level != 0);
    Require(!entry.text.empty() && entry.text.size() <= 2047);
    Require(entry.text.find_first_of(u"\r\n") == std::u16string::npos);
  }
  return 0;
}
