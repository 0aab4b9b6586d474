// quillmere list: every findex and order of the group, one line each, with
// its counts, size on disk and times.
#include <cstdio>
#include <string>
#include <vector>

#include "base/sql_time.h"
#include "command/findex_information.h"
#include "command_registry.h"
#include "config/temp_file_sweep.h"
#include "format/bfile.h"
#include "format/findex_tree.h"
#include "format/order_info.h"
#include "host_session.h"
#include "index/deleted_keys.h"
#include "index/findex_file_set.h"
#include "index/findex_files.h"
#include "index/order_file_set.h"
#include "platform/file_io.h"
#include "platform/terminal.h"
#include "table_text.h"
#include "terminal_text.h"

namespace qm::cli {
namespace {

constexpr const char* kUsage = "list";
constexpr const char* kDamaged = "damaged";

using Row = TableRow;

const Row kHeading{"NAME",    "KIND",    "TYPE",   "KEYS",  "WORDS",
                   "ADD-ONS", "DELETED", "BYTES",  "BUILT", "UPDATED"};

void PrintHelp() {
  std::printf(
      "usage: quillmere [GLOBAL OPTIONS] %s\n\n"
      "Lists every findex and order of the group (--group, default PUBLIC), one line\n"
      "each: name, kind (findex or order), type, keys, words, add-on findexes,\n"
      "deleted keys, bytes on disk (all its files), build time and last update time.\n"
      "Counts of a findex include its add-ons; \"-\" marks what an order does not have.\n"
      "A findex or order whose header does not read shows \"damaged\" (see quillmere\n"
      "check). Columns are aligned on a terminal and separated by tabs otherwise, with\n"
      "a first line of column names.\n",
      kUsage);
}

// The names of the group's findexes (or orders): the stems of their files,
// without add-ons and temporaries.
std::vector<std::string> Names(const std::string& folder, const std::vector<std::string>& extensions) {
  std::vector<std::string> files;
  platform::ListFolder(folder, files);
  std::vector<std::string> names;
  for (const std::string& file : files) {
    if (IsTempFileName(file)) continue;
    const auto dot = file.rfind('.');
    if (dot == std::string::npos || dot == 0) continue;
    bool ours = false;
    for (const std::string& e : extensions) ours = ours || file.compare(dot, std::string::npos, e) == 0;
    const std::string stem = file.substr(0, dot);
    if (!ours || findex::IsAddOnName(stem)) continue;
    if (names.empty() || names.back() != stem) names.push_back(stem);
  }
  return names;
}

int64_t Bytes(const std::vector<std::string>& files) {
  int64_t total = 0;
  for (const std::string& f : files) total += std::max<int64_t>(platform::PathFileSize(f), 0);
  return total;
}

Row FindexRow(HostSession& session, const std::string& name) {
  CGlobalDefs& defs = session.Defs();
  Row row{name, "findex", kDamaged, kDamaged, kDamaged, kDamaged, kDamaged,
          std::to_string(Bytes(findex::ExistingFiles(defs, name))), kDamaged, kDamaged};
  int64_t keys = 0, words = 0;
  int32_t add_ons = 0;
  try {
    const CIndexHeader header = ReadStoredDefinition(defs, name);
    row[2] = FindexTypeName(header.FindexType);
    row[8] = SQLTimeToString(header.BuildTime);
    row[9] = SQLTimeToString(header.LastUpdateTime);
    keys = header.KeyCount;
    words = header.WordCount;
    for (int32_t n = 1; FindexFilesExist(defs, findex::AddOnName(name, n)); ++n) {
      const CIndexHeader add_on = ReadStoredDefinition(defs, findex::AddOnName(name, n));
      keys += add_on.KeyCount;
      words += add_on.WordCount;
      add_ons = n;
      row[9] = SQLTimeToString(add_on.LastUpdateTime);
    }
    row[3] = std::to_string(keys);
    row[4] = std::to_string(words);
    row[5] = std::to_string(add_ons);
  } catch (const CExceptionBase&) {
  }
  try {
    row[6] = std::to_string(ReadDeletedKeys(defs, name).size());
  } catch (const CExceptionBase&) {
  }
  return row;
}

Row OrderRow(HostSession& session, const std::string& name) {
  CGlobalDefs& defs = session.Defs();
  Row row{name, "order", kDamaged, kDamaged, "-", "-", "-",
          std::to_string(Bytes(order_files::ExistingFiles(defs, name))), kDamaged, kDamaged};
  try {
    BFile sri;
    sri.OpenFile(order_files::PathsOf(defs, name).sri, BFile::kReadOnly, order_files::kBlockUnits);
    COrderInfo info;
    info.ReadInfo(sri);
    row[2] = OrderTypeName(info.OrderType);
    row[3] = std::to_string(info.Count);
    row[8] = SQLTimeToString(info.BuildTime);
    row[9] = SQLTimeToString(info.LastUpdateTime);
  } catch (const CExceptionBase&) {
  }
  return row;
}

int RunList(const GlobalOptions& global, const std::vector<std::string>& args) {
  HostSession session("list");
  if (args.size() == 1 && IsHelpFlag(args[0])) {
    PrintHelp();
    return kExitOk;
  }
  if (!args.empty()) return session.Usage("list takes no arguments", kUsage);
  if (!session.Open(global)) return kExitError;
  std::vector<Row> rows{kHeading};
  try {
    CGlobalDefs& defs = session.Defs();
    for (const std::string& name :
         Names(defs.GetFullDataPath(FolderKind::Indexes), {".sdx", ".fst"})) {
      rows.push_back(FindexRow(session, name));
    }
    for (const std::string& name :
         Names(defs.GetFullDataPath(FolderKind::Orders), {".sri", ".srt"})) {
      rows.push_back(OrderRow(session, name));
    }
  } catch (const CExceptionBase& e) {
    return session.Fail(TerminalText(e));
  }
  std::fputs(TableText(rows, platform::IsTerminal(stdout)).c_str(), stdout);
  return kExitOk;
}

const CommandRegistration kList{
    {"list", kUsage, "list the findexes and orders of the group", RunList}};

}  // namespace
}  // namespace qm::cli
