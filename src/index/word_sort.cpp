#include "index/word_sort.h"

#include <sqlext.h>

#include <algorithm>
#include <cmath>
#include <limits>
#include <new>
#include <optional>
#include <vector>

#include "base/error_numbers.h"
#include "index/document_column.h"
#include "index/entry_sort.h"
#include "format/findex_type.h"
#include "index/row_keys.h"
#include "index/row_selection.h"
#include "format/sort_entry.h"
#include "format/sort_stream.h"
#include "platform/local_time.h"
#include "format/column_set.h"
#include "base/exception_family.h"
#include "base/sql_time.h"
#include "base/trace.h"
#include "sources/share_database.h"
#include "text/word_pipeline.h"

namespace qm {

namespace {

constexpr const char* kSortTag = "PILIB.PiSort.SortFindexTable";
constexpr const char* kRowsTag = "PILIB.PiSort.WriteFindexRows";
constexpr const char* kRowsMethod = "WriteFindexRows";
constexpr int64_t kRowTraceStep = 100000;

bool IsText(VALUE_TYPE t) { return t == VALUE_TYPE::AsciiString || t == VALUE_TYPE::UnicodeString; }

bool IsBinary(int16_t sql_type) {
  return sql_type == SQL_BINARY || sql_type == SQL_VARBINARY || sql_type == SQL_LONGVARBINARY;
}

// One indexed column of the result set, as the row loop reads it.
struct IndexedColumn {
  int index = 0;  // 1-based, in the result set
  VALUE_TYPE own_type = VALUE_TYPE::AsciiString;
  bool binary = false;
  int32_t weight = 1;
  DocumentColumn document;
};

// The 1-based result column of name, or the error a missing one gives.
int RequireColumn(const CShareDatabase& database, const std::string& name) {
  const int index = database.GetColumnIndex(name);
  if (index == 0) {
    throw CPiSortException::Text("Column name %S does not exist", kRowsMethod, nullptr, name);
  }
  return index;
}

// What the row loop needs to know of every column, fixed once per build.
struct RowPlan {
  int key_index = 0;
  VALUE_TYPE key_type = VALUE_TYPE::Integer;
  int date_key_index = 0;  // 0: the date/time update key is not in use
  std::vector<IndexedColumn> columns;
  int32_t findex_type = 0;

  RowPlan(const CShareDatabase& database, const CIndexHeader& definition) {
    const bool by_name = definition.SqlUsedAsTable != 0;
    key_index = by_name ? RequireColumn(database, definition.KeyColumn) : 1;
    key_type = database.MapColumnType(key_index);
    if (RowSelection::FromHeader(definition).UsesDateTimeKey()) {
      date_key_index = RequireColumn(database, definition.DateTimeKeyColumn);
    }
    int next = 2;
    for (const auto& [name, tags] : definition.Columns) {
      IndexedColumn c;
      c.index = by_name ? RequireColumn(database, name) : next++;
      c.own_type = database.GetFieldType(c.index);
      c.binary = IsBinary(database.GetColumnDescription(c.index).sql_type);
      c.weight = ContentWeight(tags);
      c.document = DocumentColumn::FromTags(tags);
      findex_type = NextFindexType(findex_type, c.own_type);
      columns.push_back(std::move(c));
    }
  }
};

// The row loop's writer of entries: the item row of the current row and
// column, one value after it, into the raw file.
class EntryWriter {
 public:
  EntryWriter(MFile& raw, const SortEntryLayout& layout, const CColumnSet& set)
      : layout_(layout), row_(static_cast<std::size_t>(set.Width()), 0),
        score_column_(set.s != 0 ? set.ScoreColumn() : -1),
        position_column_(set.p != 0 ? set.PositionColumn() : -1) {
    raw_.Start(raw);
  }

  void SetKey(int32_t key) { row_[0] = key; }
  void SetWeight(int32_t weight) {
    if (score_column_ >= 0) row_[static_cast<std::size_t>(score_column_)] = weight;
  }
  void SetPosition(int32_t position) {
    if (position_column_ >= 0) row_[static_cast<std::size_t>(position_column_)] = position;
  }

  template <class Append>
  void Write(Append&& append_value) {
    entry_.clear();
    SortEntryLayout::AppendRow(entry_, row_);
    append_value(entry_);
    raw_.Put(entry_.data(), entry_.size());
    ++entries_;
  }
  void WriteText(std::u16string_view word) {
    Write([&](std::vector<uint8_t>& out) { layout_.AppendText(out, word); });
  }

  int64_t Entries() const { return entries_; }
  // REQUIRES: before the raw file is read.
  void Finish() { raw_.Finish(); }

 private:
  SortFileWriter raw_;
  const SortEntryLayout& layout_;
  std::vector<int32_t> row_;
  int32_t score_column_;
  int32_t position_column_;
  std::vector<uint8_t> entry_;
  int64_t entries_ = 0;
};

}  // namespace

CPiSort::CPiSort(CGlobalDefs& defs) : defs_(defs) {}

void CPiSort::ExecuteSelect(CShareDatabase& database, CIndexHeader& definition) {
  const DateTimeValue now = SystemTimeToSQLTime(platform::CurrentLocalTime());
  definition.BuildTime = now;
  definition.LastUpdateTime = now;
  RowSelection::FromHeader(definition).Execute(database, defs_.TraceLevel1(), kSortTag);
}

int64_t CPiSort::WriteFindexRows(CShareDatabase& database, MFile& raw, CIndexHeader& definition) {
  database.AllocateCache();
  const RowPlan plan(database, definition);
  definition.FindexType = plan.findex_type;
  Trace(defs_.TraceLevel1(), kSortTag, "Findex Type: %i", plan.findex_type);

  const auto type = static_cast<VALUE_TYPE>(plan.findex_type);
  const CColumnSet set = CColumnSet::FromGeneralFlags(definition.GeneralFlags);
  const SortEntryLayout layout(set.Width(), type);
  EntryWriter writer(raw, layout, set);
  std::optional<CWordPipeline> pipeline;
  if (IsText(type)) pipeline.emplace(defs_, WordPipelineOptions::FromHeader(definition));
  DocumentTexts documents(defs_);

  RowKeys keys(plan.key_index, plan.key_type, plan.date_key_index, definition.SortMax,
               definition.MaxDateTimeKey);
  CValue value;
  std::string document_text;
  int64_t rows = 0;
  int64_t nulls = 0;

  auto write_words = [&](const auto& text, int32_t& position) {
    pipeline->WrittenWords(text, position, [&](const SplitWord& word) {
      writer.SetPosition(word.position);
      writer.WriteText(word.form);
    });
  };

  defs_.SetProgress(5);
  while (database.IsRowAvailable()) {
    Trace(defs_.TraceLevel3(), kRowsTag, "Caching columns");
    try {
      database.CacheColumns();
    } catch (const CShareDatabaseWarning& warning) {
      Trace(true, kRowsTag,
            // Text kept as written: callers match on it. Do not correct.
            "Fetching database rows interupted because of database warning (probably a harmless "
            "no rows available): %S",
            warning.GetCurrentEntry().text);
      break;
    }
    writer.SetKey(keys.Read<CPiSortException>(database, kRowsMethod));

    int32_t position = 0;
    for (std::size_t i = 0; i < plan.columns.size(); ++i) {
      const IndexedColumn& column = plan.columns[i];
      if (i > 0) ++position;
      writer.SetWeight(column.weight);
      if (!IsText(type)) {
        if (database.GetColumnValueFromCache(column.index, type, value) ==
                CShareDatabase::kValueNull ||
            (type == VALUE_TYPE::Double && std::isnan(value.GetDouble()))) {
          // NaN equals nothing, not even itself: no search could find it.
          ++nulls;
          continue;
        }
        writer.SetPosition(position);
        writer.Write([&](std::vector<uint8_t>& out) {
          if (type == VALUE_TYPE::Integer) {
            SortEntryLayout::AppendInteger(out, value.GetInteger());
          } else if (type == VALUE_TYPE::Double) {
            SortEntryLayout::AppendDouble(out, value.GetDouble());
          } else {
            SortEntryLayout::AppendDate(out, value.GetDateTime());
          }
        });
        continue;
      }
      // Text columns are split as they come (narrow or wide alike); other
      // columns become text of the findex type first.
      const VALUE_TYPE read_as =
          column.document.IsDocument() ? VALUE_TYPE::AsciiString
                                       : (IsText(column.own_type) ? column.own_type : type);
      if (database.GetColumnValueFromCache(column.index, read_as, value) ==
          CShareDatabase::kValueNull) {
        ++nulls;
        continue;
      }
      if (column.document.IsDocument()) {
        document_text = documents.Text(column.document, value.Narrow(), column.binary);
        write_words(std::string_view(document_text), position);
      } else if (read_as == VALUE_TYPE::UnicodeString) {
        write_words(value.Wide(), position);
      } else {
        write_words(value.Narrow(), position);
      }
    }
    database.CleanCacheColumns();
    ++rows;
    if (rows % kRowTraceStep == 0) Trace(defs_.TraceLevel1(), kRowsTag, "Reading row %i", rows);
    if (database.MoveNext() != CShareDatabase::kRowFetched) break;
  }

  writer.Finish();
  Trace(defs_.TraceLevel1(), kRowsTag, "End Status. Row Count %i, Word Count: %i, Null Count: %i",
        rows, writer.Entries(), nulls);
  definition.SortMax = keys.SortMax();
  definition.MaxDateTimeKey = keys.MaxDateTimeKey();
  definition.KeyCount =
      static_cast<int32_t>(std::min<int64_t>(rows, std::numeric_limits<int32_t>::max()));
  return rows;
}

int64_t CPiSort::SortFindexTable(CIndexHeader& definition, MFile& sorted, NoRows no_rows) {
  return Guard<CPiSortException, CPiSortUnknownException>("SortFindexTable", [&] {
    // The connection stored with the findex serves when the caller set none;
    // the caller's settings stay as they are.
    CGlobalDefs source(defs_);
    if (!source.IsConnectionSet() && !definition.ConnectionString.empty()) {
      source.SetConnection(definition.ConnectionString, definition.DisplayName);
    }
    MFile raw;
    int64_t rows = 0;
    {
      CShareDatabase database(source);
      database.Connect();
      ExecuteSelect(database, definition);
      CEntrySort::OpenSortFile(defs_, raw);
      rows = WriteFindexRows(database, raw, definition);
    }
    if (rows == 0) {
      if (no_rows == NoRows::Allow) return rows;
      throw CPiSortException::Numbered(kErrFindexNoRows, "SortFindexTable", nullptr);
    }
    defs_.SetProgress(15);

    const CColumnSet set = CColumnSet::FromGeneralFlags(definition.GeneralFlags);
    CEntrySort sort(defs_, SortEntryLayout(set.Width(), static_cast<VALUE_TYPE>(definition.FindexType)),
                    CEntrySort::Module::PiSort);
    sort.Sort(raw, sorted);
    return rows;
  });
}

}  // namespace qm
