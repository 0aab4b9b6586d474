// File helpers of the STDFUN module: deletes with retries, the engine's open
// with its access-denied message, whole-file reads and writes.
#pragma once

#include <string>
#include <string_view>

#include "platform/file_io.h"

namespace qm {

// Deletes path if it exists: up to 10 attempts, 1,000 ms apart; then raises
// "Error deleting file: %S".
void DropFile(const std::string& path);

// Deletes path: up to 5 attempts, 1,000 ms apart; then raises
// "Error deleting file %S". A missing file fails at once.
void DeleteFile(const std::string& path);

// The message of a file that cannot be opened or created (takes the path).
inline constexpr const char* kOpenFailureText =
    "Access denied or disk full. Could not open or create file: %S. If you are running this "
    "component from a web server, the Internet user must have write access to the Quillmere "
    "Search data directory.";

// Opens or creates path; a failure raises kOpenFailureText.
platform::FileHandle OpenWindowsFile(const std::string& path, platform::FileAccess access,
                                     platform::FileDisposition disposition,
                                     unsigned attributes = platform::kFileAttributeNormal);

// The whole content of an existing file.
std::string loadtext(const std::string& path);

// Creates or truncates path and writes text, without terminator.
void WriteTextFile(const std::string& path, std::string_view text);

}  // namespace qm
