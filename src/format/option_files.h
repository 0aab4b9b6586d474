// The five option files that keep a group's default options from one engine
// to the next, in the group's Config folder:
//   ilo.dat  language flags, language
//   igo.dat  general flags, maximum size, start value, separators
//   iuo.dat  update flags, update support
//   ogo.dat  order general flags, ignore characters
//   ouo.dat  order update flags, order update support
// Integers are 32-bit little-endian, strings a 16-bit length and UTF-16LE
// characters (the CWStr form of MFile).
#pragma once

#include "format/index_options.h"

namespace qm {

class CGlobalDefs;

inline constexpr const char* kIndexLanguageOptionFile = "ilo.dat";
inline constexpr const char* kIndexGeneralOptionFile = "igo.dat";
inline constexpr const char* kIndexUpdateOptionFile = "iuo.dat";
inline constexpr const char* kOrderGeneralOptionFile = "ogo.dat";
inline constexpr const char* kOrderUpdateOptionFile = "ouo.dat";

// Reads the files of the group of defs into options. Each file is read whole
// before any of its values is applied: a missing, short or overlong file
// leaves the values it holds as they were in options.
void LoadIndexOptionFiles(const CGlobalDefs& defs, IndexOptions& options);
void LoadOrderOptionFiles(const CGlobalDefs& defs, OrderOptions& options);

// Writes the files from options. Each is written under a temporary name in
// the same folder and renamed into place, so a reader sees the old or the new
// file, never a part.
void SaveIndexOptionFiles(const CGlobalDefs& defs, const IndexOptions& options);
void SaveOrderOptionFiles(const CGlobalDefs& defs, const OrderOptions& options);

}  // namespace qm
