// quillmere init: lays out the data-directory tree of one group, every folder
// below the data root that the engine uses. Existing folders are kept.
#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "command_registry.h"
#include "platform/file_io.h"
#include "shared/exception.h"
#include "shared/global_defs.h"

namespace qm::cli {
namespace {

constexpr const char* kUsage = "init [--data DIR] [--group NAME]";

void PrintHelp(std::FILE* out) {
  std::fprintf(out,
               "usage: quillmere %s\n\n"
               "Creates the folders of a data directory for one group (default PUBLIC):\n"
               "Language/, Converters/ and Groups/NAME/ with Indexes/, Orders/, Config/,\n"
               "Repositories/, Definitions/, Queries/, WorkData/ and DataStore/.\n"
               "The data directory is --data DIR, else the configured \"path\".\n"
               "Prints each folder of the tree, one a line.\n",
               kUsage);
}

int UsageError(const std::string& what) {
  std::fprintf(stderr, "quillmere init: %s\nusage: quillmere %s\n", what.c_str(), kUsage);
  return kExitUsage;
}

int RunInit(const GlobalOptions& global, const std::vector<std::string>& args) {
  std::string data_dir = global.data_dir;
  std::string group = global.group.empty() ? "PUBLIC" : global.group;
  for (std::size_t i = 0; i < args.size(); ++i) {
    const std::string& a = args[i];
    if (a == "--help" || a == "-h") {
      PrintHelp(stdout);
      return kExitOk;
    }
    if (a != "--data" && a != "--group") return UsageError("unknown argument: " + a);
    if (i + 1 >= args.size()) return UsageError(a + " needs a value");
    (a == "--data" ? data_dir : group) = args[++i];
  }

  CGlobalDefs defs;
  if (!data_dir.empty()) defs.SetDataPath(data_dir);
  defs.SetGroup(group);
  std::vector<std::string> folders;
  try {
    for (FolderKind kind : kDataFolderKinds) {
      std::string folder = defs.GetFolder(kind);
      if (folders.empty() || folders.back() != folder) folders.push_back(std::move(folder));
    }
  } catch (CExceptionBase& e) {
    // The chain's lines end in "\r\n"; a terminal wants "\n".
    std::string text = e.GetFullTextUtf8(100);
    for (auto at = text.find("\r\n"); at != std::string::npos; at = text.find("\r\n", at)) {
      text.erase(at, 1);
    }
    std::fprintf(stderr, "quillmere init: %s", text.c_str());
    return kExitError;
  }
  for (const auto& folder : folders) {
    if (const int error = platform::MakeDirectories(folder); error != 0) {
      std::fprintf(stderr, "quillmere init: cannot create folder %s: %s\n", folder.c_str(),
                   std::strerror(error));
      return kExitError;
    }
    std::printf("%s\n", folder.c_str());
  }
  // The shipped language data (data/Language) is copied into the Language
  // folder at this point once that data exists.
  return kExitOk;
}

const CommandRegistration kInit{
    {"init", kUsage, "lay out the data-directory tree of one group", RunInit}};

}  // namespace
}  // namespace qm::cli
