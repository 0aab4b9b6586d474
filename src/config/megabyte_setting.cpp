#include "config/megabyte_setting.h"

#include <algorithm>
#include <string>

#include "platform/config_store.h"

namespace qm {

namespace {

constexpr std::size_t kMegabyte = 1024 * 1024;
// Far beyond any memory, and still no overflow in bytes.
constexpr std::size_t kMostMegabytes = std::size_t{1} << 24;

}  // namespace

std::size_t ReadMegabyteSetting(std::string_view name, std::size_t default_mb,
                                std::size_t floor_mb) {
  std::string text;
  std::size_t mb = default_mb;
  if (platform::ReadConfigValue(name, text) == platform::ConfigStatus::Ok && !text.empty() &&
      std::all_of(text.begin(), text.end(), [](char c) { return c >= '0' && c <= '9'; })) {
    std::size_t value = 0;
    for (const char c : text) {
      value = std::min(value * 10 + static_cast<std::size_t>(c - '0'), kMostMegabytes);
    }
    mb = value;
  }
  return std::max(mb, floor_mb) * kMegabyte;
}

}  // namespace qm
