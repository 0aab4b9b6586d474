// The message formatter with a format and arguments taken from the input: the
// text before the first zero byte is the format, the rest one argument.
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

#include "fuzz_check.h"
#include "platform/text_encoding.h"
#include "base/message_format.h"

using qm::fuzz::Require;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, std::size_t size) {
  const std::string_view all(reinterpret_cast<const char*>(data), size);
  const std::size_t zero = all.find('\0');
  const std::string_view format = all.substr(0, zero);
  const std::string_view arg = zero == std::string_view::npos ? std::string_view() : all.substr(zero + 1);
  const std::size_t limit = size % 64;

  const std::string narrow = qm::FormatNarrow(format, limit, arg, -1, qm::Utf8ToUtf16(arg));
  Require(narrow.size() <= limit);
  const std::string full = qm::FormatNarrow(format, qm::kMaxTraceMessage, arg, size);
  Require(full.size() <= qm::kMaxTraceMessage);

  const std::u16string wide = qm::FormatWide(qm::Utf8ToUtf16(format), limit, arg, size);
  Require(wide.size() <= limit);
  return 0;
}
