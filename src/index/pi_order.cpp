#include "index/pi_order.h"

#include <algorithm>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "base/error_numbers.h"
#include "index/entry_sort.h"
#include "format/order_column_file.h"
#include "index/order_file_set.h"
#include "format/order_layout.h"
#include "index/order_rank_merge.h"
#include "index/order_read_keys.h"
#include "index/order_source.h"
#include "index/order_text.h"
#include "format/sort_entry.h"
#include "format/sort_stream.h"
#include "locks/lock_manager.h"
#include "platform/file_io.h"
#include "platform/text_encoding.h"
#include "format/bfile.h"
#include "base/exception_family.h"
#include "format/items.h"
#include "format/mfile.h"
#include "base/plain_name.h"
#include "base/trace.h"
#include "config/file_operations.h"

namespace qm {

namespace {

constexpr const char* kValuesTag = "PILIB.PiOrder.BuildOrderInt";
constexpr const char* kRanksTag = "PILIB.PiOrderSort.SortRawData";
constexpr const char* kRanksMethod = "BuildOrderAll";
constexpr int32_t kIgnoreCaseFlag = 1;
constexpr int32_t kSaveConnectionFlag = 2;

template <class Body>
decltype(auto) GuardOrder(const char* method, Body&& body) {
  return Guard<CPiOrderException, CPiOrderUnknownException>(method, std::forward<Body>(body));
}

template <class Body>
decltype(auto) GuardSort(const char* method, Body&& body) {
  return Guard<CPiOrderSortException, CPiOrderSortUnknownException>(method,
                                                                    std::forward<Body>(body));
}

// An update merges its rows with values prepared the stored order's way, so
// that is the way for the new ones too; it starts where the stored order's
// rows end.
void TakeOverStored(COrderInfo& definition, const COrderInfo& stored) {
  definition.SortMax = stored.SortMax;
  definition.MaxDateTimeKey = stored.MaxDateTimeKey;
  definition.GeneralFlags =
      (definition.GeneralFlags & ~kIgnoreCaseFlag) | (stored.GeneralFlags & kIgnoreCaseFlag);
  definition.IgnoreChars = stored.IgnoreChars;
}

void RequireUnchanged(const COrderInfo& stored, const COrderInfo& definition, int32_t type,
                      const std::vector<OrderColumnLayout>& layouts, const char* method) {
  bool same = stored.OrderType == type && stored.Columns.size() == definition.Columns.size();
  for (std::size_t i = 0; same && i < layouts.size(); ++i) {
    same = ToUpper(stored.Columns[i].Name) == ToUpper(definition.Columns[i].Name) &&
           OrderColumnLayout::Of(stored.Columns[i]) == layouts[i];
  }
  if (!same) {
    throw CPiOrderSortException::Text("Order definition changed, rebuild required", method,
                                      nullptr);
  }
}

// The rows of a stored .srt: the count, then count rows of width integers,
// keys strictly ascending.
void ReadStoredRows(MFile& srt, int32_t width, CItems& rows) {
  rows.Read(srt);
  const int64_t expected = 4 + int64_t{rows.Count()} * 4 * width;
  bool sound = srt.FileSize(false) == expected;
  for (int32_t i = 1; sound && i < rows.Count(); ++i) sound = rows.Key(i - 1) < rows.Key(i);
  if (!sound) {
    throw CPiOrderSortException::Text("Order file is damaged: %s", "ReadStoredRows", nullptr,
                                      srt.Path());
  }
}

}  // namespace

struct CPiOrder::State {
  int32_t mode = 0;  // 0 while closed
  std::string name;
  // mode 3
  COrderInfo info;
  BFile sri;
  MFile srt;
  std::vector<std::unique_ptr<MFile>> columns;
  // mode 1
  std::unique_ptr<order_files::BuildFiles> build;
};

// One build in progress: what every step needs.
struct CPiOrder::Build {
  COrderInfo& definition;
  bool rebuild;
  CPiOrder& existing;  // open in mode 3 for an update
  OrderSource& source;
  std::vector<OrderColumnLayout> layouts;
};

CPiOrder::CPiOrder(CGlobalDefs& defs) : defs_(defs), state_(std::make_unique<State>()) {}

CPiOrder::~CPiOrder() { CloseOrder(); }

bool CPiOrder::IsOpen() const { return state_->mode != 0; }

void CPiOrder::CloseOrder() {
  state_->sri.Close();
  state_->srt.Close();
  state_->columns.clear();
  state_->build.reset();  // removes build files not moved into place
  state_->mode = 0;
}

const COrderInfo& CPiOrder::Info() const {
  if (state_->mode != kModeRead) throw CPiOrderException::General("Info");
  return state_->info;
}

void CPiOrder::OpenOrder(std::string_view name, int32_t mode, std::size_t column_files) {
  constexpr const char* kMethod = "OpenOrder";
  GuardOrder(kMethod, [&] {
    RequirePlainName<CPiOrderException>("order", name, kMethod);
    CloseOrder();
    if (mode == kModeCreate) {
      state_->build = std::make_unique<order_files::BuildFiles>(defs_, column_files);
    } else if (mode == kModeRead) {
      const order_files::OrderPaths paths = order_files::PathsOf(defs_, name);
      // Held while the files are opened: they are the files of one build.
      CLockManager lock(defs_.GetLockScope(), defs_.GetGroup(), name, kLockOrder);
      lock.LockReader();
      try {
        state_->sri.OpenFile(paths.sri, BFile::kReadOnly, order_files::kBlockUnits);
        try {
          state_->info.ReadInfo(state_->sri);
        } catch (const CException& e) {
          throw CPiOrderException::Text("Error reading order header", kMethod, &e);
        }
        state_->srt.OpenFile(paths.srt, MFile::kReadOnly);
        if (state_->info.OrderType == kOrderTypeRanks) {
          for (const OrderColumn& column : state_->info.Columns) {
            auto file = std::make_unique<MFile>();
            file->OpenFile(order_files::ColumnFilePath(defs_, name, column.Name), MFile::kReadOnly);
            state_->columns.push_back(std::move(file));
          }
        }
      } catch (...) {
        CloseOrder();
        throw;
      }
    } else {
      throw CPiOrderException::Text(
          "Unknown order mode %i: orders open for reading (3) or for a build (1)", kMethod, nullptr,
          mode);
    }
    state_->name = std::string(name);
    state_->mode = mode;
  });
}

void CPiOrder::BuildOrderInt(COrderInfo& definition, bool rebuild) {
  BuildOrder(definition, rebuild, false, "BuildOrderInt");
}

void CPiOrder::BuildOrderAll(COrderInfo& definition, bool rebuild) {
  BuildOrder(definition, rebuild, true, kRanksMethod);
}

void CPiOrder::BuildOrder(COrderInfo& definition, bool rebuild, bool ranks_only,
                          const char* method) {
  GuardSort(method, [&] {
    order_files::CheckNames(definition, method);
    CloseOrder();
    order_files::RemoveOrphanedTempFiles(defs_);
    const std::string& name = definition.OrderName;
    CPiOrder existing(defs_);
    std::optional<COrderInfo> replaced;  // the stored order's header, when there is one
    if (rebuild) {
      definition.SortMax = 0;
      definition.MaxDateTimeKey = {};
      if (platform::FileExists(order_files::PathsOf(defs_, name).sri)) {
        try {
          replaced = order_files::ReadInfoShared(defs_, name);
        } catch (const CException&) {
          // A damaged order is replaced whole; its column files are unknown.
        }
      }
    } else {
      existing.OpenOrder(name, kModeRead);
      replaced = existing.Info();
      TakeOverStored(definition, *replaced);
    }

    OrderSource source(defs_, definition, method);
    // The driver may give the stored order's text in the other form (the
    // Unicode PostgreSQL driver gives it wide since connections use the wide
    // calls); the stored column files stay in theirs.
    if (!rebuild) source.KeepTextForms(*replaced);
    // An update keeps the stored order's type 2: its values stay ranks.
    const bool ranks = ranks_only || source.HasTextColumn() ||
                       (!rebuild && replaced->OrderType == kOrderTypeRanks);
    const int32_t type = ranks ? kOrderTypeRanks : kOrderTypeValues;
    Build build{definition, rebuild, existing, source, source.Layouts(ranks)};
    Trace(defs_.TraceLevel1(), ranks ? kRanksTag : kValuesTag, "Order Type: %i", type);
    if (!rebuild) RequireUnchanged(*replaced, definition, type, build.layouts, method);

    CItems rows(1);
    const bool built = ranks ? GuardSort(kRanksMethod, [&] { return BuildRanks(build, rows); })
                             : BuildValues(build, rows, method);
    if (!built) {
      // An update that found nothing new keeps the order as it is.
      Trace(defs_.TraceLevel1(), ranks ? kRanksTag : kValuesTag,
            "No new rows for order %s, nothing to update", name);
      CloseOrder();
      defs_.SetProgress(100);
      return;
    }

    definition.OrderType = type;
    for (std::size_t i = 0; i < build.layouts.size(); ++i) {
      build.layouts[i].StoreIn(definition.Columns[i]);
    }
    definition.Count = rows.Count();
    definition.SortMax = source.SortMax();
    definition.MaxDateTimeKey = source.MaxDateTimeKey();
    definition.LastUpdateTime = source.StartTime();
    definition.BuildTime = rebuild || !replaced ? source.StartTime() : replaced->BuildTime;
    definition.ConnectionString =
        (definition.GeneralFlags & kSaveConnectionFlag) != 0 ? source.ConnectionString() : "";
    definition.DisplayName = source.DisplayName();
    existing.CloseOrder();

    {
      MFile srt;
      srt.OpenFile(state_->build->Srt(), MFile::kCreate);
      rows.Write(srt);
      srt.MCommit();
      srt.Close();
      BFile sri;
      sri.OpenFile(state_->build->Sri(), BFile::kCreate, order_files::kBlockUnits);
      definition.WriteInfo(sri);
      sri.Close();
    }

    // The replaced order's column files that the new order does not have.
    std::vector<std::string> obsolete;
    if (replaced && replaced->OrderType == kOrderTypeRanks) {
      std::vector<std::string> kept;
      if (ranks) {
        for (const OrderColumn& c : definition.Columns) {
          kept.push_back(order_files::ColumnFilePath(defs_, name, c.Name));
        }
      }
      for (const OrderColumn& c : replaced->Columns) {
        const std::string path = order_files::ColumnFilePath(defs_, name, c.Name);
        if (std::find(kept.begin(), kept.end(), path) == kept.end()) obsolete.push_back(path);
      }
    }
    Trace(defs_.TraceLevel1(), ranks ? kRanksTag : kValuesTag, "Renaming order: %s", name);
    RenameOrder2(definition, obsolete);
    defs_.SetProgress(100);
  });
}

bool CPiOrder::BuildValues(Build& build, CItems& out, const char* method) {
  const std::vector<OrderColumnLayout>& layouts = build.layouts;
  int32_t width = 1;
  for (const OrderColumnLayout& layout : layouts) width += layout.slots;

  Trace(defs_.TraceLevel1(), kValuesTag, "----- Building Order.\n");
  std::vector<int32_t> read_rows;  // width integers a row, in read order
  std::vector<int32_t> read_keys;
  std::vector<int32_t> row(static_cast<std::size_t>(width));
  const int64_t count = build.source.ReadRows(
      [&](int32_t key, std::span<const CValue* const> values) {
        row[0] = key;
        for (std::size_t i = 0; i < layouts.size(); ++i) {
          const std::span<int32_t> slots(row.data() + layouts[i].first,
                                         static_cast<std::size_t>(layouts[i].slots));
          if (values[i] == nullptr) {
            EncodeNullSlots(slots);
          } else {
            EncodeOrderSlots(*values[i], slots);
          }
        }
        read_rows.insert(read_rows.end(), row.begin(), row.end());
        read_keys.push_back(key);
      },
      kValuesTag, method);
  defs_.SetProgress(15);
  if (count == 0) {
    if (build.rebuild) throw CPiOrderSortException::Numbered(kErrOrderNoRows, method, nullptr);
    return false;
  }

  const ReadKeys read(read_keys);
  CItems old(width);
  if (!build.rebuild) ReadStoredRows(build.existing.state_->srt, width, old);
  out = CItems(width);
  out.AllocateMemory(old.Count() + static_cast<int32_t>(read.Count()));
  // Both sides by key; a key read again replaces its stored row.
  int32_t at = 0;
  for (const auto& [key, sequence] : read.Last()) {
    for (; at < old.Count() && old.Key(at) < key; ++at) {
      out.InsertItem(std::span<const int32_t>(old.Row(at), static_cast<std::size_t>(width)));
    }
    if (at < old.Count() && old.Key(at) == key) ++at;
    out.InsertItem(
        std::span<const int32_t>(read_rows.data() + static_cast<std::size_t>(sequence) * width,
                                 static_cast<std::size_t>(width)));
  }
  for (; at < old.Count(); ++at) {
    out.InsertItem(std::span<const int32_t>(old.Row(at), static_cast<std::size_t>(width)));
  }
  OpenOrder(build.definition.OrderName, kModeCreate, 0);
  return true;
}

bool CPiOrder::BuildRanks(Build& build, CItems& out) {
  const std::vector<OrderColumnLayout>& layouts = build.layouts;
  COrderInfo& definition = build.definition;
  const std::size_t columns = layouts.size();
  order_files::CheckColumnFilesFree(defs_, definition.OrderName, definition.Columns, kRanksMethod);

  Trace(defs_.TraceLevel1(), kRanksTag,
        "----- Splitting collumns and sorting words, this may take a while.\n");
  // Per column, entries of (key, read sequence, value) in a raw file.
  std::vector<SortEntryLayout> entry_layouts;
  std::vector<std::unique_ptr<MFile>> raw;
  std::vector<SortFileWriter> writers(columns);
  for (std::size_t i = 0; i < columns; ++i) {
    entry_layouts.emplace_back(2, layouts[i].type);
    raw.push_back(std::make_unique<MFile>());
    CEntrySort::OpenSortFile(defs_, *raw.back());
    writers[i].Start(*raw.back());
  }
  const OrderTextPreparation text(definition.GeneralFlags, definition.IgnoreChars);
  std::vector<int32_t> read_keys;
  std::vector<uint8_t> entry;
  std::string narrow;
  std::u16string wide;
  const int64_t count = build.source.ReadRows(
      [&](int32_t key, std::span<const CValue* const> values) {
        const int32_t head[2] = {key, static_cast<int32_t>(read_keys.size())};
        read_keys.push_back(key);
        for (std::size_t i = 0; i < columns; ++i) {
          const CValue* value = values[i];
          if (value == nullptr) continue;
          entry.clear();
          SortEntryLayout::AppendRow(entry, head);
          switch (layouts[i].type) {
            case VALUE_TYPE::AsciiString:
              narrow.assign(value->Narrow());
              text.Prepare(narrow);
              entry_layouts[i].AppendText(entry, std::string_view(narrow));
              break;
            case VALUE_TYPE::UnicodeString:
              wide.assign(value->Wide());
              text.Prepare(wide);
              entry_layouts[i].AppendText(entry, std::u16string_view(wide));
              break;
            case VALUE_TYPE::Integer:
              SortEntryLayout::AppendInteger(entry, value->GetInteger());
              break;
            case VALUE_TYPE::Double:
              SortEntryLayout::AppendDouble(entry, value->GetDouble());
              break;
            case VALUE_TYPE::DateTime:
              SortEntryLayout::AppendDate(entry, value->GetDateTime());
              break;
          }
          writers[i].Put(entry.data(), entry.size());
        }
      },
      kRanksTag, kRanksMethod);
  for (SortFileWriter& writer : writers) writer.Finish();
  defs_.SetProgress(15);
  if (count == 0) {
    if (build.rebuild)
      throw CPiOrderSortException::Numbered(kErrOrderNoRows, kRanksMethod, nullptr);
    return false;
  }

  const ReadKeys read(read_keys);
  std::vector<int32_t>().swap(read_keys);
  const auto width = static_cast<int32_t>(1 + columns);
  CItems old(width);
  if (!build.rebuild) ReadStoredRows(build.existing.state_->srt, width, old);
  // Every key of the new order: the stored ones and the ones read; and the
  // row of each read sequence that counts.
  std::vector<int32_t> keys;
  keys.reserve(static_cast<std::size_t>(old.Count()) + read.Count());
  std::vector<int32_t> row_of_sequence(static_cast<std::size_t>(count), -1);
  {
    int32_t at = 0;
    for (const auto& [key, sequence] : read.Last()) {
      for (; at < old.Count() && old.Key(at) < key; ++at) keys.push_back(old.Key(at));
      if (at < old.Count() && old.Key(at) == key) ++at;
      row_of_sequence[static_cast<std::size_t>(sequence)] = static_cast<int32_t>(keys.size());
      keys.push_back(key);
    }
    for (; at < old.Count(); ++at) keys.push_back(old.Key(at));
  }
  out = CItems(width);
  out.AllocateMemory(static_cast<int32_t>(keys.size()));
  std::vector<int32_t> row(static_cast<std::size_t>(width), kNullSlot);
  for (const int32_t key : keys) {
    row[0] = key;
    out.InsertItem(row);
  }

  OpenOrder(definition.OrderName, kModeCreate, columns);
  for (std::size_t i = 0; i < columns; ++i) {
    MFile sorted;
    CEntrySort sort(defs_, entry_layouts[i], CEntrySort::Module::PiOrderSort);
    sort.Sort(*raw[i], sorted);
    raw[i].reset();
    std::optional<OrderColumnReader> old_column;
    if (!build.rebuild) old_column.emplace(*build.existing.state_->columns.at(i), layouts[i].type);
    MFile file;
    file.OpenFile(state_->build->Column(i), MFile::kCreate);
    OrderColumnWriter writer(file);
    const OrderRankMerge merge{entry_layouts[i], read, keys,
                               row_of_sequence,  out,  static_cast<int32_t>(1 + i)};
    const int64_t distinct = merge.Run(sorted, old_column ? &*old_column : nullptr, writer);
    file.MCommit();
    file.Close();
    Trace(defs_.TraceLevel1(), kRanksTag, "Column %s: %i distinct values",
          definition.Columns[i].Name, distinct);
  }
  return true;
}

void CPiOrder::RenameOrder2(const COrderInfo& written, const std::vector<std::string>& obsolete) {
  constexpr const char* kMethod = "RenameOrder2";
  GuardOrder(kMethod, [&] {
    if (state_->mode != kModeCreate) throw CPiOrderException::General(kMethod);
    std::vector<std::string> column_names;
    if (written.OrderType == kOrderTypeRanks) {
      // Another order may have taken a column file name since the check.
      order_files::CheckColumnFilesFree(defs_, state_->name, written.Columns, kMethod);
      for (const OrderColumn& c : written.Columns) column_names.push_back(c.Name);
    }
    state_->build->MoveIntoPlace(defs_, state_->name, column_names, obsolete);
    CloseOrder();
  });
}

void CPiOrder::DropOrder() {
  constexpr const char* kMethod = "DropOrder";
  GuardOrder(kMethod, [&] {
    if (state_->mode != kModeRead) {
      throw CPiOrderException::Text("No order is open to be dropped", kMethod, nullptr);
    }
    const std::string name = state_->name;
    const COrderInfo info = state_->info;
    CloseOrder();
    CLockManager lock(defs_.GetLockScope(), defs_.GetGroup(), name, kLockOrder);
    lock.LockExclusive();
    order_files::DropFiles(defs_, name, info);
  });
}

std::vector<std::string> CPiOrder::DropOrderFiles(std::string_view name) {
  constexpr const char* kMethod = "DropOrder";
  return GuardOrder(kMethod, [&] {
    RequirePlainName<CPiOrderException>("order", name, kMethod);
    CloseOrder();
    CLockManager lock(defs_.GetLockScope(), defs_.GetGroup(), name, kLockOrder);
    lock.LockExclusive();
    std::vector<std::string> removed = order_files::ExistingFiles(defs_, name);
    if (removed.empty()) {
      lock.UnlockAll();
      // Nothing to drop: the same failure as any use of a missing order.
      OpenOrder(name, kModeRead);
      CloseOrder();
      return removed;
    }
    // The header first: from then on the order is gone for every reader.
    for (const std::string& path : removed) {
      DropFile(path);
      Trace(defs_.TraceLevel1(), "PILIB.PiOrder.DropOrder", "Dropped file %s", path);
    }
    lock.UnlockAll();
    for (std::string& path : order_files::RemoveOrphanedTempFiles(defs_)) {
      removed.push_back(std::move(path));
    }
    return removed;
  });
}

}  // namespace qm
