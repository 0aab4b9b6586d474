// Walking the files of a findex to find damage: what `quillmere check`
// reports. The walk reads through CGiFIndex, piece by piece, exactly what
// lookups read, and checks every rule the writer keeps.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace qm {

class CGlobalDefs;

// Every problem of the findex name and of each of its add-ons, one text each
// naming its place ("BOOKS.sdx block 7 (leaf): ..."); empty when sound: the
// header reads; the tree has its four levels, each child used once and every
// block reached; separators and leaf rows ascend and each subtree stays
// within its separators; the leaf chain links the leaves in tree order; each
// leaf row's posting list lies within the .fst, its count row sound, lists
// back to back, keys ascending within a list; and name.del (when there) is a
// sound list. Reads under a reader unit of the findex's kind 2 lock.
// REQUIRES: some file of the findex exists.
std::vector<std::string> CheckFindexFiles(const CGlobalDefs& defs, std::string_view name);

}  // namespace qm
