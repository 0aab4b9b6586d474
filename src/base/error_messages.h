// The process-wide table of numbered error messages, read from mrvconf.ini.
#pragma once

#include <cstdint>
#include <map>
#include <string>

#include "base/exception.h"

namespace qm {

// Loads the table from the "system" folder's mrvconf.ini (or the shipped data
// folder when none is configured). A missing file leaves the table empty.
void LoadErrorMessages();

// Loads the table from one file, replacing what was there. Returns false when
// the file cannot be opened (the table is then empty).
bool LoadErrorMessagesFromFile(const std::string& path);

// Parses the UTF-16LE contents of an error-message file (byte-order mark first).
std::map<int32_t, ErrorEntry> ParseErrorMessages(const std::string& bytes);

// The entry for a number: its text and level, or the default text
// "General Error (Module:%MODULE, Method:%METHOD)" at level 200.
ErrorEntry LookupErrorMessage(int32_t number);

// Where the error-message file is looked for (ends in "/").
std::string ErrorMessageFolder();

}  // namespace qm
