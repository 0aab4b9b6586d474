#include "search/gi_order.h"

#include <utility>

#include "base/exception_family.h"
#include "base/plain_name.h"
#include "config/global_defs.h"
#include "format/items.h"
#include "format/order_column_file.h"
#include "format/order_layout.h"
#include "index/order_file_set.h"
#include "locks/lock_manager.h"
#include "platform/file_io.h"
#include "platform/text_encoding.h"

namespace qm {

namespace {

template <class Body>
decltype(auto) GuardOrder(const char* method, Body&& body) {
  return Guard<CGiOrderException, CGiOrderUnknownException>(method, std::forward<Body>(body));
}

}  // namespace

CGiOrder::CGiOrder(const CGlobalDefs& defs) : defs_(defs) {}

CGiOrder::~CGiOrder() { Close(); }

void CGiOrder::Close() {
  sri_.Close();
  srt_.Close();
  lock_.reset();  // the files first: the builder may swap them once the unit is back
  info_ = COrderInfo{};
  open_ = false;
}

bool CGiOrder::Exists(std::string_view name) const {
  if (!IsPlainName(name)) return false;
  return platform::FileExists(defs_.GetFullDataPath(FolderKind::Orders) + ToUpper(name) + ".odr");
}

bool CGiOrder::HasColumn(std::string_view column) const {
  const std::string wanted = ToUpper(column);
  for (const OrderColumn& c : info_.Columns) {
    if (ToUpper(c.Name) == wanted) return true;
  }
  return false;
}

void CGiOrder::OpenOrder(std::string_view name, int32_t mode) {
  constexpr const char* kMethod = "OpenOrder";
  GuardOrder(kMethod, [&] {
    RequirePlainName<CGiOrderException>("order", name, kMethod);
    if (mode != kModeRead) {
      throw CGiOrderException::Text("Unknown order mode %i: a search opens orders for reading (3)",
                                    kMethod, nullptr, mode);
    }
    Close();
    const order_files::OrderPaths paths = order_files::PathsOf(defs_, name);
    try {
      lock_ = std::make_unique<CLockManager>(defs_.GetLockScope(), defs_.GetGroup(), name, kLockOrder);
      lock_->LockReader();
      sri_.OpenFile(paths.sri, BFile::kReadOnly, order_files::kBlockUnits);
      try {
        info_.ReadInfo(sri_);
      } catch (const CException& e) {
        throw CGiOrderException::Text("Error reading order header", kMethod, &e);
      }
      srt_.OpenFile(paths.srt, MFile::kReadOnly);
    } catch (...) {
      Close();
      throw;
    }
    name_ = std::string(name);
    sri_path_ = paths.sri;
    srt_path_ = paths.srt;
    open_ = true;
  });
}

void CGiOrder::ReadRows(CItems& rows) {
  constexpr const char* kMethod = "ReadRows";
  GuardOrder(kMethod, [&] {
    if (!open_) throw CGiOrderException::Text("Order is not open", kMethod, nullptr);
    const int32_t width = StoredRowWidth(info_);
    rows = CItems(width);
    try {
      rows.Read(srt_);
    } catch (const CException& e) {
      throw CGiOrderException::Text("Order file is damaged: %s", kMethod, &e, srt_path_);
    }
    bool sound = srt_.FileSize(false) == 4 + int64_t{rows.Count()} * 4 * width;
    for (int32_t i = 1; sound && i < rows.Count(); ++i) sound = rows.Key(i - 1) < rows.Key(i);
    if (!sound) throw CGiOrderException::Text("Order file is damaged: %s", kMethod, nullptr, srt_path_);
  });
}

std::vector<std::vector<uint8_t>> CGiOrder::ReadColumnValues(const OrderColumn& column) {
  constexpr const char* kMethod = "ReadColumnValues";
  return GuardOrder(kMethod, [&] {
    if (!open_) throw CGiOrderException::Text("Order is not open", kMethod, nullptr);
    MFile file;
    file.OpenFile(order_files::ColumnFilePath(defs_, name_, column.Name), MFile::kReadOnly);
    OrderColumnReader reader(file, OrderColumnLayout::Of(column).type);
    std::vector<std::vector<uint8_t>> values;
    std::vector<uint8_t> value;
    std::vector<int32_t> keys;
    while (reader.Next(value, keys)) values.push_back(value);
    return values;
  });
}

}  // namespace qm
