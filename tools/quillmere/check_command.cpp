// quillmere check findex|order NAME [--repair]: walks the files of a findex
// (with its add-ons and deleted keys) or an order and reports each problem
// with its place.
#include <cstdio>
#include <string>
#include <vector>

#include "command_registry.h"
#include "host_session.h"
#include "index/findex_file_set.h"
#include "index/findex_files.h"
#include "index/order_check.h"
#include "index/order_file_set.h"
#include "platform/text_encoding.h"
#include "search/findex_check.h"
#include "terminal_text.h"

namespace qm::cli {
namespace {

constexpr const char* kUsage = "check findex NAME [--repair] | check order NAME [--repair]";

void PrintHelp() {
  std::printf(
      "usage: quillmere [GLOBAL OPTIONS] %s\n\n"
      "Walks every file of the findex NAME (its word tree level by level, the leaf\n"
      "chain, each posting list against the .fst, the add-on findexes and the\n"
      "deleted-key list) or of the order NAME (its header, its rows and its column\n"
      "files) and prints each problem found, one a line, with its place:\n"
      "  BOOKS.sdx block 7 (leaf): links back to block 3, but follows block 5\n"
      "then one line: \"findex BOOKS is sound\" or \"findex BOOKS is damaged: N problems\".\n\n"
      "--repair removes the temporary files that killed builds left in the group's\n"
      "Indexes and Orders folders (files no running build holds), printing each, and\n"
      "tells how to rebuild a damaged findex or order: files are never patched.\n\n"
      "Exit status: 0 sound, 3 damaged, 1 engine error (no such findex or order\n"
      "included), 2 usage error.\n",
      kUsage);
}

// How to get a sound findex or order back: from the stored definition when the
// header still reads, else from the definition the user still has.
void PrintRebuild(HostSession& session, bool order, const std::string& name) {
  const std::string kind = order ? "ORDER" : "FINDEX";
  const std::string upper = ToUpper(name);
  bool header_reads = true;
  try {
    if (order) {
      order_files::ReadInfoShared(session.Defs(), name);
    } else {
      ReadStoredDefinition(session.Defs(), name);
    }
  } catch (const CExceptionBase&) {
    header_reads = false;
  }
  if (header_reads) {
    std::printf(
        "to repair: rebuild it from its stored definition (add --connect when the\n"
        "connection was not saved with it):\n"
        "  quillmere exec \"UPDATE %s %s REBUILD\"\n",
        kind.c_str(), upper.c_str());
  } else {
    std::printf(
        "to repair: its header is lost with its definition; drop it and create it again:\n"
        "  quillmere drop %s %s\n"
        "  quillmere --connect \"...\" exec \"CREATE %s %s ON TABLE ... COLUMNS ... KEY ...\"\n",
        order ? "order" : "findex", upper.c_str(), kind.c_str(), upper.c_str());
  }
}

int RunCheck(const GlobalOptions& global, const std::vector<std::string>& args) {
  HostSession session("check");
  if (!args.empty() && IsHelpFlag(args[0])) {
    PrintHelp();
    return kExitOk;
  }
  const bool repair = args.size() == 3 && args[2] == "--repair";
  if ((args.size() != 2 && !repair) || (args[0] != "findex" && args[0] != "order")) {
    return session.Usage("expected: findex NAME or order NAME, then --repair or nothing", kUsage);
  }
  const bool order = args[0] == "order";
  const std::string& name = args[1];
  if (!session.Open(global)) return kExitError;
  std::vector<std::string> problems;
  try {
    if (repair) {
      std::vector<std::string> removed = findex::RemoveOrphanedTempFiles(session.Defs());
      for (const std::string& path : order_files::RemoveOrphanedTempFiles(session.Defs())) {
        removed.push_back(path);
      }
      for (const std::string& path : removed) std::printf("removed %s\n", path.c_str());
    }
    if (!(order ? session.RequireOrder(name) : session.RequireFindex(name))) return kExitError;
    problems = order ? CheckOrderFiles(session.Defs(), name)
                     : CheckFindexFiles(session.Defs(), name);
  } catch (const CExceptionBase& e) {
    return session.Fail(TerminalText(e));
  }
  std::string out;
  for (const std::string& problem : problems) out += problem + "\n";
  std::fputs(out.c_str(), stdout);
  const std::string what = std::string(order ? "order " : "findex ") + ToUpper(name);
  if (problems.empty()) {
    std::printf("%s is sound\n", what.c_str());
    return kExitOk;
  }
  std::printf("%s is damaged: %zu problem%s\n", what.c_str(), problems.size(),
              problems.size() == 1 ? "" : "s");
  if (repair) PrintRebuild(session, order, name);
  return kExitNo;
}

const CommandRegistration kCheck{
    {"check", kUsage, "walk a findex or an order and report damage", RunCheck}};

}  // namespace
}  // namespace qm::cli
