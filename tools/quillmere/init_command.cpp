// quillmere init: lays out the data-directory tree of one group, every folder
// below the data root that the engine uses, and copies the shipped language
// data into its Language folder. Existing folders and files are kept.
#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <string>
#include <vector>

#include "command_registry.h"
#include "platform/file_io.h"
#include "base/exception.h"
#include "config/global_defs.h"
#include "base/shipped_data.h"
#include "terminal_text.h"

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
               "Copies the shipped language data into Language/, but only the files that\n"
               "are missing there: a file that exists is never overwritten, so changes made\n"
               "to stop.txt, lang.txt, 1.dat or the character tables stay; each kept file\n"
               "that differs from the shipped one is named on standard error. To take a\n"
               "shipped file again, delete it and run init once more.\n"
               "Prints each folder of the tree, one a line.\n",
               kUsage);
}

// Copies path's bytes to a new file target; false with error set on failure.
// A target that appears meanwhile is left alone, a half-written one removed.
bool CopyNewFile(const std::string& path, const std::string& target, std::string& error) {
  std::string bytes;
  if (!platform::ReadWholeFile(path, bytes)) {
    error = "cannot read " + path + ": " + std::strerror(errno);
    return false;
  }
  platform::FileHandle file = platform::OpenFileAs(target, platform::FileAccess::Write,
                                                   platform::FileDisposition::CreateNew);
  if (!file.IsOpen()) {
    if (errno == EEXIST) return true;
    error = "cannot create " + target + ": " + std::strerror(errno);
    return false;
  }
  if (platform::WriteAll(file.Get(), bytes.data(), bytes.size()) && file.Close() == 0) return true;
  error = "cannot write " + target + ": " + std::strerror(errno);
  file.Close();
  platform::UnlinkFile(target);
  return false;
}

// Copies the files of the source tree that target lacks, creating its
// folders; adds each folder of the copied tree to folders and each existing
// file that differs from its source to kept.
bool CopyMissingFiles(const std::string& source, const std::string& target,
                      std::vector<std::string>& folders, std::vector<std::string>& kept,
                      std::string& error) {
  namespace fs = std::filesystem;
  std::error_code ec;
  std::vector<fs::path> entries;
  for (fs::recursive_directory_iterator it(source, ec), end; !ec && it != end; it.increment(ec)) {
    entries.push_back(it->path());
  }
  if (ec) {
    error = "cannot read " + source + ": " + ec.message();
    return false;
  }
  // Parents before their contents, and the same listing on every run.
  std::sort(entries.begin(), entries.end());
  for (const fs::path& entry : entries) {
    const std::string relative = entry.lexically_relative(source).string();
    const std::string path = entry.string();
    if (platform::IsDirectory(path)) {
      const std::string folder = target + relative + "/";
      if (const int e = platform::MakeDirectories(folder); e != 0) {
        error = "cannot create folder " + folder + ": " + std::strerror(e);
        return false;
      }
      folders.push_back(folder);
      continue;
    }
    const std::string file = target + relative;
    if (platform::FileExists(file) || platform::IsDirectory(file)) {
      std::string mine;
      std::string shipped;
      if (!platform::ReadWholeFile(file, mine) || !platform::ReadWholeFile(path, shipped) ||
          mine != shipped) {
        kept.push_back(file);
      }
      continue;
    }
    if (!CopyNewFile(path, file, error)) return false;
  }
  return true;
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
    if (IsHelpFlag(a)) {
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
  std::string language_folder;
  try {
    language_folder = defs.GetFolder(FolderKind::Language);
    for (FolderKind kind : kDataFolderKinds) {
      std::string folder = defs.GetFolder(kind);
      if (folders.empty() || folders.back() != folder) folders.push_back(std::move(folder));
    }
  } catch (CExceptionBase& e) {
    std::fprintf(stderr, "quillmere init: %s", TerminalText(e).c_str());
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

  const std::string shipped = ShippedDataFolder("Language/") + "Language/";
  if (!platform::IsDirectory(shipped)) {
    std::fprintf(stderr, "quillmere init: no shipped language data in %s\n", shipped.c_str());
    return kExitError;
  }
  std::vector<std::string> language_folders;
  std::vector<std::string> kept;
  std::string error;
  const bool copied =
      CopyMissingFiles(shipped, language_folder, language_folders, kept, error);
  for (const auto& folder : language_folders) std::printf("%s\n", folder.c_str());
  for (const auto& file : kept) {
    std::fprintf(stderr, "quillmere init: kept %s (it differs from the shipped file)\n",
                 file.c_str());
  }
  if (!copied) {
    std::fprintf(stderr, "quillmere init: %s\n", error.c_str());
    return kExitError;
  }
  return kExitOk;
}

const CommandRegistration kInit{
    {"init", kUsage, "lay out the data-directory tree of one group", RunInit}};

}  // namespace
}  // namespace qm::cli
