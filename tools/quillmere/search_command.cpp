// quillmere search STATEMENT: runs a search statement through the search
// object and prints its total and keys, its SQL, its key file or the rows it
// found.
#include <cstdio>
#include <optional>
#include <string>
#include <vector>

#include "argument_list.h"
#include "command_registry.h"
#include "host_session.h"
#include "platform/text_encoding.h"
#include "search_rows.h"

namespace qm::cli {
namespace {

constexpr const char* kUsage =
    "search STATEMENT [--start N] [--count N] [--order-by LIST] [--option NAME=VALUE]... "
    "[--total | --keys | --sql | --key-file | --rows]";

void PrintHelp() {
  std::printf(
      "usage: quillmere [GLOBAL OPTIONS] %s\n\n"
      "Runs a search statement: the SQL SELECT of your database with the full-text\n"
      "condition in brackets (docs/search_language.md):\n"
      "  quillmere search \"SELECT id,name FROM packages WHERE [Packages='editor']\"\n"
      "Several arguments are joined with blanks into one statement.\n\n"
      "Then, in this order: each --option NAME=VALUE sets a numeric option of the\n"
      "result (SCORE_RETURN=2: scores as percentages of the highest one;\n"
      "SCORE_GROUP_COUNT=N: at most N keys per score; names are case-sensitive);\n"
      "--order-by orders the result (SCORE, KEY, ORDER.COLUMN, each ASC or DESC, or\n"
      "REVERSE) and adds the order clause to the SQL; --start and --count set the\n"
      "window of rows that keys, SQL, key file and rows cover (from row 1, every row\n"
      "by default).\n\n"
      "Prints, by default, the total of rows found on one line, then the key string:\n"
      "  (12,17,5)  or, ordered by score,  80;(12,17);40;(5);\n"
      "--total      the total only\n"
      "--keys       the key string only\n"
      "--sql        the statement's SQL with the keys of the window in place of the\n"
      "             condition (one SELECT per score joined by UNION ALL when ordered\n"
      "             by score), and the order clause\n"
      "--key-file   the name of the file the keys were written to, one a line\n"
      "             (score,key while ordered by score)\n"
      "--rows       the rows themselves: that SQL run on the data source, under a\n"
      "             line of column names; columns aligned on a terminal, separated\n"
      "             by tabs otherwise; a tab, line end or backslash in a value shows\n"
      "             as \\t, \\n, \\r or \\\\. The data source is --connect or --dsn when\n"
      "             given, else the connection the first findex of the statement was\n"
      "             built with. Once the search is ordered (--order-by, or ORDER BY\n"
      "             inside the brackets) and the key column is among the columns,\n"
      "             the rows come in the search's order, ties included; otherwise\n"
      "             as the SQL orders them.\n\n"
      "Exit status: 0 done, 1 the search failed (message on standard error),\n"
      "2 usage error.\n",
      kUsage);
}

enum class Output { TotalAndKeys, Total, Keys, Sql, KeyFile, Rows };

struct NumericOption {
  std::string name;
  int32_t value = 0;
};

int RunSearch(const GlobalOptions& global, const std::vector<std::string>& args) {
  HostSession session("search");
  ArgumentList list;
  if (const std::optional<int> done = session.TakeArguments(
          args, {"--start", "--count", "--order-by", "--option"},
          {"--total", "--keys", "--sql", "--key-file", "--rows"}, kUsage, PrintHelp, list)) {
    return *done;
  }

  Output output = Output::TotalAndKeys;
  std::optional<int32_t> start;
  std::optional<int32_t> count;
  std::vector<NumericOption> numeric;
  for (const auto& [name, value] : list.options) {
    if (name == "--start" || name == "--count") {
      const std::optional<int32_t> n = WholeNumber(value, name == "--start" ? 1 : 0);
      if (!n) {
        return session.Usage(name + " takes a number of " + (name == "--start" ? "1" : "0") +
                                 " or more: " + value,
                             kUsage);
      }
      (name == "--start" ? start : count) = n;
    } else if (name == "--option") {
      const auto equals = value.find('=');
      const std::optional<int32_t> n =
          equals == std::string::npos ? std::nullopt
                                      : WholeNumber(value.substr(equals + 1), INT32_MIN);
      if (equals == 0 || !n) return session.Usage("--option takes NAME=NUMBER: " + value, kUsage);
      numeric.push_back({value.substr(0, equals), *n});
    } else if (name != "--order-by") {
      if (output != Output::TotalAndKeys) {
        return session.Usage("--total, --keys, --sql, --key-file and --rows exclude each other",
                             kUsage);
      }
      output = name == "--total"  ? Output::Total
               : name == "--keys" ? Output::Keys
               : name == "--sql"  ? Output::Sql
               : name == "--rows" ? Output::Rows
                                  : Output::KeyFile;
    }
  }
  const std::string statement = list.JoinedWords();
  if (statement.empty()) return session.Usage("no statement given", kUsage);
  const std::optional<std::string> order_by = list.Last("--order-by");

  if (!session.OpenSearch(global)) return kExitError;
  APISearch& search = session.Search();
  if (search.Execute(session.Text(statement)) != S_OK) return session.Fail();
  for (const NumericOption& option : numeric) {
    if (search.SetNumericOption(session.Text(option.name), option.value) != S_OK) {
      return session.Fail();
    }
  }
  if (order_by && search.OrderBy(session.Text(*order_by)) != S_OK) return session.Fail();
  int32_t total = 0;
  if (search.GetTotal(&total) != S_OK) return session.Fail();
  // Without --count the window runs to the last row.
  if ((start || count) && search.SetLimits(start.value_or(1), count.value_or(total)) != S_OK) {
    return session.Fail();
  }

  BSTR text;
  switch (output) {
    case Output::Total:
      std::printf("%d\n", total);
      return kExitOk;
    case Output::TotalAndKeys:
    case Output::Keys:
      if (search.GetRawKeyString(0, 0, &text) != S_OK) return session.Fail();
      if (output == Output::TotalAndKeys) std::printf("%d\n", total);
      break;
    case Output::Sql:
      if (search.GetSql(0, 0, &text) != S_OK) return session.Fail();
      break;
    case Output::KeyFile:
      if (search.GetRawKeyFile(0, 0, &text) != S_OK) return session.Fail();
      break;
    case Output::Rows:
      return PrintSearchRows(session, global, statement, order_by.has_value());
  }
  std::printf("%s\n", Utf16ToUtf8(text).c_str());
  return kExitOk;
}

const CommandRegistration kSearch{
    {"search", kUsage, "run a search statement: total, keys, SQL, key file or rows", RunSearch}};

}  // namespace
}  // namespace qm::cli
