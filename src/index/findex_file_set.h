// The file set of a findex in the group's index folder: NAME.sdx (word tree),
// NAME.fst (postings), NAME.del (deleted keys) and the add-ons NAME_ADD_n.
// Names are upper-cased when file and lock names are formed (the search side
// does the same, and file names are case-sensitive).
//
// A finished build is moved into place so that the findex is never missing
// and readers (who hold a reader unit of the findex's kind 2 lock) see the
// whole old pair or the whole new one.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace qm {

class CGlobalDefs;

namespace findex {

inline constexpr std::string_view kAddOnMark = "_ADD_";

struct FilePaths {
  std::string sdx;
  std::string fst;
  std::string del;
};

// The index folder of the current group + the upper-cased name + extension.
FilePaths PathsOf(const CGlobalDefs& defs, std::string_view name);
// name_ADD_n, upper-cased.
std::string AddOnName(std::string_view name, int32_t n);
// True for an add-on name (compared in upper case).
bool IsAddOnName(std::string_view name);
// The findex an add-on belongs to ("BOOKS" for "Books_ADD_2"), else the name;
// upper-cased.
std::string OwnerName(std::string_view name);

// A name that reaches file paths must be plain: not empty, at most 199
// characters, no "/", "\", double quote or control character, not "." or
// "..". Raises a "PiFIndex" error naming method otherwise.
void CheckFindexName(std::string_view name, const char* method);

// Moves temp_sdx and temp_fst into place as name's pair, under the exclusive
// kind 2 lock of the findex (and of the add-on itself for an add-on name);
// the lock is tried a few times, the finished files waiting meanwhile.
// The old pair is renamed aside, the new one renamed in, and only then the
// old one deleted; a failed rename restores the old pair and raises "Error
// renaming index file %S". With rebuild, the findex's add-ons and (under the
// exclusive kind 1 lock) its deleted-key file go too. Pushes nothing to
// synchronisation servers.
void MoveIntoPlace(const CGlobalDefs& defs, std::string_view name, const std::string& temp_sdx,
                   const std::string& temp_fst, bool rebuild);

// Deletes name.del, every name_ADD_n pair (n = 1, 2, ... while one exists)
// and name's pair, whichever of them exist, whatever their state; returns
// the paths deleted. REQUIRES: the caller holds the exclusive kind 2 and
// kind 1 locks of the findex.
std::vector<std::string> DropFiles(const CGlobalDefs& defs, std::string_view name);

// The files of name that exist: name's pair, name.del and the add-on pairs,
// in the order DropFiles deletes them.
std::vector<std::string> ExistingFiles(const CGlobalDefs& defs, std::string_view name);

// Removes the temporaries of the group's Indexes folder that no running build
// holds (files left by killed builds), tracing each; returns their paths.
std::vector<std::string> RemoveOrphanedTempFiles(const CGlobalDefs& defs);

}  // namespace findex
}  // namespace qm
