// quillmere translate STATEMENT: translates one command statement and prints
// its command record, or the error text a host would see.
#include <cstdio>
#include <string>
#include <vector>

#include "command/command_locks.h"
#include "command/command_translator.h"
#include "command/statement_mask.h"
#include "command_registry.h"
#include "platform/text_encoding.h"
#include "base/exception.h"
#include "terminal_text.h"

namespace qm::cli {

namespace {

const char* CommandTypeText(int32_t type) {
  switch (type) {
    case kCmdPassThroughSql: return "SQL for the data source";
    case kCmdDropFindex: return "drop findex";
    case kCmdConnect: return "connect to a DSN";
    case kCmdSetGroup: return "set group";
    case kCmdFindexStored: return "findex from its stored definition";
    case kCmdFindexDefined: return "findex from this definition";
    case kCmdDeleteKey: return "delete a key from a findex";
    case kCmdOrderStored: return "order from its stored definition";
    case kCmdOrderDefined: return "order from this definition";
    case kCmdDropOrder: return "drop order";
    case kCmdSetConnectionString: return "set connection string";
    default: return "not recognised: refused when executed";
  }
}

std::string Secret(const std::string& value) { return value.empty() ? "" : "****"; }

void PrintRecord(const PiCmd& cmd, const CIndexHeader& findex, const COrderInfo& order,
                 const ConnectionSettings& connection) {
  const int32_t type = cmd.CmdType();
  std::printf("command type: %d (%s)\n", type, CommandTypeText(type));
  auto line = [](const char* name, const std::string& value) {
    std::printf("%s: %s\n", name, value.c_str());
  };
  const bool findex_build = type == kCmdFindexStored || type == kCmdFindexDefined;
  const bool order_build = type == kCmdOrderStored || type == kCmdOrderDefined;
  if (findex_build || order_build) {
    std::printf("create: %d\nrebuild: %d\n", cmd.Create(), cmd.Rebuild());
  }
  if (findex_build || type == kCmdDropFindex || type == kCmdDeleteKey) {
    line("findex", findex.IndexName);
  }
  if (order_build || type == kCmdDropOrder) line("order", order.OrderName);
  if (type == kCmdFindexDefined) {
    line("table", findex.TableName);
    std::printf("columns:\n");
    for (const auto& [name, tags] : findex.Columns) {
      std::printf("  %s", name.c_str());
      for (const auto& [tag, value] : tags) std::printf(" %s=%s", tag.c_str(), value.c_str());
      std::printf("\n");
    }
    line("key", findex.KeyColumn);
  }
  if (findex_build) {
    std::printf("options: language %d, language flags %d, general flags %d, update flags %d\n",
                findex.Language, findex.LanguageFlags, findex.GeneralFlags, findex.UpdateFlags);
  }
  if (type == kCmdOrderDefined) {
    line("table", order.TableName);
    std::printf("columns:\n");
    for (const auto& column : order.Columns) std::printf("  %s\n", column.Name.c_str());
    line("key", order.KeyColumn);
  }
  if (type == kCmdDeleteKey) std::printf("key value: %d\n", cmd.DeleteKeyValue());
  if (type == kCmdConnect) {
    line("dsn", connection.Dsn);
    line("user", connection.UserId);
    line("password", Secret(connection.Password));
  }
  if (type == kCmdSetConnectionString) {
    line("connection string", Utf16ToUtf8(MaskConnectionSecrets(Utf8ToUtf16(connection.ConnectionString))));
  }
  if (type == kCmdSetGroup) line("group", connection.Group);
  if (type == kCmdPassThroughSql) line("sql", Utf16ToUtf8(cmd.PassThroughSql()));
  const std::string& object = order_build || type == kCmdDropOrder ? order.OrderName : findex.IndexName;
  const std::string lock = CommandLockName(type, object);
  if (!lock.empty()) line("lock", lock);
}

int RunTranslate(const GlobalOptions&, const std::vector<std::string>& args) {
  if (args.size() == 1 && IsHelpFlag(args[0])) {
    std::printf(
        "usage: quillmere translate STATEMENT\n\n"
        "Translates one command statement, as the engine does before it runs one, and\n"
        "prints its command record: command type, names, columns with their tags, key,\n"
        "options and the command lock. Nothing is run and no data directory is used;\n"
        "passwords are masked. Several arguments are joined with blanks.\n\n"
        "Exit status: 0 translated, 1 the statement is refused (message on standard\n"
        "error), 2 usage error.\n");
    return kExitOk;
  }
  if (args.empty()) {
    std::fputs("usage: quillmere translate STATEMENT\n", stderr);
    return kExitUsage;
  }
  std::string statement;
  for (const auto& a : args) {
    if (!statement.empty()) statement += ' ';
    statement += a;
  }
  CIndexHeader findex;
  COrderInfo order;
  ConnectionSettings connection;
  const IndexOptions index_options;
  const OrderOptions order_options;
  PiCmd cmd(findex, order, connection, index_options, order_options);
  try {
    cmd.TranslateW(Utf8ToUtf16(statement));
  } catch (CExceptionBase& e) {
    std::fputs(TerminalText(e).c_str(), stderr);
    return kExitError;
  }
  PrintRecord(cmd, findex, order, connection);
  return kExitOk;
}

const CommandRegistration kTranslate(Command{
    "translate", "translate STATEMENT",
    "translate a command statement and print its command record", RunTranslate});

}  // namespace
}  // namespace qm::cli
