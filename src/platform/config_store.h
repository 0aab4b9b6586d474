// The configuration store that stands in for the MORVIL registry key: a
// name=value file (MORVIL_REGISTRY, else /etc/morvil/registry.conf), each value
// overridable by an environment variable MORVIL_<NAME>. Read on every call.
#pragma once

#include <string>
#include <string_view>

namespace qm::platform {

enum class ConfigStatus {
  Ok,
  KeyMissing,    // neither the file nor any MORVIL_* variable exists
  ValueMissing,  // the store exists but does not hold this value
};

// Values longer than 500 bytes are cut there, as the registry read did.
ConfigStatus ReadConfigValue(std::string_view name, std::string& out);

// The path of the configuration file in use.
std::string ConfigFilePath();

}  // namespace qm::platform
