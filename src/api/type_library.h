// The type library as data: both interfaces (methods, dispatch identifiers,
// parameters with their types and directions), the enumerations and the
// registration, as the JSON text installed as quillmere-api.json.
#pragma once

#include <string>

namespace qm {

std::string TypeLibraryJson();

}  // namespace qm
