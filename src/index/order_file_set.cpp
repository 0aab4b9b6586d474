#include "index/order_file_set.h"

#include <cerrno>
#include <optional>
#include <set>
#include <utility>

#include "index/file_swap.h"
#include "locks/lock_manager.h"
#include "platform/file_io.h"
#include "platform/text_encoding.h"
#include "format/bfile.h"
#include "base/exception_family.h"
#include "config/file_operations.h"
#include "config/global_defs.h"
#include "base/plain_name.h"
#include "config/temp_file_claim.h"
#include "config/temp_file_sweep.h"
#include "config/temp_names.h"
#include "base/trace.h"

namespace qm::order_files {

namespace {

constexpr const char* kRenameMethod = "RenameOrder2";
constexpr const char* kErrorTag = "PILIB_ERROR.PiOrder.RenameOrder2";
// The generator makes names unique between builds: only files left behind
// by a crash can be in the way of one.
constexpr int kTempNameAttempts = 100;
constexpr int32_t kTextOrder = 2;

std::string OrderFolder(const CGlobalDefs& defs) {
  return defs.GetFullDataPath(FolderKind::Orders);
}

// NAME_COLUMN: the column file's name without its extension.
std::string ColumnFileStem(std::string_view name, std::string_view column) {
  return ToUpper(name) + "_" + ToUpper(column);
}

}  // namespace

OrderPaths PathsOf(const CGlobalDefs& defs, std::string_view name) {
  const std::string base = OrderFolder(defs) + ToUpper(name);
  return OrderPaths{base + ".sri", base + ".srt"};
}

std::string ColumnFilePath(const CGlobalDefs& defs, std::string_view name,
                           std::string_view column) {
  return OrderFolder(defs) + ColumnFileStem(name, column) + ".col";
}

void CheckNames(const COrderInfo& definition, const char* method) {
  RequirePlainName<CPiOrderException>("order", definition.OrderName, method);
  if (definition.Columns.empty()) {
    throw CPiOrderException::Text("Order %s has no columns", method, nullptr,
                                  ShowName(definition.OrderName));
  }
  // Column names become part of the column file names.
  for (const OrderColumn& column : definition.Columns) {
    RequirePlainName<CPiOrderException>("order column", column.Name, method);
  }
}

COrderInfo ReadInfoShared(const CGlobalDefs& defs, std::string_view name) {
  CLockManager lock(defs.GetLockScope(), defs.GetGroup(), name, kLockOrder);
  lock.LockReader();
  BFile file;
  file.OpenFile(PathsOf(defs, name).sri, BFile::kReadOnly, kBlockUnits);
  COrderInfo info;
  info.ReadInfo(file);
  return info;
}

void CheckColumnFilesFree(const CGlobalDefs& defs, std::string_view name,
                          const OrderColumnList& columns, const char* method) {
  const std::string own = ToUpper(name);
  std::set<std::string> stems;
  for (const OrderColumn& column : columns) {
    const std::string stem = ColumnFileStem(name, column.Name);
    if (!stems.insert(stem).second) {
      throw CPiOrderException::Text(
          "Order %s names column %s twice: both would be stored in the column file %s.col", method,
          nullptr, name, column.Name, stem);
    }
    // Every other cut of the stem at a "_" into an order name and a column
    // name could be another order's column file.
    for (auto cut = stem.find('_'); cut != std::string::npos; cut = stem.find('_', cut + 1)) {
      const std::string other = stem.substr(0, cut);
      const std::string other_column = stem.substr(cut + 1);
      if (other.empty() || other_column.empty() || other == own) continue;
      if (!platform::FileExists(PathsOf(defs, other).sri)) continue;
      COrderInfo info;
      try {
        info = ReadInfoShared(defs, other);
      } catch (const CException&) {
        continue;  // no readable order: it owns no column file
      }
      if (info.OrderType != kTextOrder) continue;
      for (const OrderColumn& c : info.Columns) {
        if (ToUpper(c.Name) == other_column) {
          throw CPiOrderException::Text(
              "The column file %s.col of order %s, column %s, belongs to order %s, column %s: "
              "choose another order or column name",
              method, nullptr, stem, name, column.Name, info.OrderName, c.Name);
        }
      }
    }
  }
}

BuildFiles::BuildFiles(const CGlobalDefs& defs, std::size_t columns) {
  constexpr const char* kMethod = "OpenOrder";
  const std::string folder = OrderFolder(defs);
  for (int attempt = 1;; ++attempt) {
    const std::string base = folder + SLGetTempFileName(defs, true, kTempCallerOrderFiles);
    std::vector<std::string> paths{base + ".sri.tmp", base + ".srt.tmp"};
    for (std::size_t i = 0; i < columns; ++i) {
      paths.push_back(base + "_" + std::to_string(i + 1) + ".tmp");
    }
    std::vector<TempFileClaim> claims;
    int error = 0;
    for (const std::string& path : paths) {
      std::optional<TempFileClaim> claim = TempFileClaim::Create(path);
      if (!claim) {
        error = errno;
        break;
      }
      claims.push_back(std::move(*claim));
    }
    if (claims.size() == paths.size()) {
      sri_ = paths[0];
      srt_ = paths[1];
      columns_.assign(paths.begin() + 2, paths.end());
      claims_ = std::move(claims);
      return;
    }
    for (std::size_t i = 0; i < claims.size(); ++i) platform::UnlinkFile(paths[i]);
    if (error != EEXIST) {
      throw CPiOrderException::Text(kOpenFailureText, kMethod, nullptr, paths[claims.size()]);
    }
    if (attempt == kTempNameAttempts) {
      throw CPiOrderException::Text("No free temporary name in %s", kMethod, nullptr, folder);
    }
  }
}

BuildFiles::~BuildFiles() {
  if (!moved_) {
    for (const std::string* path : {&sri_, &srt_}) platform::UnlinkFile(*path);
    for (const std::string& path : columns_) platform::UnlinkFile(path);
  }
  claims_.clear();
}

void BuildFiles::MoveIntoPlace(const CGlobalDefs& defs, std::string_view name,
                               const std::vector<std::string>& column_names,
                               const std::vector<std::string>& obsolete) {
  if (column_names.size() > columns_.size()) throw CPiOrderException::General(kRenameMethod);
  // Column files first and the header last: the header names the set.
  std::vector<std::pair<std::string, std::string>> moves;
  for (std::size_t i = 0; i < column_names.size(); ++i) {
    moves.emplace_back(columns_[i], ColumnFilePath(defs, name, column_names[i]));
  }
  const OrderPaths target = PathsOf(defs, name);
  moves.emplace_back(srt_, target.srt);
  moves.emplace_back(sri_, target.sri);

  CLockManager lock(defs.GetLockScope(), defs.GetGroup(), name, kLockOrder);
  file_swap::LockExclusively<CPiOrderException>(lock, "order", ToUpper(name), kRenameMethod,
                                                kErrorTag);
  // Each old file goes aside just before its new one comes in.
  file_swap::Renames renames(kErrorTag);
  for (const auto& [from, to] : moves) {
    try {
      renames.SetAside(to, from + ".old");
      renames.Move(from, to);
    } catch (const CException& e) {
      renames.Undo();
      throw CPiOrderException::Text("Error renaming %s to %s", kRenameMethod, &e, from, to);
    }
  }
  moved_ = true;
  renames.DropBackups();
  for (const std::string& path : obsolete) file_swap::DropQuietly(path, kErrorTag);
}

void DropFiles(const CGlobalDefs& defs, std::string_view name, const COrderInfo& info) {
  const OrderPaths paths = PathsOf(defs, name);
  DropFile(paths.sri);
  DropFile(paths.srt);
  if (info.OrderType == kTextOrder) {
    for (const OrderColumn& column : info.Columns)
      DropFile(ColumnFilePath(defs, name, column.Name));
  }
}

namespace {

// True when stem ("A_B_C") is the column file of another order of type 2
// whose header reads ("A_B" with column "C").
bool OwnedByAnotherOrder(const CGlobalDefs& defs, std::string_view name, const std::string& stem) {
  const std::string own = ToUpper(name);
  for (auto cut = stem.find('_'); cut != std::string::npos; cut = stem.find('_', cut + 1)) {
    const std::string other = stem.substr(0, cut);
    const std::string column = stem.substr(cut + 1);
    if (other.empty() || column.empty() || other == own) continue;
    if (!platform::FileExists(PathsOf(defs, other).sri)) continue;
    try {
      const COrderInfo info = ReadInfoShared(defs, other);
      if (info.OrderType != kTextOrder) continue;
      for (const OrderColumn& c : info.Columns) {
        if (ToUpper(c.Name) == column) return true;
      }
    } catch (const CException&) {
      // An unreadable order owns nothing that can be told.
    }
  }
  return false;
}

}  // namespace

std::vector<std::string> ExistingFiles(const CGlobalDefs& defs, std::string_view name) {
  const OrderPaths paths = PathsOf(defs, name);
  std::vector<std::string> files;
  std::optional<COrderInfo> info;
  if (platform::FileExists(paths.sri)) {
    files.push_back(paths.sri);
    try {
      BFile file;
      file.OpenFile(paths.sri, BFile::kReadOnly, kBlockUnits);
      info.emplace();
      info->ReadInfo(file);
    } catch (const CException&) {
      info.reset();
    }
  }
  if (platform::FileExists(paths.srt)) files.push_back(paths.srt);
  if (info) {
    if (info->OrderType == kTextOrder) {
      for (const OrderColumn& column : info->Columns) {
        const std::string path = ColumnFilePath(defs, name, column.Name);
        if (platform::FileExists(path)) files.push_back(path);
      }
    }
    return files;
  }
  // No header to name the columns: every NAME_*.col no other order claims.
  const std::string prefix = ToUpper(name) + "_";
  std::vector<std::string> names;
  platform::ListFolder(OrderFolder(defs), names);
  for (const std::string& file : names) {
    if (file.size() <= prefix.size() + 4 || file.compare(0, prefix.size(), prefix) != 0 ||
        file.compare(file.size() - 4, 4, ".col") != 0) {
      continue;
    }
    const std::string stem = file.substr(0, file.size() - 4);
    if (!OwnedByAnotherOrder(defs, name, stem)) files.push_back(OrderFolder(defs) + file);
  }
  return files;
}

std::vector<std::string> RemoveOrphanedTempFiles(const CGlobalDefs& defs) {
  const std::vector<std::string> removed = SweepOrphanedTempFiles(OrderFolder(defs));
  for (const std::string& path : removed) {
    Trace(true, "PILIB.PiOrder.RemoveTempFiles", "Removed temporary file of a killed build: %s",
          path);
  }
  return removed;
}

}  // namespace qm::order_files
