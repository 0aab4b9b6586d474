// quillmere: the command-line host of the engine.
#include <algorithm>
#include <cstdio>
#include <string>
#include <vector>

#include "command_registry.h"
#include "config/global_defs.h"

namespace qm::cli {

std::vector<Command>& Commands() {
  static std::vector<Command> commands;
  return commands;
}

namespace {

void PrintHelp(std::FILE* out) {
  std::fputs(
      "usage: quillmere --version\n"
      "       quillmere [--data DIR] [--group NAME]\n"
      "                 [--connect \"CONNECTION STRING\" | --dsn DSN [--user U] [--password P]]\n"
      "                 COMMAND [ARGS]\n\ncommands:\n",
      out);
  auto commands = Commands();
  std::sort(commands.begin(), commands.end(),
            [](const Command& a, const Command& b) { return a.name < b.name; });
  for (const auto& c : commands) std::fprintf(out, "  %-40s %s\n", c.usage.c_str(), c.summary.c_str());
}

bool TakeValue(const std::vector<std::string>& args, std::size_t& i, std::string& out) {
  if (i + 1 >= args.size()) {
    std::fprintf(stderr, "quillmere: %s needs a value\n", args[i].c_str());
    return false;
  }
  out = args[++i];
  return true;
}

}  // namespace
}  // namespace qm::cli

int main(int argc, char** argv) {
  using namespace qm::cli;
  std::vector<std::string> args(argv + 1, argv + argc);
  GlobalOptions options;
  std::size_t i = 0;
  for (; i < args.size(); ++i) {
    const std::string& a = args[i];
    std::string* target = a == "--data"       ? &options.data_dir
                          : a == "--group"    ? &options.group
                          : a == "--connect"  ? &options.connect
                          : a == "--dsn"      ? &options.dsn
                          : a == "--user"     ? &options.user
                          : a == "--password" ? &options.password
                                              : nullptr;
    if (IsHelpFlag(a)) {
      PrintHelp(stdout);
      return kExitOk;
    }
    if (a == "--version") {
      std::printf("quillmere %s\nfindex format %d\n", qm::CGlobalDefs::kVersionText,
                  qm::CGlobalDefs::kVersion);
      return kExitOk;
    }
    if (target == nullptr) break;
    if (!TakeValue(args, i, *target)) return kExitUsage;
  }
  if (i >= args.size()) {
    PrintHelp(stderr);
    return kExitUsage;
  }
  const std::string name = args[i];
  const std::vector<std::string> rest(args.begin() + static_cast<long>(i) + 1, args.end());
  for (const auto& c : Commands()) {
    if (c.name == name) return c.run(options, rest);
  }
  std::fprintf(stderr, "quillmere: unknown command: %s (see quillmere --help)\n", name.c_str());
  return kExitUsage;
}
