#include "index/order_check.h"

#include <algorithm>
#include <cstdint>
#include <optional>

#include "base/byte_layout.h"
#include "base/exception.h"
#include "base/value.h"
#include "config/global_defs.h"
#include "format/bfile.h"
#include "format/mfile.h"
#include "format/order_column_file.h"
#include "format/order_info.h"
#include "format/order_layout.h"
#include "index/damage_text.h"
#include "index/order_file_set.h"
#include "locks/lock_manager.h"
#include "platform/file_io.h"

namespace qm {

namespace {

constexpr std::size_t kMostProblems = 50;

std::string FileName(const std::string& path) { return path.substr(path.find_last_of('/') + 1); }


// A column file value (its encoded bytes) as a value of type, to be compared.
CValue DecodeColumnValue(const std::vector<uint8_t>& bytes, VALUE_TYPE type) {
  CValue value(type);
  switch (type) {
    case VALUE_TYPE::AsciiString:
      value.SetText(std::string_view(reinterpret_cast<const char*>(bytes.data()) + 2,
                                     bytes.size() - 2));
      break;
    case VALUE_TYPE::UnicodeString: {
      std::u16string text;
      for (std::size_t at = 2; at + 1 < bytes.size(); at += 2) {
        text.push_back(static_cast<char16_t>(bytes::LoadU16(bytes.data() + at)));
      }
      value.SetTextW(text);
      break;
    }
    case VALUE_TYPE::Integer: value.SetInteger(bytes::LoadI32(bytes.data())); break;
    case VALUE_TYPE::Double: value.SetDouble(bytes::LoadDouble(bytes.data())); break;
    case VALUE_TYPE::DateTime: value.SetDateTime(bytes::LoadDate(bytes.data())); break;
  }
  return value;
}

class OrderCheck {
 public:
  OrderCheck(const CGlobalDefs& defs, std::string_view name, std::vector<std::string>& problems)
      : defs_(defs), name_(name), problems_(problems) {}

  void Run() {
    const order_files::OrderPaths paths = order_files::PathsOf(defs_, name_);
    sri_name_ = FileName(paths.sri);
    srt_name_ = FileName(paths.srt);
    if (!platform::FileExists(paths.sri)) return Problem(sri_name_ + ": missing");
    try {
      BFile sri;
      sri.OpenFile(paths.sri, BFile::kReadOnly, order_files::kBlockUnits);
      info_.ReadInfo(sri);
    } catch (const CExceptionBase& e) {
      return Problem(sri_name_ + " header (block 0): does not read: " +
                     DamageText(e));
    }
    if (!Layouts()) return;
    if (!Rows(paths.srt)) return;
    if (info_.OrderType != kOrderTypeRanks) return;
    for (std::size_t i = 0; i < info_.Columns.size() && problems_.size() < kMostProblems; ++i) {
      Column(i);
    }
  }

 private:
  void Problem(std::string text) {
    if (problems_.size() < kMostProblems) problems_.push_back(std::move(text));
  }

  // The header's column layouts must describe rows of its type.
  bool Layouts() {
    if (info_.OrderType != kOrderTypeValues && info_.OrderType != kOrderTypeRanks) {
      Problem(sri_name_ + " header: order type " + std::to_string(info_.OrderType) +
              " is neither 1 (values) nor 2 (ranks)");
      return false;
    }
    if (info_.Columns.empty()) {
      Problem(sri_name_ + " header: no columns");
      return false;
    }
    int32_t first = 1;
    for (std::size_t i = 0; i < info_.Columns.size(); ++i) {
      const OrderColumnLayout layout = OrderColumnLayout::Of(info_.Columns[i]);
      const int32_t slots =
          info_.OrderType == kOrderTypeRanks ? 1 : ValueSlots(layout.type);
      const int32_t code = static_cast<int32_t>(layout.type);
      const bool known = code == 1 || code == 2 || code == 3 || code == 4 || code == 6;
      if (!known || layout.first != first || layout.slots != slots ||
          (info_.OrderType == kOrderTypeValues && IsTextType(layout.type))) {
        Problem(sri_name_ + " header: column " + info_.Columns[i].Name +
                " has a layout that does not fit an order of type " +
                std::to_string(info_.OrderType));
        return false;
      }
      first += slots;
    }
    width_ = first;
    return true;
  }

  bool Rows(const std::string& path) {
    std::string bytes;
    if (!platform::FileExists(path)) {
      Problem(srt_name_ + ": missing");
      return false;
    }
    if (!platform::ReadWholeFile(path, bytes)) {
      Problem(srt_name_ + ": does not read");
      return false;
    }
    const auto* p = reinterpret_cast<const uint8_t*>(bytes.data());
    if (bytes.size() < 4) {
      Problem(srt_name_ + ": truncated: " + std::to_string(bytes.size()) +
              " bytes, shorter than its row count");
      return false;
    }
    const int32_t count = bytes::LoadI32(p);
    const int64_t row_bytes = 4 * static_cast<int64_t>(width_);
    const int64_t expected = 4 + row_bytes * std::max(count, 0);
    if (count < 0 || static_cast<int64_t>(bytes.size()) != expected) {
      Problem(srt_name_ + ": " + std::to_string(bytes.size()) + " bytes, but " +
              std::to_string(count) + " rows of " + std::to_string(width_) +
              " integers take " + std::to_string(expected));
      return false;
    }
    if (count != info_.Count) {
      Problem(srt_name_ + ": " + std::to_string(count) + " rows, but the header counts " +
              std::to_string(info_.Count) + " keys");
    }
    rows_.resize(static_cast<std::size_t>(count) * static_cast<std::size_t>(width_));
    for (std::size_t i = 0; i < rows_.size(); ++i) rows_[i] = bytes::LoadI32(p + 4 + 4 * i);
    for (int32_t r = 1; r < count; ++r) {
      if (Key(r) <= Key(r - 1)) {
        Problem(srt_name_ + " row " + std::to_string(r + 1) + ": keys out of order (key " +
                std::to_string(Key(r)) + " after " + std::to_string(Key(r - 1)) + ")");
        return false;
      }
    }
    return true;
  }

  int32_t Count() const { return static_cast<int32_t>(rows_.size() / static_cast<std::size_t>(width_)); }
  int32_t Key(int32_t row) const { return rows_[static_cast<std::size_t>(row) * width_]; }
  int32_t Slot(int32_t row, int32_t column) const {
    return rows_[static_cast<std::size_t>(row) * width_ + static_cast<std::size_t>(column)];
  }
  // The row of key, or -1.
  int32_t RowOf(int32_t key) const {
    int32_t low = 0, high = Count();
    while (low < high) {
      const int32_t mid = low + (high - low) / 2;
      if (Key(mid) < key) low = mid + 1; else high = mid;
    }
    return low < Count() && Key(low) == key ? low : -1;
  }

  void Column(std::size_t i) {
    const OrderColumn& column = info_.Columns[i];
    const std::string path = order_files::ColumnFilePath(defs_, name_, column.Name);
    const std::string file_name = FileName(path);
    if (!platform::FileExists(path)) return Problem(file_name + ": missing");
    const VALUE_TYPE type = OrderColumnLayout::Of(column).type;
    const auto slot = static_cast<int32_t>(1 + i);
    int64_t covered = 0;
    int32_t rank = 0;
    try {
      MFile file;
      file.OpenFile(path, MFile::kReadOnly);
      OrderColumnReader reader(file, type);
      std::vector<uint8_t> value;
      std::vector<int32_t> keys;
      std::optional<CValue> previous;
      for (; reader.Next(value, keys); ++rank) {
        const std::string place = file_name + " value " + std::to_string(rank + 1);
        CValue current = DecodeColumnValue(value, type);
        const int order = previous ? current.Compare(*previous) : 1;
        if (order == -1 || order == 0) {
          Problem(place + ": not above the value before it");
        }
        previous = std::move(current);
        for (const int32_t key : keys) {
          const int32_t row = RowOf(key);
          if (row < 0) {
            Problem(place + ": key " + std::to_string(key) + " is not in " + srt_name_);
          } else if (Slot(row, slot) != rank) {
            Problem(place + ": key " + std::to_string(key) + " has rank " +
                    std::to_string(Slot(row, slot)) + " in " + srt_name_);
          }
          if (problems_.size() >= kMostProblems) return;
        }
        covered += static_cast<int64_t>(keys.size());
      }
    } catch (const CExceptionBase& e) {
      return Problem(file_name + " value " + std::to_string(rank + 1) +
                     ": does not read: " + DamageText(e));
    }
    int64_t ranked = 0;
    for (int32_t r = 0; r < Count(); ++r) {
      const int32_t value = Slot(r, slot);
      if (value == kNullSlot) continue;
      ++ranked;
      if (value < 0 || value >= rank) {
        Problem(srt_name_ + " row " + std::to_string(r + 1) + ": rank " + std::to_string(value) +
                " of column " + column.Name + " is not among its " + std::to_string(rank) +
                " values");
        return;
      }
    }
    if (ranked != covered) {
      Problem(file_name + ": lists " + std::to_string(covered) + " keys, but " + srt_name_ +
              " ranks " + std::to_string(ranked));
    }
  }

  const CGlobalDefs& defs_;
  std::string name_;
  std::vector<std::string>& problems_;
  std::string sri_name_;
  std::string srt_name_;
  COrderInfo info_;
  int32_t width_ = 1;
  std::vector<int32_t> rows_;
};

}  // namespace

std::vector<std::string> CheckOrderFiles(const CGlobalDefs& defs, std::string_view name) {
  std::vector<std::string> problems;
  CLockManager lock(defs.GetLockScope(), defs.GetGroup(), name, kLockOrder);
  lock.LockReader();
  OrderCheck(defs, name, problems).Run();
  return problems;
}

}  // namespace qm
