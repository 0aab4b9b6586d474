// The API object of one host invocation, set up from the global options: the
// command object with data path, group, data-source connection and the
// group's saved default options, or the search object with data path and
// group.
#pragma once

#include <deque>
#include <initializer_list>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "argument_list.h"
#include "command_registry.h"
#include "config/global_defs.h"
#include "quillmere/api_command.h"
#include "quillmere/api_search.h"

namespace qm::cli {

class HostSession {
 public:
  // name: the subcommand, for messages ("quillmere NAME: ...").
  explicit HostSession(std::string name) : name_(std::move(name)) {}

  // Creates the object and applies the options; false after printing the
  // error.
  bool Open(const GlobalOptions& options);
  APICommand& Command() { return *command_; }
  // The same for the search object; the connection options are the
  // caller's (a search reads no data source).
  bool OpenSearch(const GlobalOptions& options);
  APISearch& Search() { return *search_; }

  // A text argument that stays valid for the session.
  const BSTR* Text(std::string_view utf8);

  // The settings of the invocation (data path, group) for the host's own
  // look at the files; valid after Open.
  CGlobalDefs& Defs() { return defs_; }
  // The group in force, as messages name it.
  std::string Group() const;

  // Whether any file of the findex (order) is in the group. When none is,
  // prints "no findex NAME in group GROUP" and returns false: the engine's
  // message would name a file where the user named an object.
  bool RequireFindex(std::string_view name);
  bool RequireOrder(std::string_view name);

  // Prints the calling thread's error information to standard error and
  // returns kExitError.
  int Fail();
  // Prints "quillmere NAME: text" to standard error and returns kExitError.
  int Fail(std::string text);
  // Prints "quillmere NAME: message" to standard error and returns kExitUsage.
  int Usage(std::string_view message, std::string_view usage);
  // Splits args into list (SplitArguments). Returns the exit status when the
  // command ends here: kExitOk after print_help for --help, kExitUsage after
  // the usage error; nothing when it goes on.
  std::optional<int> TakeArguments(const std::vector<std::string>& args,
                                   std::initializer_list<std::string_view> with_value,
                                   std::initializer_list<std::string_view> flags,
                                   std::string_view usage, void (*print_help)(),
                                   ArgumentList& list);

 private:
  bool Require(bool there, std::string_view what, std::string_view name);
  // Data path and group of the host's own settings.
  bool SetUpDefs(const GlobalOptions& options);

  std::string name_;
  std::string group_;
  CGlobalDefs defs_;
  std::unique_ptr<APICommand> command_;
  std::unique_ptr<APISearch> search_;
  std::deque<BSTR> texts_;
};

// A connection string naming a DSN triple, values braced where they need it.
std::string DsnConnectionString(std::string_view dsn, std::string_view user,
                                std::string_view password);

}  // namespace qm::cli
