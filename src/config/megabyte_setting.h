// Sizes in megabytes read from the configuration store: a whole number of
// megabytes, a default when the value is missing or not a whole number, and a
// floor that smaller values are raised to.
#pragma once

#include <cstddef>
#include <string_view>

namespace qm {

// The value name of the store (MORVIL_<NAME> overrides it), in bytes.
std::size_t ReadMegabyteSetting(std::string_view name, std::size_t default_mb,
                                std::size_t floor_mb);

}  // namespace qm
