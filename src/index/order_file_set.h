// The file set of an order in the group's order folder: NAME.sri (the order
// header in block 0), NAME.srt (one row per key) and, for an order of type 2,
// NAME_COLUMN.col per order column. Order and column names are upper-cased
// when file and lock names are formed.
//
// A build writes its files under temporary names and moves them into place
// under the exclusive kind 3 lock of the order, so readers (who hold a reader
// unit of that lock while they open the files) see the whole old set or the
// whole new one.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "config/temp_file_claim.h"
#include "format/order_info.h"

namespace qm {

class CGlobalDefs;

namespace order_files {

// Block size of the .sri file in 64-byte units (4,096 bytes).
inline constexpr int32_t kBlockUnits = 64;

struct OrderPaths {
  std::string sri;
  std::string srt;
};

OrderPaths PathsOf(const CGlobalDefs& defs, std::string_view name);
// NAME_COLUMN.col in the order folder.
std::string ColumnFilePath(const CGlobalDefs& defs, std::string_view name, std::string_view column);

// Names reach file and lock names: the order name and every column name must
// be plain names, and a column list must not be empty. Raises a PiOrder error
// naming method.
void CheckNames(const COrderInfo& definition, const char* method);

// Refuses (PiOrder, naming method) a type 2 order whose column file names
// collide: two columns of the order with one file name, or a file name that
// belongs to a column of another order of type 2 ("A" with column "B_C" and
// "A_B" with column "C" both make A_B_C.col).
void CheckColumnFilesFree(const CGlobalDefs& defs, std::string_view name,
                          const OrderColumnList& columns, const char* method);

// The header of an existing order, read under a reader unit of its kind 3 lock.
COrderInfo ReadInfoShared(const CGlobalDefs& defs, std::string_view name);

// The files of one build under temporary names in the order folder, each
// created exclusively and locked for the object's life; whatever has not been
// moved into place is removed when the object dies (a failed build leaves
// nothing behind).
class BuildFiles {
 public:
  BuildFiles(const CGlobalDefs& defs, std::size_t columns);
  ~BuildFiles();
  BuildFiles(const BuildFiles&) = delete;
  BuildFiles& operator=(const BuildFiles&) = delete;

  const std::string& Sri() const { return sri_; }
  const std::string& Srt() const { return srt_; }
  const std::string& Column(std::size_t i) const { return columns_.at(i); }
  std::size_t ColumnCount() const { return columns_.size(); }

  // Moves the files into place as the order name with these column names
  // (type 2; empty for type 1), under the exclusive kind 3 lock of the order.
  // The files they replace are renamed aside first and deleted only once the
  // whole new set is in place; a failed rename puts the old set back and
  // raises "Error renaming %s to %s". Then the column files in obsolete
  // (those of the replaced order that the new one lacks) are deleted.
  void MoveIntoPlace(const CGlobalDefs& defs, std::string_view name,
                     const std::vector<std::string>& column_names,
                     const std::vector<std::string>& obsolete);

 private:
  std::string sri_;
  std::string srt_;
  std::vector<std::string> columns_;
  // One per file, held until the object dies: a sweep leaves them alone.
  std::vector<TempFileClaim> claims_;
  bool moved_ = false;
};

// Deletes the order's files: NAME.sri first (the order is gone for every
// reader from then on), NAME.srt, then the column files of a type 2 info.
// REQUIRES: the caller holds the exclusive kind 3 lock of the order.
void DropFiles(const CGlobalDefs& defs, std::string_view name, const COrderInfo& info);

// The files of the order name that exist, whatever their state: NAME.sri,
// NAME.srt and its column files. Without a readable header the column files
// are the NAME_*.col files that no other order of type 2 owns.
std::vector<std::string> ExistingFiles(const CGlobalDefs& defs, std::string_view name);

// Removes the temporaries of the group's Orders folder that no running build
// holds (files left by killed builds), tracing each; returns their paths.
std::vector<std::string> RemoveOrphanedTempFiles(const CGlobalDefs& defs);

}  // namespace order_files
}  // namespace qm
