#include "format/order_info.h"

#include <utility>

#include "format/bfile.h"
#include "format/block.h"
#include "format/header_block_io.h"
#include "base/sql_time.h"
#include "base/trace.h"

namespace qm {

namespace {

constexpr std::string_view kVersionMessage =
    "Unsupported order version. Quillmere Search v%S does not support orders build with "
    "Quillmere Search lower than v%S";

// Every field of block 0 in file order.
template <class Io, class Info>
void OrderInfoFields(Io& io, Info& o) {
  io.Version(o.Version);
  io.VersionText(o.VersionText);
  io.Int(o.OrderType);
  io.Str(o.OrderName);
  io.Str(o.TableName);
  io.Int(o.SqlUsedAsTable);
  io.Str(o.SqlSelect);

  // Column list: count, then per column its name and the builder's three ints.
  int32_t columns = static_cast<int32_t>(o.Columns.size());
  io.Count(columns);
  if constexpr (Io::kReads) {
    OrderColumnList read;
    for (int32_t i = 0; i < columns; ++i) {
      OrderColumn column;
      io.Str(column.Name);
      for (int32_t& v : column.BuilderValues) io.Int(v);
      read.push_back(std::move(column));
    }
    o.Columns = std::move(read);
  } else {
    for (const OrderColumn& column : o.Columns) {
      io.Str(column.Name);
      for (int32_t v : column.BuilderValues) io.Int(v);
    }
  }

  io.Str(o.KeyColumn);
  io.Int(o.Count);
  io.Int(o.SortMax);
  io.Connection(o.ConnectionString, true);
  io.Str(o.DisplayName);
  io.Date(o.BuildTime);
  io.Date(o.LastUpdateTime);
  io.Str(o.DateTimeKeyColumn);
  io.Date(o.MaxDateTimeKey);
  io.Int(o.GeneralFlags);
  io.StrW(o.IgnoreChars);
  io.Int(o.UpdateFlags);
}

}  // namespace

namespace {
constexpr auto kFields = [](auto& io, auto& info) { OrderInfoFields(io, info); };
}  // namespace

void COrderInfo::ReadInfo(BFile& file) {
  Guard<CHighStructuresException, CHighStructuresUnknownException>("COrderInfo::ReadInfo", [&] {
    COrderInfo read = header_io::ReadBlockZero<COrderInfo>(file, kVersionMessage, kFields);
    read.UpdateSupport = UpdateSupport;
    *this = std::move(read);
    Trace(TraceLevel2.load(), "PILIB,GILIB.(SHARELIB)COrderInfo.ReadInfo", "Order info read");
  });
}

void COrderInfo::WriteInfo(BFile& file) const {
  Guard<CHighStructuresException, CHighStructuresUnknownException>("COrderInfo::WriteInfo", [&] {
    Trace(TraceLevel2.load(), "PILIB,GILIB.(SHARELIB)COrderInfo.WriteInfo", "Writing order info");
    header_io::WriteBlockZero(file, *this, kFields,
                              "Order definition too long: its header needs %i bytes, block 0 holds %i",
                              "COrderInfo::WriteInfo");
  });
}

int64_t COrderInfo::EncodedSize() const { return header_io::EncodedSize(*this, kFields); }

bool COrderInfo::FitsHeaderBlock() const { return EncodedSize() <= header_io::kMaxEncodedSize; }

std::string COrderInfo::GetSelectDataSQL(bool date_style) const {
  constexpr const char* kMethod = "GetSelectDataSQL::ReadInfo";
  try {
    std::string sql;
    if (SqlUsedAsTable != 0) {
      sql = "select * from (" + SqlSelect + ") as temp_table";
    } else {
      sql = "select " + KeyColumn;
      for (const OrderColumn& column : Columns) sql += "," + column.Name;
      sql += " from " + TableName;
    }
    if (SortMax > 0) {
      if ((UpdateFlags & 1) != 0) {
        const char* quote = date_style ? "#" : "'";
        sql += " where " + DateTimeKeyColumn + ">" + quote +
               SQLTimeToSqlLiteral(MaxDateTimeKey, (UpdateFlags & 2) != 0) + quote;
      } else {
        sql += " where " + KeyColumn + ">" + std::to_string(SortMax);
      }
    }
    return sql;
  } catch (const CException& e) {
    throw CHighStructuresException::General(kMethod, &e);
  } catch (...) {
    throw CHighStructuresException::General(kMethod);  // running out of memory
  }
}

}  // namespace qm
