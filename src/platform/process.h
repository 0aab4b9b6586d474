// Starting external programs without a shell.
#pragma once

#include <chrono>
#include <string>
#include <string_view>
#include <vector>

namespace qm::platform {

// Splits a command line with the usual rules: blanks separate arguments,
// double quotes group, backslash + double quote is a literal quote.
std::vector<std::string> SplitCommandLine(std::string_view command_line);

struct ProcessResult {
  bool started = false;   // false: the program could not be started
  int start_error = 0;    // errno of a failed start
  bool timed_out = false; // killed (and reaped) at the time-out
  int exit_status = -1;   // exit status, or -1 when killed or ended by a signal
};

// Runs argv[0] with the arguments, directly (fork/exec), and waits at most
// timeout; a program still running then is killed and reaped.
ProcessResult RunProcess(const std::vector<std::string>& argv, std::chrono::milliseconds timeout);

}  // namespace qm::platform
