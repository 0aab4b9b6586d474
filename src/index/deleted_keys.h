// The deleted-key file of a findex (NAME.del beside NAME.sdx in the group's
// Indexes folder): the keys that searches subtract from their results, held
// sorted and without duplicates. A findex is never edited in place; deleting a
// row's key only adds it here, until a rebuild drops the file.
//
// Every change happens under the exclusive kind 1 lock of the findex name, and
// the file is replaced whole by a rename, so a reader under a kind 1 reader
// lock sees the old or the new list, never a mixture, and concurrent deletes
// never lose a key.
#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

namespace qm {

class CGlobalDefs;

// The group's Indexes folder + the findex name upper-cased + ".del".
std::string DeletedKeysPath(const CGlobalDefs& defs, std::string_view findex_name);

// Adds key to the findex's deleted keys; a key already there changes nothing
// (the file is not rewritten). A missing file starts a new list; a damaged one
// raises "Deleted-key file is damaged: %S" and stays as it was, as it does on
// every other failure. synchronise asks for the key to be handed to the
// synchronisation servers, which receive no deletions yet.
void DeleteKey(const CGlobalDefs& defs, std::string_view findex_name, int32_t key,
               bool synchronise);

// The findex's deleted keys in ascending order, read under a kind 1 reader
// lock held only for the read; empty when there is no file. A damaged file
// raises as above.
std::vector<int32_t> ReadDeletedKeys(const CGlobalDefs& defs, std::string_view findex_name);

// Removes the findex's deleted-key file, if any, under the exclusive kind 1
// lock (rebuilds and drops forget deleted keys).
void DropDeletedKeys(const CGlobalDefs& defs, std::string_view findex_name);

// Test hook: called with the temporary file's path after the new list is
// written and before it replaces NAME.del; an empty hook removes it.
void SetDeletedKeysReplaceHookForTesting(std::function<void(const std::string&)> hook);

}  // namespace qm
