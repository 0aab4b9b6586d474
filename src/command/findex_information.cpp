#include "command/findex_information.h"

#include "index/findex_file_set.h"
#include "index/findex_files.h"
#include "platform/text_encoding.h"
#include "quillmere/api_enums.h"
#include "base/exception.h"
#include "config/global_defs.h"
#include "base/sql_time.h"

namespace qm {

namespace {

std::string_view TypeName(int32_t type, std::string_view ansi_text) {
  switch (type) {
    case 1: return "Integer";
    case 6: return "Double";
    case 2: return ansi_text;
    case 4: return "Text (Unicode)";
    case 3: return "Date/Time";
    default: return "Error";
  }
}

std::string_view YesNo(int32_t flag) { return flag != 0 ? "Yes" : "No"; }

// The counts of a findex and its add-ons name_ADD_1, name_ADD_2, ... up to
// the first add-on that cannot be opened.
struct FindexTotals {
  int64_t words = 0;
  int64_t distinct_words = 0;
  int64_t keys = 0;
  int32_t add_ons = 0;

  void Add(const CIndexHeader& header) {
    words += header.WordCount;
    distinct_words += header.DistinctWordCount;
    keys += header.KeyCount;
  }
};

FindexTotals SumWithAddOns(CGlobalDefs& defs, std::string_view name, const CIndexHeader& main) {
  FindexTotals totals;
  totals.Add(main);
  for (int32_t n = 1;; ++n) {
    const std::string add_on = findex::AddOnName(name, n);
    if (!FindexFilesExist(defs, add_on)) break;
    try {
      totals.Add(ReadFindexHeaderShared(defs, add_on));
    } catch (const CExceptionBase&) {
      break;
    }
    totals.add_ons = n;
  }
  return totals;
}

}  // namespace

std::string_view FindexTypeName(int32_t type) { return TypeName(type, "Text (Ansi)"); }
std::string_view OrderTypeName(int32_t type) { return TypeName(type, "Text"); }

std::string FindexInformation(CGlobalDefs& defs, std::string_view name, int32_t info) {
  const CIndexHeader header = ReadFindexHeaderShared(defs, name);
  switch (info) {
    case idxTableName: return header.TableName;
    case idxColumnNames: return header.ColumnNames();
    case idxKeyName: return header.KeyColumn;
    case idxTypeName: return std::string(FindexTypeName(header.FindexType));
    case idxType: return std::to_string(header.FindexType);
    case idxVersion: return header.VersionText;
    case idxSQLUsedAsTable: return std::string(YesNo(header.SqlUsedAsTable));
    case idxSQLSelect: return ToLower(std::string_view(header.SqlSelect));
    case idxDBConnectionString: return header.ConnectionString;
    case idxDBDisplayName: return ToLower(std::string_view(header.DisplayName));
    case idxBuildTime: return SQLTimeToString(header.BuildTime);
    case idxLastUpdateTime: return SQLTimeToString(header.LastUpdateTime);
    case idxWordCount: return std::to_string(SumWithAddOns(defs, name, header).words);
    case idxDistinctWordCount:
      return std::to_string(SumWithAddOns(defs, name, header).distinct_words);
    case idxKeyCount: return std::to_string(SumWithAddOns(defs, name, header).keys);
    case idxFracmentationLevel: return std::to_string(SumWithAddOns(defs, name, header).add_ons);
    default: return {};
  }
}

std::string OrderInformation(const COrderInfo& info, int32_t value) {
  std::string text;
  switch (value) {
    case odrTableName: text = info.TableName; break;
    case odrColumnNames: text = info.ColumnNames(); break;
    case odrKeyName: text = info.KeyColumn; break;
    case odrTypeName: text = OrderTypeName(info.OrderType); break;
    case odrType: text = std::to_string(info.OrderType); break;
    case odrVersion: text = info.VersionText; break;
    case odrSQLUsedAsTable: text = YesNo(info.SqlUsedAsTable); break;
    case odrSQLSelect: text = info.SqlSelect; break;
    case odrDBConnectionString: text = info.ConnectionString; break;
    case odrDBDisplayName: text = info.DisplayName; break;
    case odrBuildTime: text = SQLTimeToString(info.BuildTime); break;
    case odrLastUpdateTime: text = SQLTimeToString(info.LastUpdateTime); break;
    default: break;
  }
  return ToLower(std::string_view(text));
}

}  // namespace qm
