// Reading one value of the configuration store that stands in for the MORVIL
// registry key, failing with the STDFUN messages when it is not there.
#pragma once

#include <string>
#include <string_view>

namespace qm {

// Raises "Morvil registry key does not exists" when the store cannot be
// opened, and "Morvil registry key %S does not exists" when it lacks the value.
std::string GetRegKey(std::string_view name);

}  // namespace qm
