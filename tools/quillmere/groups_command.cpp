// quillmere groups STATEMENT --order-by LIST --column C: runs a search, orders
// its result, collects the groups of equal values and prints each group's
// value of C and its number of rows.
#include <cstdio>
#include <optional>
#include <string>
#include <vector>

#include "argument_list.h"
#include "command_registry.h"
#include "host_session.h"

namespace qm::cli {
namespace {

constexpr const char* kUsage = "groups STATEMENT --order-by LIST --column C";

void PrintHelp() {
  std::printf(
      "usage: quillmere [GLOBAL OPTIONS] %s\n\n"
      "Runs the search statement, orders its result by LIST (as search --order-by:\n"
      "SCORE, KEY, ORDER.COLUMN, each ASC or DESC), collects the runs of rows with\n"
      "equal values and prints, for each distinct value of the column C (one of\n"
      "the columns of LIST) in that order, one line: value<TAB>rows.\n"
      "  quillmere groups \"SELECT id FROM books WHERE [Books='river']\" \\\n"
      "      --order-by Books.year --column Books.year\n"
      "Values are numbers as the order keeps them: integers, doubles cut to whole\n"
      "numbers, date/times as their date, year*65536 + month*256 + day, and for a\n"
      "text column the text's place (from 0) among the column's distinct texts in\n"
      "ascending order. A key without a value in the order shows 2147483647.\n"
      "Groups are of whole values, so two lines can show the same number: 8.25 and\n"
      "8.5 both show 8, two times of one day show that day.\n\n"
      "Exit status: 0 done, 1 engine error (message on standard error), 2 usage\n"
      "error.\n",
      kUsage);
}

int RunGroups(const GlobalOptions& global, const std::vector<std::string>& args) {
  HostSession session("groups");
  ArgumentList list;
  if (const std::optional<int> done =
          session.TakeArguments(args, {"--order-by", "--column"}, {}, kUsage, PrintHelp, list)) {
    return *done;
  }
  const std::string statement = list.JoinedWords();
  if (statement.empty()) return session.Usage("no statement given", kUsage);
  if (!list.Has("--order-by") || !list.Has("--column")) {
    return session.Usage("--order-by and --column are needed", kUsage);
  }
  if (!session.OpenSearch(global)) return kExitError;
  APISearch& search = session.Search();
  const BSTR* column = session.Text(*list.Last("--column"));
  int32_t groups = 0;
  if (search.Execute(session.Text(statement)) != S_OK ||
      search.OrderBy(session.Text(*list.Last("--order-by"))) != S_OK ||
      search.CollectGroups() != S_OK || search.GetTotalGroups(&groups) != S_OK) {
    return session.Fail();
  }
  std::string out;
  // MoveNext flags the end only when it moves past the last group, so every
  // group is read; the count bounds the walk all the same.
  for (int32_t g = 0; g < groups; ++g) {
    VARIANT_BOOL end = 0;
    if (search.IsEOB(&end) != S_OK) return session.Fail();
    if (end != 0) break;
    int32_t value = 0;
    int32_t count = 0;
    if (search.GetValue(column, &value) != S_OK || search.GetCount(column, &count) != S_OK) {
      return session.Fail();
    }
    // A run of a later sort column that does not close a run of C.
    if (count != 0) out += std::to_string(value) + "\t" + std::to_string(count) + "\n";
    if (search.MoveNext() != S_OK) return session.Fail();
  }
  std::fputs(out.c_str(), stdout);
  return kExitOk;
}

const CommandRegistration kGroups{
    {"groups", kUsage, "print the groups of a search's ordered result", RunGroups}};

}  // namespace
}  // namespace qm::cli
