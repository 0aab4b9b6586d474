// quillmere info findex NAME | info order NAME: every information value of a
// findex or an order, one line each, enum-name<TAB>text.
#include <cstdio>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "command_registry.h"
#include "host_session.h"
#include "platform/text_encoding.h"

namespace qm::cli {
namespace {

constexpr const char* kUsage = "info findex NAME | info order NAME";

constexpr std::pair<const char*, int32_t> kFindexValues[] = {
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

constexpr std::pair<const char*, int32_t> kOrderValues[] = {
    {"odrTableName", odrTableName},
    {"odrColumnNames", odrColumnNames},
    {"odrKeyName", odrKeyName},
    {"odrTypeName", odrTypeName},
    {"odrType", odrType},
    {"odrVersion", odrVersion},
    {"odrSQLUsedAsTable", odrSQLUsedAsTable},
    {"odrSQLSelect", odrSQLSelect},
    {"odrDBConnectionString", odrDBConnectionString},
    {"odrDBDisplayName", odrDBDisplayName},
    {"odrBuildTime", odrBuildTime},
    {"odrLastUpdateTime", odrLastUpdateTime},
};

void PrintHelp() {
  std::printf(
      "usage: quillmere [GLOBAL OPTIONS] %s\n\n"
      "Prints every information value of the findex or order NAME in the group, one\n"
      "line each: enum-name<TAB>text (idxKeyName<TAB>id). Findex counts include the\n"
      "add-on findexes. The texts of an order come lower-cased, as GetOrderInfo gives\n"
      "them. The stored connection string is printed as stored, password included.\n",
      kUsage);
}

int RunInfo(const GlobalOptions& global, const std::vector<std::string>& args) {
  HostSession session("info");
  if (!args.empty() && IsHelpFlag(args[0])) {
    PrintHelp();
    return kExitOk;
  }
  if (args.size() != 2 || (args[0] != "findex" && args[0] != "order")) {
    return session.Usage("expected: findex NAME or order NAME", kUsage);
  }
  const bool order = args[0] == "order";
  if (!session.Open(global)) return kExitError;
  if (!(order ? session.RequireOrder(args[1]) : session.RequireFindex(args[1]))) return kExitError;
  APICommand& command = session.Command();
  if (command.SetCurrentObjectName(session.Text(args[1])) != S_OK) return session.Fail();
  using Values = std::span<const std::pair<const char*, int32_t>>;
  const Values values = order ? Values(kOrderValues) : Values(kFindexValues);
  std::string out;
  for (const auto& [name, value] : values) {
    BSTR text;
    const HRESULT hr =
        order ? command.GetOrderInfo(value, &text) : command.GetFindexInfo(value, &text);
    if (hr != S_OK) return session.Fail();
    out += std::string(name) + "\t" + Utf16ToUtf8(text) + "\n";
  }
  std::fputs(out.c_str(), stdout);
  return kExitOk;
}

const CommandRegistration kInfo{
    {"info", kUsage, "print every information value of a findex or an order", RunInfo}};

}  // namespace
}  // namespace qm::cli
