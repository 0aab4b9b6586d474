// quillmere typelib: prints the type library (both interfaces, their methods
// and parameters, the enumerations and the registration) as JSON, the text
// installed as quillmere-api.json.
#include <cstdio>
#include <string>
#include <vector>

#include "api/type_library.h"
#include "command_registry.h"

namespace qm::cli {
namespace {

constexpr const char* kUsage = "typelib";

int RunTypelib(const GlobalOptions&, const std::vector<std::string>& args) {
  if (!args.empty() && IsHelpFlag(args.front())) {
    std::printf(
        "usage: quillmere %s\n\n"
        "Prints the type library as JSON: the classes with their ProgIDs and\n"
        "identifiers, the methods of IAPISearch and IAPICommand with their dispatch\n"
        "identifiers and parameters (name, type, direction), and the enumerations.\n"
        "data/quillmere-api.json is this output.\n",
        kUsage);
    return kExitOk;
  }
  if (!args.empty()) {
    std::fprintf(stderr, "quillmere typelib: takes no arguments\nusage: quillmere %s\n", kUsage);
    return kExitUsage;
  }
  std::fputs(TypeLibraryJson().c_str(), stdout);
  return kExitOk;
}

const CommandRegistration kTypelib{
    {"typelib", kUsage, "print the type library (quillmere-api.json)", RunTypelib}};

}  // namespace
}  // namespace qm::cli
