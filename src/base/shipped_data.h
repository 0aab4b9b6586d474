// Where the data folder shipped with the engine (System/, Language/) lives.
#pragma once

#include <string>
#include <string_view>

namespace qm {

// The first of these folders that holds probe (a path below it): the
// share/quillmere/ folder beside the installed library, the source tree's
// data/ for an uninstalled build, the install prefix's share/quillmere/.
// With none, the source tree's data/. Ends in "/".
std::string ShippedDataFolder(std::string_view probe);

}  // namespace qm
