// quillmere validate STATEMENT: parses a search statement without searching
// and prints its condition as the engine reads it.
#include <cstdio>
#include <optional>
#include <string>
#include <vector>

#include "argument_list.h"
#include "command_registry.h"
#include "host_session.h"
#include "platform/text_encoding.h"

namespace qm::cli {
namespace {

constexpr const char* kUsage = "validate STATEMENT";

void PrintHelp() {
  std::printf(
      "usage: quillmere [GLOBAL OPTIONS] %s\n\n"
      "Parses the search statement as a search would, without searching, and prints\n"
      "its condition as the engine reads it: words in upper case as they will be\n"
      "looked up, each condition in quotes, AND and OR in parentheses, phrases as\n"
      "their words in a row, and every NOT in the form it is evaluated:\n"
      "  quillmere validate \"SELECT id FROM t WHERE [Books='red wine' OR Books='beer']\"\n"
      "  'RED WINE' OR 'BEER'\n"
      "The findexes named must exist: their separators and language decide how the\n"
      "values are cut. Several arguments are joined with blanks into one statement.\n\n"
      "Exit status: 0 the statement parses, 1 it does not (the reason on standard\n"
      "error), 2 usage error.\n",
      kUsage);
}

int RunValidate(const GlobalOptions& global, const std::vector<std::string>& args) {
  HostSession session("validate");
  ArgumentList list;
  if (const std::optional<int> done =
          session.TakeArguments(args, {}, {}, kUsage, PrintHelp, list)) {
    return *done;
  }
  const std::string statement = list.JoinedWords();
  if (statement.empty()) return session.Usage("no statement given", kUsage);
  if (!session.OpenSearch(global)) return kExitError;
  BSTR tree;
  if (session.Search().ValidateStatement(session.Text(statement), &tree) != S_OK) {
    return session.Fail();
  }
  std::printf("%s\n", Utf16ToUtf8(tree).c_str());
  return kExitOk;
}

const CommandRegistration kValidate{
    {"validate", kUsage, "parse a search statement and print its condition", RunValidate}};

}  // namespace
}  // namespace qm::cli
