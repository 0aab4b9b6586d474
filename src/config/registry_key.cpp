#include "config/registry_key.h"

#include "platform/config_store.h"
#include "base/exception_family.h"

namespace qm {

std::string GetRegKey(std::string_view name) {
  std::string value;
  switch (platform::ReadConfigValue(name, value)) {
    case platform::ConfigStatus::Ok:
      return value;
    case platform::ConfigStatus::KeyMissing:
      throw CSTDFUNException::Text("Morvil registry key does not exists", "getregkey", nullptr);
    case platform::ConfigStatus::ValueMissing:
      break;
  }
  throw CSTDFUNException::Text("Morvil registry key %S does not exists", "getregkey", nullptr,
                               std::string(name));
}

}  // namespace qm
