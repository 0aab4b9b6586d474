// CPiSort: the first half of a findex build. Reads the rows of a definition's
// SELECT, turns every column value into index entries and sorts them on disk.
//
// Contract between the word sort and the findex writer: an entry of the
// sorted file is an item row (key; weight with score support; position with
// phrase support: the CColumnSet of the definition's general flags) followed
// by the value in the findex type's MFile encoding (text: 16-bit length then
// UTF-8 bytes for an ANSI findex or UTF-16 units for a Unicode one; integer 4
// bytes; double 8; date/time 16). Entries come by value, then key, stably.
#pragma once

#include <cstdint>

#include "config/global_defs.h"
#include "format/index_header.h"
#include "format/mfile.h"

namespace qm {

class CShareDatabase;

class CPiSort {
 public:
  explicit CPiSort(CGlobalDefs& defs);

  // What a selection without rows means: error 47 for a build that must
  // index something (CREATE, rebuilds), nothing new for an update.
  enum class NoRows { Raise, Allow };

  // Selects, writes and sorts; returns the rows read. On return sorted is
  // open for reading at its start (a delete-on-close temporary file) and
  // definition holds what the rows gave: FindexType, SortMax, KeyCount (rows
  // read), MaxDateTimeKey, BuildTime and LastUpdateTime. Progress goes to the
  // settings: 5, 15, 20, then 20 + (70 div n) x n per merge pass. No row
  // raises error 47, or with NoRows::Allow returns 0 with sorted not opened.
  int64_t SortFindexTable(CIndexHeader& definition, MFile& sorted, NoRows no_rows = NoRows::Raise);

 private:
  // Runs the selection's statements in order, each only when the one before
  // it failed; records the build and update times.
  void ExecuteSelect(CShareDatabase& database, CIndexHeader& definition);
  // Decides the findex type from the executed selection's columns, then
  // runs the row loop: every row into entries of raw. Returns the rows read.
  int64_t WriteFindexRows(CShareDatabase& database, MFile& raw, CIndexHeader& definition);

  CGlobalDefs& defs_;
};

}  // namespace qm
