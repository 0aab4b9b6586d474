// Runs an external converter program and waits for it.
#pragma once

#include <chrono>
#include <functional>
#include <string>
#include <string_view>

namespace qm {

inline constexpr std::chrono::milliseconds kConverterTimeout{50000};

// Fills one argument of a command line (folder placeholders, "%1", "%2", ...).
using ArgumentFiller = std::function<std::string(std::string_view argument)>;

// Splits command_line into arguments first and only then passes each through
// fill, so a value put in can never become part of the command. The program is
// started directly (no shell). Up to 5 attempts when the program cannot be
// started, 1,000 ms apart; a program that ends with a non-zero status or is
// killed at the time-out fails at once, as does an empty command line.
void ConvertText(std::string_view command_line, const ArgumentFiller& fill = {});

// Test hook: the time a converter may run (kConverterTimeout restores it).
void SetConverterTimeoutForTesting(std::chrono::milliseconds timeout);

}  // namespace qm
