#include "index/word_sort.h"

#include <sqlext.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cmath>
#include <limits>
#include <new>
#include <optional>
#include <vector>

#include "base/error_numbers.h"
#include "index/document_column.h"
#include "index/entry_sort.h"
#include "index/entry_block_queue.h"
#include "index/entry_writer.h"
#include "index/word_splitting_thread.h"
#include "config/megabyte_setting.h"
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
constexpr std::size_t kDefaultColumnTextMb = 64;

std::atomic<int64_t> g_cut_values{0};

bool IsText(VALUE_TYPE t) { return t == VALUE_TYPE::AsciiString || t == VALUE_TYPE::UnicodeString; }

bool IsBinary(int16_t sql_type) {
  return sql_type == SQL_BINARY || sql_type == SQL_VARBINARY || sql_type == SQL_LONGVARBINARY;
}

// One indexed column of the result set, as the row loop reads it.
struct IndexedColumn {
  std::string name;
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
      c.name = name;
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

// Progress from 5 to 15 by rows read, in steps of at least 1%, when the
// driver knows how many rows come.
class RowProgress {
 public:
  RowProgress(CGlobalDefs& defs, int64_t expected) : defs_(defs), expected_(expected) {}
  void Row(int64_t rows) {
    if (expected_ <= 0 || rows < next_) return;
    const int64_t percent = std::min<int64_t>(100, rows * 100 / expected_);
    defs_.SetProgress(static_cast<int32_t>(5 + percent / 10));
    next_ = (percent + 1) * expected_ / 100 + 1;
  }

 private:
  CGlobalDefs& defs_;
  int64_t expected_;
  int64_t next_ = 0;
};

using Clock = std::chrono::steady_clock;

double SecondsSince(Clock::time_point start) {
  return std::chrono::duration<double>(Clock::now() - start).count();
}

}  // namespace

CPiSort::CPiSort(CGlobalDefs& defs) : defs_(defs) {}

void CPiSort::ExecuteSelect(CShareDatabase& database, CIndexHeader& definition) {
  const DateTimeValue now = SystemTimeToSQLTime(platform::CurrentLocalTime());
  definition.BuildTime = now;
  definition.LastUpdateTime = now;
  RowSelection::FromHeader(definition).Execute(database, defs_.TraceLevel1(), kSortTag);
}

int64_t CPiSort::CutValuesInProcess() { return g_cut_values.load(); }

std::size_t CPiSort::ConfiguredColumnTextBytes() {
  return ReadMegabyteSetting("max_column_text_mb", kDefaultColumnTextMb, 1);
}

int64_t CPiSort::WriteFindexRows(CShareDatabase& database, CIndexHeader& definition,
                                 MFile* sorted) {
  database.AllocateCache();
  const RowPlan plan(database, definition);
  definition.FindexType = plan.findex_type;
  Trace(defs_.TraceLevel1(), kSortTag, "Findex Type: %i", plan.findex_type);

  const auto type = static_cast<VALUE_TYPE>(plan.findex_type);
  const CColumnSet set = CColumnSet::FromGeneralFlags(definition.GeneralFlags);
  const SortEntryLayout layout(set.Width(), type);
  sorting_.emplace(defs_, layout, CEntrySort::ConfiguredMemoryBytes(), sorted,
                   sorted != nullptr ? method_ : EntrySortingThread::Method::Runs);
  merged_.emplace(layout, [this](std::vector<uint8_t>& block) { return PopMerged(block); });
  // Text is split on a thread of its own; other values are written here.
  std::optional<WordSplittingThread> splitting;
  std::optional<EntryWriter> writer;
  if (IsText(type)) {
    std::vector<int32_t> weights;
    for (const IndexedColumn& column : plan.columns) weights.push_back(column.weight);
    splitting.emplace(defs_, WordPipelineOptions::FromHeader(definition), sorting_->Queue(), layout,
                      set, std::move(weights));
  } else {
    writer.emplace(sorting_->Queue(), layout, set);
  }
  DocumentTexts documents(defs_);
  // Indexed text is read whole: a word anywhere in a value must be found.
  const std::size_t text_limit = ConfiguredColumnTextBytes();
  for (const IndexedColumn& column : plan.columns) {
    if (IsText(column.own_type) && !column.binary) database.SetWholeText(column.index, text_limit);
  }
  RowProgress progress(defs_, database.GetResultRowCount());

  RowKeys keys(plan.key_index, plan.key_type, plan.date_key_index, definition.SortMax,
               definition.MaxDateTimeKey);
  CValue value;
  std::string document_text;
  int64_t rows = 0;
  int64_t nulls = 0;

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
    const int32_t key = keys.Read<CPiSortException>(database, kRowsMethod);
    if (splitting) {
      splitting->StartRow(key);
    } else {
      writer->SetKey(key);
    }

    int32_t position = 0;
    for (std::size_t i = 0; i < plan.columns.size(); ++i) {
      const IndexedColumn& column = plan.columns[i];
      if (!IsText(type)) {
        if (i > 0) ++position;
        writer->SetWeight(column.weight);
        if (database.GetColumnValueFromCache(column.index, type, value) ==
                CShareDatabase::kValueNull ||
            (type == VALUE_TYPE::Double && std::isnan(value.GetDouble()))) {
          // NaN equals nothing, not even itself: no search could find it.
          ++nulls;
          continue;
        }
        writer->SetPosition(position);
        writer->Write([&](std::vector<uint8_t>& out) {
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
        splitting->Null();
        ++nulls;
        continue;
      }
      if (database.WasCut(column.index)) {
        ++cut_values_;
        ++g_cut_values;
        Trace(true, kRowsTag,
              "Column text longer than %i MB cut there. Findex: %s, Key: %i, Column: %s",
              static_cast<int64_t>(text_limit / (1024 * 1024)), definition.IndexName,
              key, column.name);
      }
      if (column.document.IsDocument()) {
        document_text = documents.Text(column.document, value.Narrow(), column.binary);
        splitting->Narrow(document_text);
      } else if (read_as == VALUE_TYPE::UnicodeString) {
        splitting->Wide(value.Wide());
      } else {
        splitting->Narrow(value.Narrow());
      }
    }
    if (splitting) splitting->EndRow();
    database.CleanCacheColumns();
    ++rows;
    if (rows % kRowTraceStep == 0) Trace(defs_.TraceLevel1(), kRowsTag, "Reading row %i", rows);
    progress.Row(rows);
    if (database.MoveNext() != CShareDatabase::kRowFetched) break;
  }

  const int64_t entries = splitting ? splitting->Finish() : writer->Entries();
  Trace(defs_.TraceLevel1(), kRowsTag, "End Status. Row Count %i, Word Count: %i, Null Count: %i",
        rows, entries, nulls);
  definition.SortMax = keys.SortMax();
  definition.MaxDateTimeKey = keys.MaxDateTimeKey();
  definition.KeyCount =
      static_cast<int32_t>(std::min<int64_t>(rows, std::numeric_limits<int32_t>::max()));
  return rows;
}

int64_t CPiSort::SortFindexTable(CIndexHeader& definition, MFile& sorted, NoRows no_rows) {
  const int64_t rows = Sort(definition, &sorted, no_rows);
  merged_.reset();
  sorting_.reset();
  return rows;
}

int64_t CPiSort::SortFindexRows(CIndexHeader& definition, NoRows no_rows) {
  return Sort(definition, nullptr, no_rows);
}

SortedEntries& CPiSort::Merged() {
  if (!merged_) throw CPiSortException::General("Merged");
  return *merged_;
}

bool CPiSort::PopMerged(std::vector<uint8_t>& block) {
  try {
    return Guard<CPiSortException, CPiSortUnknownException>("SortFindexTable", [&] {
      if (sorting_->PopMerged(block)) return true;
      phases_.merge = SecondsSince(merge_start_);
      phases_.runs = sorting_->RunSeconds();
      phases_.run_count = sorting_->Runs();
      return false;
    });
  } catch (...) {
    merge_failed_ = true;
    throw;
  }
}

int64_t CPiSort::Sort(CIndexHeader& definition, MFile* sorted, NoRows no_rows) {
  cut_values_ = 0;
  phases_ = Phases{};
  merge_failed_ = false;
  merged_.reset();
  sorting_.reset();
  return Guard<CPiSortException, CPiSortUnknownException>("SortFindexTable", [&] {
    // The connection stored with the findex serves when the caller set none;
    // the caller's settings stay as they are.
    CGlobalDefs source(defs_);
    if (!source.IsConnectionSet() && !definition.ConnectionString.empty()) {
      source.SetConnection(definition.ConnectionString, definition.DisplayName);
    }
    int64_t rows = 0;
    const Clock::time_point start = Clock::now();
    try {
      CShareDatabase database(source);
      database.Connect();
      ExecuteSelect(database, definition);
      rows = WriteFindexRows(database, definition, sorted);
    } catch (const EntryBlockQueue::Stopped&) {
      // The sorting thread failed first: its error ends the build.
      sorting_->Finish();
      throw CPiSortUnknownException::Unknown("SortFindexTable");
    } catch (...) {
      // Any other failure of the row loop stops the sorting thread and goes
      // on as it is.
      merged_.reset();
      sorting_.reset();
      throw;
    }
    phases_.row_loop = SecondsSince(start);
    if (rows == 0) {
      merged_.reset();
      sorting_.reset();
      if (no_rows == NoRows::Allow) return rows;
      throw CPiSortException::Numbered(kErrFindexNoRows, "SortFindexTable", nullptr);
    }
    defs_.SetProgress(15);
    merge_start_ = Clock::now();
    if (sorted == nullptr) {
      sorting_->CloseInput();
      return rows;
    }
    sorting_->Finish();
    phases_.merge = SecondsSince(merge_start_);
    phases_.runs = sorting_->RunSeconds();
    phases_.run_count = sorting_->Runs();
    return rows;
  });
}

}  // namespace qm
