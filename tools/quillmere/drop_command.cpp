// quillmere drop findex NAME: drops a findex with its add-ons and deleted keys.
// quillmere drop order NAME: drops an order with its column files.
#include <cstdio>
#include <string>
#include <vector>

#include "command_registry.h"
#include "host_session.h"
#include "index/findex_file_set.h"
#include "index/order_file_set.h"
#include "platform/file_io.h"
#include "terminal_text.h"

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
        "builds and searches of the findex or order to end first. Damaged files go\n"
        "too, whatever their state. Prints each file removed: removed PATH.\n",
        kUsage);
    return kExitOk;
  }
  if (args.size() != 2 || (args[0] != "findex" && args[0] != "order")) {
    return session.Usage("expected: findex NAME or order NAME", kUsage);
  }
  if (!session.Open(global)) return kExitError;
  const bool order = args[0] == "order";
  const std::string& name = args[1];
  if (!(order ? session.RequireOrder(name) : session.RequireFindex(name))) return kExitError;
  // The files there before the drop: those gone after it are what it removed.
  std::vector<std::string> before;
  try {
    before = order ? order_files::ExistingFiles(session.Defs(), name)
                   : findex::ExistingFiles(session.Defs(), name);
  } catch (const CExceptionBase& e) {
    return session.Fail(TerminalText(e));
  }
  APICommand& command = session.Command();
  const HRESULT hr = order ? command.DropOrder(session.Text(name))
                           : command.DropFindex(session.Text(name));
  if (hr != S_OK) return session.Fail();
  for (const std::string& path : before) {
    if (!platform::FileExists(path)) std::printf("removed %s\n", path.c_str());
  }
  return kExitOk;
}

const CommandRegistration kDrop{{"drop", kUsage, "drop a findex or an order", RunDrop}};

}  // namespace
}  // namespace qm::cli
