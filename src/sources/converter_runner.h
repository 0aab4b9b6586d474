// Running an external converter program. The command line comes from the
// converter table; the document path and the output path are put into the
// arguments only after the line has been split, and the program is started
// directly (no shell), so a path can never become part of a command.
#pragma once

#include <chrono>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

namespace qm {

// Splits the command line into arguments, passes each through `expand` (the
// folder placeholders), then replaces "%1" by document_path and "%2" by
// output_path in one left-to-right pass over each argument, so a path that
// itself contains "%1" or "%2" stays as it is.
std::vector<std::string> BuildConverterArguments(
    std::string_view command_line, const std::function<std::string(std::string_view)>& expand,
    std::string_view document_path, std::string_view output_path);

// Runs the program and waits for it: up to 5 starts, 1,000 ms apart, while it
// cannot be started (each failed start traced at level 2); a run is killed at
// 50,000 ms. A program that cannot be started, is killed, or ends with a
// non-zero status raises STDFUN "Error converting file. Could not execute
// converter. CMD: %S - Error Code: %i" (method "ConvertText") with the start
// error, -1 for a time-out, or the exit status.
void RunConverter(const std::vector<std::string>& arguments);

// Scales the run time-out and the pause between start attempts down for tests.
void SetConverterTimingForTesting(std::chrono::milliseconds timeout,
                                  std::chrono::milliseconds retry_pause);

}  // namespace qm
