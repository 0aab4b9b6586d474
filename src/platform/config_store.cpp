#include "platform/config_store.h"

#include <cstdlib>
#include <fstream>

#include "platform/text_encoding.h"

namespace qm::platform {

namespace {

constexpr std::size_t kMaxValueBytes = 500;

std::string Trim(std::string_view s) {
  const auto b = s.find_first_not_of(" \t\r\n");
  if (b == std::string_view::npos) return {};
  const auto e = s.find_last_not_of(" \t\r\n");
  return std::string(s.substr(b, e - b + 1));
}

// The values the store is known to hold; MORVIL_LOCKDIR and MORVIL_REGISTRY
// configure the platform layer, not the store.
bool AnyMorvilVariable() {
  for (const char* name : {"MORVIL_HOME", "MORVIL_PATH", "MORVIL_SYSTEM", "MORVIL_CLIENT_PIPORT",
                           "MORVIL_CLIENT_GIPORT", "MORVIL_SERVER_PUPORT"}) {
    if (std::getenv(name) != nullptr) return true;
  }
  return false;
}

std::string Cut(std::string value) {
  value.resize(Utf8CutLength(value, kMaxValueBytes));
  return value;
}

}  // namespace

std::string ConfigFilePath() {
  const char* path = std::getenv("MORVIL_REGISTRY");
  return (path != nullptr && *path != '\0') ? path : "/etc/morvil/registry.conf";
}

ConfigStatus ReadConfigValue(std::string_view name, std::string& out) {
  out.clear();
  const std::string variable = "MORVIL_" + AsciiUpper(name);
  if (const char* v = std::getenv(variable.c_str()); v != nullptr) {
    out = Cut(v);
    return ConfigStatus::Ok;
  }
  std::ifstream file(ConfigFilePath());
  if (!file) return AnyMorvilVariable() ? ConfigStatus::ValueMissing : ConfigStatus::KeyMissing;
  std::string line;
  const std::string wanted = AsciiUpper(name);
  while (std::getline(file, line)) {
    const std::string trimmed = Trim(line);
    if (trimmed.empty() || trimmed[0] == '#' || trimmed[0] == ';') continue;
    const auto eq = trimmed.find('=');
    if (eq == std::string::npos) continue;
    if (AsciiUpper(Trim(trimmed.substr(0, eq))) == wanted) {
      out = Cut(Trim(trimmed.substr(eq + 1)));
      return ConfigStatus::Ok;
    }
  }
  return ConfigStatus::ValueMissing;
}

}  // namespace qm::platform
