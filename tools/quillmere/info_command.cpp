// quillmere info findex NAME: every information value of a findex, one line
// each, enum-name<TAB>text.
#include <cstdio>
#include <string>
#include <utility>
#include <vector>

#include "command_registry.h"
#include "host_session.h"
#include "platform/text_encoding.h"

namespace qm::cli {
namespace {

constexpr const char* kUsage = "info findex NAME";

constexpr std::pair<const char*, idxInfoEnum> kFindexValues[] = {
    {"idxTableName", idxTableName},
    {"idxColumnNames", idxColumnNames},
    {"idxKeyName", idxKeyName},
    {"idxTypeName", idxTypeName},
    {"idxType", idxType},
    {"idxWordCount", idxWordCount},
    {"idxDistinctWordCount", idxDistinctWordCount},
    {"idxKeyCount", idxKeyCount},
    {"idxFracmentationLevel", idxFracmentationLevel},
    {"idxVersion", idxVersion},
    {"idxSQLUsedAsTable", idxSQLUsedAsTable},
    {"idxSQLSelect", idxSQLSelect},
    {"idxDBConnectionString", idxDBConnectionString},
    {"idxDBDisplayName", idxDBDisplayName},
    {"idxBuildTime", idxBuildTime},
    {"idxLastUpdateTime", idxLastUpdateTime},
    {"idxIndexMaxSize", idxIndexMaxSize},
    {"idxIndexStartValue", idxIndexStartValue},
};

void PrintHelp() {
  std::printf(
      "usage: quillmere [GLOBAL OPTIONS] %s\n\n"
      "Prints every information value of the findex NAME in the group, one line each:\n"
      "enum-name<TAB>text (idxKeyName<TAB>id). Counts include the add-on findexes.\n"
      "The stored connection string is printed as stored, password included.\n",
      kUsage);
}

int RunInfo(const GlobalOptions& global, const std::vector<std::string>& args) {
  HostSession session("info");
  if (!args.empty() && (args[0] == "--help" || args[0] == "-h")) {
    PrintHelp();
    return kExitOk;
  }
  if (args.size() != 2 || args[0] != "findex") {
    return session.Usage("expected: findex NAME", kUsage);
  }
  if (!session.Open(global)) return kExitError;
  APICommand& command = session.Command();
  if (command.SetCurrentObjectName(session.Text(args[1])) != S_OK) return session.Fail();
  std::string out;
  for (const auto& [name, value] : kFindexValues) {
    BSTR text;
    if (command.GetFindexInfo(value, &text) != S_OK) return session.Fail();
    out += std::string(name) + "\t" + Utf16ToUtf8(text) + "\n";
  }
  std::fputs(out.c_str(), stdout);
  return kExitOk;
}

const CommandRegistration kInfo{
    {"info", kUsage, "print every information value of a findex", RunInfo}};

}  // namespace
}  // namespace qm::cli
