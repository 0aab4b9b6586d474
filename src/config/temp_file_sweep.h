// Removing the temporary files that killed builds leave behind. A build holds
// a lock on each temporary it writes (temp_file_claim.h), so a temporary that
// nobody holds locked belongs to no running build: its writer has died. Age
// plays no part: a long build's files are as old as a dead one's.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace qm {

// Names the engine gives its temporaries in the Indexes and Orders folders:
// "tmpxxxx_..." from the name generator (builds, and files set aside during a
// swap) and "tmp" + six letters or digits (deleted-key lists being replaced).
bool IsTempFileName(std::string_view name);

// Removes every temporary of folder (ending in "/") that nobody holds locked;
// returns the paths removed. Files that cannot be opened or locked stay.
std::vector<std::string> SweepOrphanedTempFiles(const std::string& folder);

}  // namespace qm
