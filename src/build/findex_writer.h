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

#include "shared/global_defs.h"
#include "shared/index_header.h"

namespace qm {

class CPiFIndex {
 public:
  // Open modes of the file layer, plus 4: create the temporary build files.
  static constexpr int32_t kModeBuild = 4;

  explicit CPiFIndex(CGlobalDefs& defs);
  ~CPiFIndex();
  CPiFIndex(const CPiFIndex&) = delete;
  CPiFIndex& operator=(const CPiFIndex&) = delete;

  // Mode 3 opens an existing findex read-only and reads its header; a missing
  // findex raises. (Names are upper-cased when file names are formed.)
  void Open(std::string_view name, int32_t mode);
  bool IsOpen() const;
  void Close();
  // The header read by Open (mode other than 1 and 4).
  const CIndexHeader& Header() const;

  // Sorts the rows of definition's SELECT (from definition.SortMax on, for an
  // update), writes the word tree and postings under temporary names and moves
  // them into place under the findex name of the definition.
  void BuildRowFindex(CIndexHeader& definition, bool rebuild);

  // Removes the open findex with its add-ons and deleted-key file; an add-on
  // name ("_ADD_") raises error 44.
  void DropFindex();

 private:
  struct State;
  CGlobalDefs& defs_;
  std::unique_ptr<State> state_;
};

}  // namespace qm
