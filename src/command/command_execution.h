// CommandExecution: carries out one command for the command engine, on the
// settings it is given (the engine's own for a blocking call, a job's private
// copy for a background job): the connection tests, SET GROUP, findex builds
// with the rebuild or add-on decision, drops, and pass-through SQL. Each
// command that changes files runs under its per-command writer lock.
#pragma once

#include <atomic>
#include <cstdint>
#include <string>
#include <string_view>

#include "command/connection_settings.h"
#include "format/index_options.h"
#include "format/index_header.h"
#include "format/order_info.h"

namespace qm {

class CGlobalDefs;

// An update whose findex (or add-on) holds fewer words than this rebuilds it;
// otherwise the new rows go to an add-on findex.
inline constexpr int32_t kAddOnWordThreshold = 2000;

class CommandExecution {
 public:
  // All references must outlive this object.
  CommandExecution(CGlobalDefs& defs, std::atomic<bool>& data_path_valid,
                   const IndexOptions& index_options, const OrderOptions& order_options);
  CommandExecution(const CommandExecution&) = delete;
  CommandExecution& operator=(const CommandExecution&) = delete;

  // Translates the statement with a fresh translator and carries it out.
  void ExecuteStatement(std::u16string_view statement);
  // CREATE FINDEX / CREATE ORDER from a definition made through the API.
  void CreateFindex(const CIndexHeader& definition);
  void CreateOrder(const COrderInfo& definition);
  // DROP FINDEX / DROP ORDER of exactly this name.
  void DropFindex(const std::string& name);
  void DropOrder(const std::string& name);

 private:
  // A translated command.
  struct Command {
    int32_t type = 0;
    int16_t rebuild = 0;
    int16_t create = 0;
    int32_t delete_key = 0;
    std::u16string pass_through_sql;
    CIndexHeader findex;
    COrderInfo order;
    ConnectionSettings connection;
  };

  void Execute(Command& command);
  void TestConnection(const Command& command);
  void SelectGroup(const Command& command);
  void BuildFindex(Command& command);
  void BuildOrder(Command& command);
  void DeleteKey(const Command& command);
  void RunPassThroughSql(const Command& command);
  void RequireDataPathValid() const;

  CGlobalDefs& defs_;
  std::atomic<bool>& data_path_valid_;
  const IndexOptions& index_options_;
  const OrderOptions& order_options_;
};

// Raises the PiStartPoint refusal of a findex name that would read as an
// add-on findex ("_ADD_" in any case).
void RequireNotAddOnName(std::string_view name, const char* method);

// The checks every findex or order definition passes before anything runs:
// plain names, no add-on name for a findex, and a header that fits block 0
// with the connection of defs stored in it.
void RequireBuildableFindex(const CIndexHeader& definition, const CGlobalDefs& defs,
                            const char* method);
void RequireBuildableOrder(const COrderInfo& definition, const CGlobalDefs& defs,
                           const char* method);

// What an UPDATE FINDEX ... ON TABLE must name to update an existing findex:
// its table (or SQL select), key column and columns with their tags (names
// compared in upper case), and no score or phrase support that the findex
// lacks. Raises error 10 otherwise.
void RequireUpdatableBy(const CIndexHeader& asked, const CIndexHeader& existing);

}  // namespace qm
