// CPiOrder: the order builder. An order holds, for every key of a table, the
// values of its order columns in a form that lets searches sort and group
// result sets without the database (order_layout.h has the rows,
// order_column_file.h the column files of type 2, order_file_set.h the
// files and how they are replaced).
//
// A build reads the rows of the order's SELECT, decides the order type from
// the column types (any text column: type 2, ranks; otherwise type 1, the
// values), writes the files under temporary names and moves them into place
// under the exclusive kind 3 lock. An update (no rebuild) reads only the
// rows past the highest key (or date/time update key) of the stored order
// and merges them with it; a key read again replaces its older row. Text
// read for an update takes the stored column's form (narrow or wide) when
// the driver gives the other one. An update whose order type, columns or
// row layout differ from the stored order's raises "Order definition
// changed, rebuild required".
//
// Callers that run commands hold the command lock of the order
// ("MORVIL_SYNCHRONIZE_ORDER" + name) around builds and drops, so one order
// has one builder at a time.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "config/global_defs.h"
#include "format/order_info.h"

namespace qm {

class CItems;

class CPiOrder {
 public:
  // OpenOrder modes.
  static constexpr int32_t kModeCreate = 1;
  static constexpr int32_t kModeRead = 3;

  explicit CPiOrder(CGlobalDefs& defs);
  // Closes; build files that were not moved into place are removed.
  ~CPiOrder();
  CPiOrder(const CPiOrder&) = delete;
  CPiOrder& operator=(const CPiOrder&) = delete;

  // Mode 3: opens name.sri and name.srt of an existing order, and the column
  // files of a type 2 order, under a reader unit of the order's kind 3 lock
  // held while they are opened; the header is read ("Error reading order
  // header" when it cannot be). Mode 1: creates the files of a new build of
  // name (with column_files column files) under temporary names. Any other
  // mode raises.
  void OpenOrder(std::string_view name, int32_t mode, std::size_t column_files = 0);
  void CloseOrder();
  bool IsOpen() const;
  // The header of an order opened in mode 3.
  const COrderInfo& Info() const;

  // Builds or updates the order of definition, deciding its type from the
  // column types. definition receives what the build stored: the order type,
  // the column layouts, the key count, the highest key and date/time update
  // key, the times and the connection. A build that selects no row raises
  // error 26; an update that selects none changes nothing.
  void BuildOrderInt(COrderInfo& definition, bool rebuild);
  // The same, always of type 2 (every column stored as ranks).
  void BuildOrderAll(COrderInfo& definition, bool rebuild);

  // Deletes the files of the order opened in mode 3 (the column files of a
  // type 2 order too) under the exclusive kind 3 lock; the order is closed.
  void DropOrder();
  // Deletes whatever files of the order name exist, also damaged ones that
  // no longer open, under the exclusive kind 3 lock, tracing each; returns
  // their paths. A name without any file raises what opening it raises.
  std::vector<std::string> DropOrderFiles(std::string_view name);

 private:
  struct State;
  struct Build;

  void BuildOrder(COrderInfo& definition, bool rebuild, bool ranks_only, const char* method);
  // Read the rows and put the new order's rows into out, the column files
  // of type 2 written; then this object holds the build files (mode 1).
  // False for an update that read no row.
  bool BuildValues(Build& build, CItems& out, const char* method);
  bool BuildRanks(Build& build, CItems& out);
  // Moves the build files of mode 1 into place as the order written (its
  // column files too for type 2), then deletes the obsolete files; a failed
  // rename raises "Error renaming %s to %s".
  void RenameOrder2(const COrderInfo& written, const std::vector<std::string>& obsolete);

  CGlobalDefs& defs_;
  std::unique_ptr<State> state_;
};

}  // namespace qm
