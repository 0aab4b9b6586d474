// quillmere drop findex NAME: drops a findex with its add-ons and deleted keys.
// quillmere drop order NAME: drops an order with its column files.
#include <cstdio>
#include <string>
#include <vector>

#include "command_registry.h"
#include "host_session.h"

namespace qm::cli {
namespace {

constexpr const char* kUsage = "drop findex NAME | drop order NAME";

int RunDrop(const GlobalOptions& global, const std::vector<std::string>& args) {
  HostSession session("drop");
  if (args.size() == 1 && IsHelpFlag(args[0])) {
    std::printf(
        "usage: quillmere [GLOBAL OPTIONS] %s\n\n"
        "Drops the findex NAME of the group: its files, its add-on findexes and its\n"
        "deleted-key file; or the order NAME: its files and column files. Waits for\n"
        "builds and searches of the findex or order to end first.\n",
        kUsage);
    return kExitOk;
  }
  if (args.size() != 2 || (args[0] != "findex" && args[0] != "order")) {
    return session.Usage("expected: findex NAME or order NAME", kUsage);
  }
  if (!session.Open(global)) return kExitError;
  APICommand& command = session.Command();
  const HRESULT hr = args[0] == "order" ? command.DropOrder(session.Text(args[1]))
                                        : command.DropFindex(session.Text(args[1]));
  if (hr != S_OK) return session.Fail();
  return kExitOk;
}

const CommandRegistration kDrop{{"drop", kUsage, "drop a findex or an order", RunDrop}};

}  // namespace
}  // namespace qm::cli
