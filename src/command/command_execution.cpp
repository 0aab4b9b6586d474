#include "command/command_execution.h"

#include <map>
#include <optional>

#include "base/error_numbers.h"
#include "format/header_block_io.h"
#include "command/command_locks.h"
#include "command/command_translator.h"
#include "command/command_type.h"
#include "index/deleted_keys.h"
#include "index/findex_file_set.h"
#include "index/findex_files.h"
#include "index/findex_writer.h"
#include "index/order_file_set.h"
#include "format/order_layout.h"
#include "index/pi_order.h"
#include "locks/lock_manager.h"
#include "platform/file_io.h"
#include "platform/text_encoding.h"
#include "base/exception_family.h"
#include "config/global_defs.h"
#include "base/plain_name.h"
#include "base/trace.h"
#include "sources/share_database.h"

namespace qm {

namespace {

constexpr const char* kExecuteW = "ExecuteW";
constexpr std::string_view kTraceTag = "PILIB.CPiStartPoint.ExecuteW";

// Numbered errors of the command engine.

// The bytes block 0 gives a header, its 6 header bytes included.

// The general option bits an update cannot add to a findex built without them.
constexpr int32_t kPostingLayoutBits = kIgoSupportScore | kIgoSupportPhrases;

// Holds one per-command writer lock for a scope.
class CommandLock {
 public:
  CommandLock(const CGlobalDefs& defs, int32_t command_type, std::string_view object_name)
      : lock_(defs.GetLockScope(), CommandLockName(command_type, ToUpper(object_name))) {
    lock_.LockWriter();
  }

 private:
  CLockManager lock_;
};

}  // namespace

void RequireNotAddOnName(std::string_view name, const char* method) {
  if (findex::IsAddOnName(name)) {
    throw CPiStartPointException::Text(
        "Invalid findex name \"%s\": a findex name must not contain \"_ADD_\", which names the "
        "add-on findexes of a findex",
        method, nullptr, ShowName(name));
  }
}

namespace {

template <class Definition>
void RequireFitsHeaderBlock(Definition probe, const CGlobalDefs& defs, std::string_view what,
                            const char* method) {
  // The build stores the connection in force with the definition.
  if (defs.IsConnectionSet()) {
    probe.ConnectionString = defs.GetConnectionString();
    probe.DisplayName = defs.GetDisplayName();
  }
  if (!probe.FitsHeaderBlock()) {
    throw CPiStartPointException::Text(
        "The %s definition is too long: its header needs %i bytes and block 0 holds %i. Use a "
        "shorter SELECT, fewer columns or shorter tags",
        method, nullptr, what, probe.EncodedSize(), header_io::kMaxEncodedSize);
  }
}

}  // namespace

void RequireBuildableFindex(const CIndexHeader& definition, const CGlobalDefs& defs,
                            const char* method) {
  RequirePlainName<CPiStartPointException>("findex", definition.IndexName, method);
  RequireNotAddOnName(definition.IndexName, method);
  RequireFitsHeaderBlock(definition, defs, "findex", method);
}

void RequireBuildableOrder(const COrderInfo& definition, const CGlobalDefs& defs,
                           const char* method) {
  RequirePlainName<CPiStartPointException>("order", definition.OrderName, method);
  RequireFitsHeaderBlock(definition, defs, "order", method);
}

namespace {

// A definition read back from a header for a rebuild. A header that no
// longer reads has lost it: the way out is a drop and a CREATE that names it.
template <class Read>
auto StoredDefinition(std::string_view what, std::string_view name, bool there, Read&& read) {
  try {
    return read();
  } catch (const CExceptionBase& e) {
    if (!there) throw;
    throw CPiStartPointException::Text(
        "The definition of %s %s cannot be read from its header: drop it and create it again "
        "with its whole definition",
        kExecuteW, &e, what, ShowName(name));
  }
}

std::string UpperTags(const TagMap& tags) {
  std::string out;
  for (const auto& [tag, value] : tags) {
    out += ':';
    out += ToUpper(tag);
    out += '=';
    out += value;
  }
  return out;
}

// The columns with their tags, names compared in upper case, tag values as
// written (a base path or address is case-sensitive).
std::map<std::string, std::string> ComparableColumns(const ColumnMap& columns) {
  std::map<std::string, std::string> out;
  for (const auto& [column, tags] : columns) out.emplace(ToUpper(column), UpperTags(tags));
  return out;
}

std::string ColumnsWithTags(const ColumnMap& columns) {
  std::string out;
  for (const auto& [column, tags] : columns) {
    if (!out.empty()) out += ',';
    out += column;
    for (const auto& [tag, value] : tags) out += ":" + tag + "=" + value;
  }
  return out;
}

std::string SourceText(const CIndexHeader& h) {
  return h.SqlUsedAsTable != 0 ? "the SQL select " + h.SqlSelect : "table " + h.TableName;
}

}  // namespace

void RequireUpdatableBy(const CIndexHeader& asked, const CIndexHeader& existing) {
  const int32_t missing_bits = asked.GeneralFlags & kPostingLayoutBits & ~existing.GeneralFlags;
  if (missing_bits != 0) {
    throw CPiStartPointException::Numbered(kErrOptionsDoNotMatch, kExecuteW, nullptr);
  }
  const bool same_source =
      asked.SqlUsedAsTable == existing.SqlUsedAsTable &&
      (asked.SqlUsedAsTable != 0 ? ToUpper(asked.SqlSelect) == ToUpper(existing.SqlSelect)
                                 : ToUpper(asked.TableName) == ToUpper(existing.TableName));
  if (same_source && ToUpper(asked.KeyColumn) == ToUpper(existing.KeyColumn) &&
      ComparableColumns(asked.Columns) == ComparableColumns(existing.Columns)) {
    return;
  }
  // Add-ons are read together with their findex: rows indexed from another
  // source, key or columns would not belong to it.
  const auto cause = CPiStartPointException::Text(
      "The update names %s with key %s and columns %s, but findex %s was built on %s with key "
      "%s and columns %s. Use CREATE FINDEX to change the definition",
      kExecuteW, nullptr, SourceText(asked), asked.KeyColumn, ColumnsWithTags(asked.Columns),
      existing.IndexName, SourceText(existing), existing.KeyColumn,
      ColumnsWithTags(existing.Columns));
  throw CPiStartPointException::Numbered(kErrOptionsDoNotMatch, kExecuteW, &cause);
}

CommandExecution::CommandExecution(CGlobalDefs& defs, std::atomic<bool>& data_path_valid,
                                   const IndexOptions& index_options,
                                   const OrderOptions& order_options)
    : defs_(defs),
      data_path_valid_(data_path_valid),
      index_options_(index_options),
      order_options_(order_options) {}

void CommandExecution::ExecuteStatement(std::u16string_view statement) {
  Command command;
  PiCmd translator(command.findex, command.order, command.connection, index_options_,
                   order_options_);
  translator.TranslateW(statement);
  command.type = translator.CmdType();
  command.rebuild = translator.Rebuild();
  command.create = translator.Create();
  command.delete_key = translator.DeleteKeyValue();
  command.pass_through_sql = translator.PassThroughSql();
  Execute(command);
}

void CommandExecution::CreateFindex(const CIndexHeader& definition) {
  Command command;
  command.type = kCmdFindexDefined;
  command.create = 1;
  command.rebuild = 1;
  command.findex = definition;
  Execute(command);
}

void CommandExecution::CreateOrder(const COrderInfo& definition) {
  Command command;
  command.type = kCmdOrderDefined;
  command.create = 1;
  command.rebuild = 1;
  command.order = definition;
  Execute(command);
}

void CommandExecution::Execute(Command& command) {
  switch (command.type) {
    case kCmdConnect:
    case kCmdSetConnectionString: TestConnection(command); return;
    case kCmdSetGroup: SelectGroup(command); return;
    case kCmdNotRecognised:
      throw CPiStartPointException::Text("Command not recognised", kExecuteW, nullptr);
    case kCmdFindexStored:
    case kCmdFindexDefined: BuildFindex(command); return;
    case kCmdOrderStored:
    case kCmdOrderDefined: BuildOrder(command); return;
    case kCmdDropFindex: DropFindex(command.findex.IndexName); return;
    case kCmdDropOrder: DropOrder(command.order.OrderName); return;
    case kCmdDeleteKey: DeleteKey(command); return;
    case kCmdPassThroughSql: RunPassThroughSql(command); return;
    default: throw CPiStartPointException::Numbered(kErrNoCommand, kExecuteW, nullptr);
  }
}

void CommandExecution::TestConnection(const Command& command) {
  const ConnectionSettings& c = command.connection;
  if (command.type == kCmdConnect) {
    defs_.SetConnectionDsn(c.Dsn, c.UserId, c.Password);
  } else {
    defs_.SetConnection(c.ConnectionString, c.DisplayName);
  }
  try {
    CShareDatabase database(defs_);
    database.Connect();
    database.Disconnect();
  } catch (const CExceptionBase& e) {
    throw CPiStartPointException::Numbered(kErrConnectionSettings, kExecuteW, &e);
  }
}

void CommandExecution::SelectGroup(const Command& command) {
  const std::string& group = command.connection.Group;
  RequirePlainName<CPiStartPointException>("group", group, kExecuteW);
  defs_.SetGroup(group);
  try {
    if (platform::IsDirectory(defs_.GetFullDataPath(FolderKind::Group))) return;
  } catch (const CExceptionBase& e) {
    data_path_valid_ = false;
    throw CPiStartPointException::Numbered(kErrGroupMissing, kExecuteW, &e);
  }
  data_path_valid_ = false;
  throw CPiStartPointException::Numbered(kErrGroupMissing, kExecuteW, nullptr);
}

void CommandExecution::RequireDataPathValid() const {
  if (!data_path_valid_) {
    throw CPiStartPointException::Numbered(kErrGroupMissing, kExecuteW, nullptr);
  }
}

void CommandExecution::BuildFindex(Command& command) {
  CIndexHeader& definition = command.findex;
  RequireBuildableFindex(definition, defs_, kExecuteW);
  RequireDataPathValid();
  const std::string name = definition.IndexName;
  const CommandLock lock(defs_, command.type, name);

  const bool stored = command.type == kCmdFindexStored;
  const bool update = command.create == 0;
  bool rebuild = command.rebuild != 0;

  if (rebuild && stored) {
    // CREATE FINDEX name, UPDATE FINDEX name REBUILD.
    definition = StoredDefinition("findex", name, FindexFilesExist(defs_, name),
                                  [&] { return ReadStoredDefinition(defs_, name); });
  } else if (rebuild && update) {
    // UPDATE ... ON TABLE ... REBUILD: the statement's options over the
    // stored definition, which keeps what a statement cannot name (the
    // date/time update key, the stored connection).
    CIndexHeader existing = ReadStoredDefinition(defs_, name);
    RequireUpdatableBy(definition, existing);
    definition = std::move(existing);
    index_options_.CopyTo(definition);
  } else if (!rebuild) {
    CIndexHeader existing = ReadFindexHeader(defs_, name);
    Trace(defs_.TraceLevel1(), kTraceTag,
          "Status 1. IndexName: %s, Rebuild: %i, SortMax: %i, Count: %i", name, command.rebuild,
          existing.SortMax, existing.WordCount);
    if (!stored) RequireUpdatableBy(definition, existing);
    // The new rows are indexed as the findex was: its stored definition and
    // options, whatever the current options are.
    definition = std::move(existing);
    // Below 1 no key range is known: every row is read again.
    if (definition.WordCount < kAddOnWordThreshold || definition.SortMax < 1) {
      rebuild = true;
    } else {
      // The first add-on with room takes the rows above the findex before it.
      int32_t sort_max = definition.SortMax;
      DateTimeValue max_date_time = definition.MaxDateTimeKey;
      for (int32_t n = 1;; ++n) {
        const std::string add_on = findex::AddOnName(name, n);
        CIndexHeader add_on_header;
        // An add-on that is not there counts as empty; one that is there but
        // cannot be read is not overwritten.
        if (FindexFilesExist(defs_, add_on)) add_on_header = ReadFindexHeader(defs_, add_on);
        if (add_on_header.WordCount < kAddOnWordThreshold) {
          definition.IndexName = add_on;
          definition.SortMax = sort_max;
          definition.MaxDateTimeKey = max_date_time;
          break;
        }
        sort_max = add_on_header.SortMax;
        max_date_time = add_on_header.MaxDateTimeKey;
      }
    }
  }
  std::optional<CommandLock> delete_lock;
  if (rebuild) {
    // A rebuild reads every row again, whatever the findex held before.
    definition.SortMax = 0;
    definition.MaxDateTimeKey = DateTimeValue{};
    // It forgets the deleted keys once it is in place: a DELETE waits until
    // then, or a key deleted after its rows were read would be lost.
    delete_lock.emplace(defs_, kCmdDeleteKey, name);
  }
  Trace(defs_.TraceLevel1(), kTraceTag, "Status 2. IndexBuildName: %s, Rebuild: %i, SortMax: %i",
        definition.IndexName, rebuild ? 1 : 0, definition.SortMax);
  CPiFIndex builder(defs_);
  builder.BuildRowFindex(definition, rebuild);
}

void CommandExecution::BuildOrder(Command& command) {
  COrderInfo& definition = command.order;
  RequireBuildableOrder(definition, defs_, kExecuteW);
  RequireDataPathValid();
  const std::string name = definition.OrderName;
  const CommandLock lock(defs_, command.type, name);
  const bool rebuild = command.rebuild != 0;
  if (command.type == kCmdOrderStored) {
    // CREATE ORDER name and UPDATE ORDER name work from the stored definition,
    // its options and its type included.
    const bool there = platform::FileExists(order_files::PathsOf(defs_, name).sri);
    definition = StoredDefinition("order", name, there,
                                  [&] { return order_files::ReadInfoShared(defs_, name); });
  } else {
    definition.OrderType = 0;
  }
  // An update starts past the stored order's highest keys (the builder takes
  // them over from the order it merges with); a rebuild reads every row.
  if (rebuild) {
    definition.SortMax = 0;
    definition.MaxDateTimeKey = DateTimeValue{};
  }
  Trace(defs_.TraceLevel1(), kTraceTag, "Order: %s, Rebuild: %i, Order Type: %i", name,
        rebuild ? 1 : 0, definition.OrderType);
  CPiOrder builder(defs_);
  if (definition.OrderType == kOrderTypeRanks) {
    builder.BuildOrderAll(definition, rebuild);
  } else {
    builder.BuildOrderInt(definition, rebuild);
  }
}

void CommandExecution::DropFindex(const std::string& name) {
  RequirePlainName<CPiStartPointException>("findex", name, kExecuteW);
  const CommandLock drop_lock(defs_, kCmdDropFindex, name);
  // A drop never races a build of the same findex, nor a search of it.
  const CommandLock create_lock(defs_, kCmdFindexDefined, name);
  const std::string group = defs_.GetGroup();
  CLockManager findex_lock(defs_.GetLockScope(), group, name, kLockFindex);
  findex_lock.LockExclusive();
  CLockManager deleted_keys_lock(defs_.GetLockScope(), group, name, kLockDeletedKeys);
  deleted_keys_lock.LockExclusive();
  // Whatever files are there go, damaged ones too: a findex that no longer
  // opens must still be removable.
  CPiFIndex findex(defs_);
  findex.DropFindexFiles(name);
}

void CommandExecution::DropOrder(const std::string& name) {
  RequirePlainName<CPiStartPointException>("order", name, kExecuteW);
  const CommandLock drop_lock(defs_, kCmdDropOrder, name);
  // A drop never races a build of the same order; searches are waited for
  // under the order's kind 3 lock, which DropOrder takes.
  const CommandLock order_lock(defs_, kCmdOrderDefined, name);
  // Whatever files are there go, damaged ones too.
  CPiOrder order(defs_);
  order.DropOrderFiles(name);
}

void CommandExecution::DeleteKey(const Command& command) {
  const std::string& name = command.findex.IndexName;
  RequirePlainName<CPiStartPointException>("findex", name, kExecuteW);
  // Findexes kept up to date by updates and deletes have keys of 1 and above:
  // updates select the keys above the highest one indexed, which starts at 0.
  if (command.delete_key < 1) {
    throw CPiStartPointException::Text(
        "Cannot delete key %i from findex %s: deleted keys must be 1 or above", kExecuteW,
        nullptr, command.delete_key, name);
  }
  const CommandLock lock(defs_, kCmdDeleteKey, name);
  // A key deleted from a findex that is not there would be reported done
  // while no search ever subtracts it.
  if (!FindexFilesExist(defs_, name)) {
    throw CPiStartPointException::Text("Cannot delete key %i: findex %s does not exist", kExecuteW,
                                       nullptr, command.delete_key, name);
  }
  qm::DeleteKey(defs_, name, command.delete_key, true);
}

void CommandExecution::RunPassThroughSql(const Command& command) {
  CShareDatabase database(defs_);
  database.Connect();
  int16_t columns = 0;
  database.ExecuteSql(Utf16ToUtf8(command.pass_through_sql), columns);
  database.Disconnect();
}

}  // namespace qm
