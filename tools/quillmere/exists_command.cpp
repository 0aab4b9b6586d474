// quillmere exists NAME: whether a findex opens in the group.
#include <cstdio>
#include <string>
#include <vector>

#include "command_registry.h"
#include "host_session.h"

namespace qm::cli {
namespace {

constexpr const char* kUsage = "exists NAME";

int RunExists(const GlobalOptions& global, const std::vector<std::string>& args) {
  HostSession session("exists");
  if (args.size() == 1 && IsHelpFlag(args[0])) {
    std::printf(
        "usage: quillmere [GLOBAL OPTIONS] %s\n\n"
        "Prints \"yes\" when the findex NAME opens in the group (--group, default PUBLIC),\n"
        "\"no\" otherwise.\n\n"
        "Exit status: 0 yes, 3 no, 1 engine error, 2 usage error.\n",
        kUsage);
    return kExitOk;
  }
  if (args.size() != 1) return session.Usage("expected one findex name", kUsage);
  if (!session.Open(global)) return kExitError;
  VARIANT_BOOL exists = VARIANT_FALSE;
  const std::string group = global.group.empty() ? "PUBLIC" : global.group;
  if (session.Command().FindexExist(session.Text(args[0]), session.Text(group), &exists) != S_OK) {
    return session.Fail();
  }
  std::puts(exists == VARIANT_TRUE ? "yes" : "no");
  return exists == VARIANT_TRUE ? kExitOk : kExitNo;
}

const CommandRegistration kExists{
    {"exists", kUsage, "tell whether a findex exists in the group", RunExists}};

}  // namespace
}  // namespace qm::cli
