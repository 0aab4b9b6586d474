// Reading the header of an existing findex, for the engine's information,
// existence, option and update calls. File and add-on names are those of the
// findex file set (build/findex_file_set.h).
#pragma once

#include <string_view>

#include "format/index_header.h"

namespace qm {

class CGlobalDefs;

// True when the findex's word tree or posting file is there.
bool FindexFilesExist(const CGlobalDefs& defs, std::string_view name);

// The header of an existing findex, opened read-only. REQUIRES: the caller
// holds what keeps the files from being swapped meanwhile (the findex's
// CREATE command lock, or a reader unit of its findex lock).
CIndexHeader ReadFindexHeader(CGlobalDefs& defs, std::string_view name);
// The definition stored in block 0 of the findex's word tree alone, for a
// rebuild: the rest of the files may be damaged or missing, as the rebuild
// replaces them. Same REQUIRES as ReadFindexHeader.
CIndexHeader ReadStoredDefinition(const CGlobalDefs& defs, std::string_view name);
// The same under a reader unit of the findex lock, for callers that hold none.
CIndexHeader ReadFindexHeaderShared(CGlobalDefs& defs, std::string_view name);

}  // namespace qm
