// CPiFIndex: the files of one findex (name.sdx word tree, name.fst postings):
// building them from a definition, moving a build into place, dropping them.
//
// Contract between the command engine and the findex build. The engine decides
// what to build (rebuild or add-on target, SortMax) and calls BuildRowFindex;
// progress goes to the settings (CGlobalDefs::SetProgress).
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "config/global_defs.h"
#include "format/index_header.h"
#include "format/mfile.h"

namespace qm {

class SortedEntries;

class CPiFIndex {
 public:
  // Open modes of the file layer, plus 4: create the temporary build files.
  static constexpr int32_t kModeBuild = 4;

  explicit CPiFIndex(CGlobalDefs& defs);
  ~CPiFIndex();
  CPiFIndex(const CPiFIndex&) = delete;
  CPiFIndex& operator=(const CPiFIndex&) = delete;

  // Mode 3 opens an existing findex read-only and reads its header; a missing
  // findex raises. Mode 4 takes a temporary name in the index folder for a
  // build (its files are removed by Close unless moved into place). Other
  // modes would truncate a findex and are refused. Names are upper-cased when
  // file names are formed and must be plain names.
  void Open(std::string_view name, int32_t mode);
  bool IsOpen() const;
  void Close();
  // The header read by Open in mode 3.
  const CIndexHeader& Header() const;

  // Sorts the rows of definition's SELECT (from definition.SortMax on, for an
  // update), writes the word tree and postings under temporary names and moves
  // them into place under the findex name of the definition. A rebuild that
  // selects no row raises error 47; an update (rebuild false) that selects
  // none leaves every file as it was.
  void BuildRowFindex(CIndexHeader& definition, bool rebuild);
  // The second half of BuildRowFindex: writes the findex of the sorted entry
  // file (read from its current position; see build/word_sort.h) under
  // temporary names and moves it into place; progress 100 at the end. No
  // entry writes a findex without words (BlockNum 1) for a rebuild; an update
  // without entries leaves the findex as it was. On failure only the
  // temporary files were touched, and they are gone.
  void BuildFromSorted(CIndexHeader& definition, MFile& sorted, bool rebuild);
  // The same from entries handed over in order (the sort's merge as it runs).
  void BuildFromSorted(CIndexHeader& definition, SortedEntries& sorted, bool rebuild);

  // Removes the open findex with its add-ons and deleted-key file; an add-on
  // name ("_ADD_") raises error 44. REQUIRES: the caller holds the exclusive
  // kind 2 and kind 1 locks of the findex (DROP FINDEX takes them).
  void DropFindex();
  // Removes whatever files of the findex name exist (pair, add-ons, deleted
  // keys), also damaged ones that no longer open, tracing each; returns their
  // paths. A name without any file raises what opening it raises; an add-on
  // name error 44. REQUIRES: the locks of DropFindex.
  std::vector<std::string> DropFindexFiles(std::string_view name);

 private:
  struct State;
  CGlobalDefs& defs_;
  std::unique_ptr<State> state_;
};

}  // namespace qm
