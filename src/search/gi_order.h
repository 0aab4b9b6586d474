// CGiOrder: one order opened by a search, to attach its values to result
// rows. While open it holds a reader unit of the order's kind 3 lock, so the
// order builder cannot swap the files under an attached order.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "format/bfile.h"
#include "format/mfile.h"
#include "format/order_info.h"

namespace qm {

class CGlobalDefs;
class CItems;
class CLockManager;

class CGiOrder {
 public:
  // The only OpenOrder mode: read an existing order.
  static constexpr int32_t kModeRead = 3;

  // REQUIRES: defs outlives this object.
  explicit CGiOrder(const CGlobalDefs& defs);
  ~CGiOrder();
  CGiOrder(const CGiOrder&) = delete;
  CGiOrder& operator=(const CGiOrder&) = delete;

  // Opens NAME.sri and NAME.srt and reads the order info, under a reader unit
  // of the order's lock kept until Close. A name that is not plain is refused
  // before any file opens; "Error reading order header" when the info cannot
  // be read.
  void OpenOrder(std::string_view name, int32_t mode);
  void Close();
  bool IsOpen() const { return open_; }

  // Whether the marker NAME.odr exists in the order folder (the test of the
  // repository name choice).
  bool Exists(std::string_view name) const;
  // Whether the order was built for column (compared in upper case).
  bool HasColumn(std::string_view column) const;

  const std::string& Name() const { return name_; }
  const COrderInfo& Info() const { return info_; }

  // The stored rows (key, then the column slots), ascending by key. Raises
  // "Order file is damaged: %s" when the .srt does not hold whole rows of the
  // width the info describes, one per key in ascending order.
  void ReadRows(CItems& rows);
  // The encoded values of a type 2 order's column, by rank (its column file).
  std::vector<std::vector<uint8_t>> ReadColumnValues(const OrderColumn& column);

 private:
  const CGlobalDefs& defs_;
  bool open_ = false;
  std::string name_;
  std::string sri_path_;
  std::string srt_path_;
  BFile sri_;
  MFile srt_;
  COrderInfo info_;
  std::unique_ptr<CLockManager> lock_;
};

}  // namespace qm
