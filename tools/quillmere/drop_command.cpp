// quillmere drop findex NAME: drops a findex with its add-ons and deleted keys.
#include <cstdio>
#include <string>
#include <vector>

#include "command_registry.h"
#include "host_session.h"

namespace qm::cli {
namespace {

constexpr const char* kUsage = "drop findex NAME";

int RunDrop(const GlobalOptions& global, const std::vector<std::string>& args) {
  HostSession session("drop");
  if (args.size() == 1 && (args[0] == "--help" || args[0] == "-h")) {
    std::printf(
        "usage: quillmere [GLOBAL OPTIONS] %s\n\n"
        "Drops the findex NAME of the group: its files, its add-on findexes and its\n"
        "deleted-key file. Waits for builds and searches of the findex to end first.\n",
        kUsage);
    return kExitOk;
  }
  if (args.size() != 2 || args[0] != "findex") {
    return session.Usage("expected: findex NAME", kUsage);
  }
  if (!session.Open(global)) return kExitError;
  if (session.Command().DropFindex(session.Text(args[1])) != S_OK) return session.Fail();
  return kExitOk;
}

const CommandRegistration kDrop{{"drop", kUsage, "drop a findex", RunDrop}};

}  // namespace
}  // namespace qm::cli
