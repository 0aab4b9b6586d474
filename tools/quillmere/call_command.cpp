// quillmere call OBJECT METHOD [ARG]...: one method of a new API object,
// called only through the C interface, the way a C program or a script calls
// it.
#include <cstdio>
#include <optional>
#include <string>
#include <vector>

#include "command_registry.h"
#include "dispatch_object.h"
#include "host_session.h"

namespace qm::cli {
namespace {

constexpr const char* kUsage = "call OBJECT METHOD [ARG]...";

void PrintHelp() {
  std::printf(
      "usage: quillmere [GLOBAL OPTIONS] %s\n"
      "       quillmere call OBJECT --help\n\n"
      "Calls one method of a new API object through the C interface (quillmere.h),\n"
      "as a C program or a script would, and prints what it returns.\n\n"
      "OBJECT  APICommand, APISearch, or a ProgID (\"QuillmereAPI.APISearch.1\", ...)\n"
      "METHOD  a method name, in any case; \"quillmere call OBJECT --help\" lists them\n"
      "ARG     one for each parameter, converted by the parameter's type:\n"
      "          integer  a decimal number from -2147483648 to 2147483647\n"
      "          number   a decimal number (12, 0.5, 1e3)\n"
      "          boolean  true (-1) or false (0), in any case, or a number from -32768\n"
      "                   to 32767 that passes as given: 1 is not true (ExecuteEx\n"
      "                   blocks, or adds to a result set, only for -1 or true)\n"
      "          text     the argument as it is (UTF-8); the word null gives the\n"
      "                   null text\n\n"
      "The object starts empty: --data and --group are applied through its\n"
      "SetDataPath and SetGroup, and --connect or --dsn through\n"
      "SetDBConnectionStringEx (command object only). The group's saved default\n"
      "options are not loaded; LoadDefaultIndexOptions does that (see quillmere repl\n"
      "to make several calls on one object).\n\n"
      "Prints the method's result, if it has one, on one line: integers and numbers\n"
      "as numbers, booleans as true (-1), false (0) or, for any other value, the\n"
      "number; texts as they are. A method without a result prints nothing.\n\n"
      "Exit status: 0 done, 1 the method failed or refused (its error description on\n"
      "standard error), 2 usage error (unknown object or method, wrong number of\n"
      "arguments, an argument that does not convert).\n",
      kUsage);
}

int PrintMethods(HostSession& session, const std::string& name) {
  std::string error;
  const std::optional<DispatchObject> object = DispatchObject::Create(name, error);
  if (!object) return session.Usage(error, kUsage);
  std::printf("methods of %s, by dispatch identifier:\n", object->ProgId().c_str());
  int dispid = 0;
  for (const std::string& line : object->MethodLines()) std::printf("%3d  %s\n", ++dispid, line.c_str());
  return kExitOk;
}

int RunCall(const GlobalOptions& global, const std::vector<std::string>& args) {
  HostSession session("call");
  if (!args.empty() && IsHelpFlag(args[0])) {
    PrintHelp();
    return kExitOk;
  }
  if (args.size() >= 2 && IsHelpFlag(args[1])) return PrintMethods(session, args[0]);
  if (args.size() < 2) return session.Usage("expected an object and a method", kUsage);

  std::string error;
  std::optional<DispatchObject> object = DispatchObject::Create(args[0], error);
  if (!object) return session.Usage(error, kUsage);
  if (!object->Apply(global, error)) return session.Fail(error);

  std::vector<CallArgument> arguments;
  for (std::size_t i = 2; i < args.size(); ++i) arguments.push_back({args[i], args[i] == "null"});
  const CallOutcome outcome = object->Call(args[1], arguments);
  switch (outcome.status) {
    case CallOutcome::Status::Usage: return session.Usage(outcome.error, kUsage);
    case CallOutcome::Status::Failed: return session.Fail(outcome.error);
    case CallOutcome::Status::Done: break;
  }
  if (outcome.has_result) {
    const std::string text = ValueText(outcome.result) + "\n";
    std::fwrite(text.data(), 1, text.size(), stdout);
  }
  return kExitOk;
}

const CommandRegistration kCall{
    {"call", kUsage, "call one method of an API object through the C interface", RunCall}};

}  // namespace
}  // namespace qm::cli
