// Texts as JSON strings.
#pragma once

#include <string>
#include <string_view>

namespace qm::cli {

// utf8 as a JSON string literal, quotes included: ", \ and the control
// characters escaped, everything else (UTF-8 included) as it is.
std::string JsonString(std::string_view utf8);

}  // namespace qm::cli
