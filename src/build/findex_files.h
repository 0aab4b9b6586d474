// The names under which a findex's files, add-ons and locks are formed, and
// reading the header of an existing findex. Findex names are upper-cased
// whenever a file, add-on or lock name is formed (the search side does the
// same, and file names are case-sensitive); headers keep the name as written.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "shared/index_header.h"

namespace qm {

class CGlobalDefs;

inline constexpr std::string_view kAddOnInfix = "_ADD_";

// name_ADD_n, upper-cased.
std::string AddOnName(std::string_view name, int32_t n);
// The index folder of the current group + the upper-cased name + extension
// (".sdx", ".fst", ".del").
std::string FindexFilePath(const CGlobalDefs& defs, std::string_view name,
                           std::string_view extension);
// True when the findex's word tree or posting file is there.
bool FindexFilesExist(const CGlobalDefs& defs, std::string_view name);

// The header of an existing findex, opened read-only. REQUIRES: the caller
// holds what keeps the files from being swapped meanwhile (the findex's
// CREATE command lock, or a reader unit of its findex lock).
CIndexHeader ReadFindexHeader(CGlobalDefs& defs, std::string_view name);
// The same under a reader unit of the findex lock, for callers that hold none.
CIndexHeader ReadFindexHeaderShared(CGlobalDefs& defs, std::string_view name);

}  // namespace qm
