// Command-style tokenizing of arbitrary bytes: byte 0 is the delimiter, byte 1
// the drop-hash flag and the delimiter-set length; the rest is the source.
#include <cstddef>
#include <cstdint>
#include <string>

#include "fuzz_check.h"
#include "base/exception_family.h"
#include "base/tokenizer.h"

using qm::fuzz::Require;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, std::size_t size) {
  if (size < 2) return 0;
  const char delimiter = static_cast<char>(data[0]);
  const bool drop_hash = (data[1] & 1) != 0;
  const std::string original(reinterpret_cast<const char*>(data + 2), size - 2);

  std::string source = original;
  std::string token;
  while (qm::GetToken(source, token, delimiter, drop_hash)) {
    Require(source.size() < original.size());
  }
  Require(token.empty());

  const std::string set = original.substr(0, data[1] % 4);
  std::string rest = original.substr(set.size());
  for (;;) {
    const std::size_t before = rest.size();
    if (qm::GetTokenBySet(rest, token, set) == -1) {
      Require(rest.empty());
      break;
    }
    Require(rest.size() < before);
  }

  std::string quoted = original;
  qm::TrimQuotes(quoted);
  qm::RemoveQuotes(quoted);
  Require(quoted.find('"') == std::string::npos);

  std::string trimmed = original;
  try {
    qm::STrimLeft(trimmed);
    qm::STrimRight(trimmed);
  } catch (const qm::CSTDFUNException&) {
    Require(original.size() > 1999);
  }
  return 0;
}
