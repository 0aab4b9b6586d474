// Subcommands of the quillmere host register themselves here, one file each.
#pragma once

#include <functional>
#include <string>
#include <string_view>
#include <vector>

namespace qm::cli {

// Options that come before the subcommand.
struct GlobalOptions {
  std::string data_dir;  // --data DIR
  std::string group;     // --group NAME
  std::string connect;   // --connect "CONNECTION STRING"
  std::string dsn;       // --dsn DSN
  std::string user;      // --user U
  std::string password;  // --password P
};

// Exit statuses: 0 success, 1 an engine error, 2 a usage error, 3 a "no"
// for scripts (exists: no such findex; check: damage found).
inline constexpr int kExitOk = 0;
inline constexpr int kExitError = 1;
inline constexpr int kExitUsage = 2;
inline constexpr int kExitNo = 3;

// "--help" or "-h".
inline bool IsHelpFlag(std::string_view arg) { return arg == "--help" || arg == "-h"; }

struct Command {
  std::string name;
  std::string usage;    // one line: "translate STATEMENT"
  std::string summary;  // one line
  std::function<int(const GlobalOptions&, const std::vector<std::string>& args)> run;
};

std::vector<Command>& Commands();

struct CommandRegistration {
  explicit CommandRegistration(Command command) { Commands().push_back(std::move(command)); }
};

}  // namespace qm::cli
