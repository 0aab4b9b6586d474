// Temporary file names: "tmpxxxx_" + caller number + "_" + counter. The counter
// (1 to 10,000, then 1 again) lives in generator.dat of the group's or the
// home's Config folder and is read and advanced under the kind 8 writer lock,
// so concurrent processes get distinct names.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace qm {

class CGlobalDefs;

// The caller numbers in temporary names: they tell whose file a left-over
// temporary was, so each kind of file keeps its number.
enum TempNameCaller : int32_t {
  kTempCallerFindexFiles = 5,        // a findex build's .sdx/.fst before the swap
  kTempCallerOrderFiles = 6,         // an order build's files before the swap
  kTempCallerOptionFiles = 9,        // an option file before its rename
  kTempCallerSortRuns = 44,          // the sort's entry files
  kTempCallerKeyFile = 60,           // a search's key file for the host
  kTempCallerBinaryColumn = 81,      // a binary column value copied to a work file
  kTempCallerConverterOutput = 83,   // what an external converter writes
  kTempCallerDocument = 84,          // a fetched or copied document
};

// Group scope: the group's generator.dat; home scope: the home's (raises
// STDFUN "Home path is not set" when no home is configured).
std::string SLGetTempFileName(const CGlobalDefs& defs, bool group_scope, int32_t caller);

// Creates (exclusively) and returns a new file in the group's WorkData folder,
// named by the generator and ending in ".tmp", or in the extension of
// source_name when it has a usable one (1 to 16 letters, digits, "_" or "-").
std::string SLGetTempWorkFilePath(const CGlobalDefs& defs, int32_t caller,
                                  std::string_view source_name = {});

// The extension SLGetTempWorkFilePath gives a file made for source_name,
// with its dot: ".tmp" when none is usable.
std::string TempWorkFileExtension(std::string_view source_name);

// The home Config folder + a home-scope name + ".tmp"; the file is not created.
std::string SLGetTempConfigFilePath(const CGlobalDefs& defs, int32_t caller);

}  // namespace qm
