#include "search/gi_findex.h"

#include <algorithm>
#include <utility>

#include "base/byte_layout.h"
#include "base/exception_family.h"
#include "base/plain_name.h"
#include "base/trace.h"
#include "config/global_defs.h"
#include "format/column_set.h"
#include "format/items.h"
#include "index/findex_file_set.h"
#include "platform/file_io.h"
#include "platform/text_encoding.h"
#include "search/edit_distance.h"
#include "search/word_pattern.h"
#include "search/word_search.h"

namespace qm {

namespace {

constexpr const char* kTraceTag = "GILIB.GiFIndex.GetItems";

template <class Body>
decltype(auto) Guarded(const char* method, Body&& body) {
  return Guard<CGiFIndexException, CGiFIndexUnknownException>(method, std::forward<Body>(body));
}

bool IsText(int32_t type) {
  return type == static_cast<int32_t>(VALUE_TYPE::AsciiString) ||
         type == static_cast<int32_t>(VALUE_TYPE::UnicodeString);
}

bool IsKnownType(int32_t type) {
  switch (type) {
    case 1: case 2: case 3: case 4: case 6: return true;
    default: return false;
  }
}

}  // namespace

CGiFIndex::CGiFIndex(const CGlobalDefs& defs) : defs_(defs) {}

CGiFIndex::~CGiFIndex() = default;

void CGiFIndex::Open(std::string_view name) {
  Guarded("Open", [&] { OpenFiles(name, false); });
}

void CGiFIndex::OpenAsIs(std::string_view name) {
  Guarded("Open", [&] { OpenFiles(name, true); });
}

bool CGiFIndex::TryOpen(std::string_view name) {
  return Guarded("Open", [&] {
    // No findex can have such a name (an add-on of a findex whose name is
    // already near the length limit, say): nothing to open, nothing touched.
    if (!IsPlainName(name) || !platform::FileExists(findex::PathsOf(defs_, name).sdx)) {
      Close();
      return false;
    }
    OpenFiles(name, false);
    return true;
  });
}

void CGiFIndex::OpenFiles(std::string_view name, bool as_is) {
  RequirePlainName<CGiFIndexException>("findex", name, "Open");
  Close();
  const findex::FilePaths paths = findex::PathsOf(defs_, name);
  name_ = ToUpper(name);
  sdx_path_ = paths.sdx;
  fst_path_ = paths.fst;
  del_path_ = paths.del;
  sdx_.OpenFile(sdx_path_, BFile::kReadOnly, kBlockUnits);
  try {
    header_.ReadInfo(sdx_);
    block_count_ = sdx_.BlockCount();
    const bool words = header_.BlockNum >= 2;
    if (words && header_.BlockNum > block_count_ && !as_is) {
      Damaged("Open", "the header counts " + std::to_string(header_.BlockNum) +
                          " blocks, the word tree holds " + std::to_string(block_count_));
    }
    if (words && !IsKnownType(header_.FindexType)) {
      Damaged("Open", "unknown value type " + std::to_string(header_.FindexType));
    }
    fst_size_ = 0;
    if (words || as_is) {
      platform::FileHandle fst =
          platform::OpenFileAs(fst_path_, platform::FileAccess::Read,
                               platform::FileDisposition::OpenExisting);
      fst_size_ = fst.IsOpen() ? platform::FileSize(fst.Get()) : -1;
      if (!fst.IsOpen() && !as_is) {
        Damaged("Open", "its item file " + fst_path_ + " cannot be opened");
      }
      if (fst.IsOpen() && fst_size_ < 0 && !as_is) {
        Damaged("Open", "the size of " + fst_path_ + " cannot be read");
      }
    }
  } catch (...) {
    sdx_.Close();
    throw;
  }
  levels_.fill(0);
  open_ = true;
}

void CGiFIndex::Close() {
  if (sdx_.IsOpen()) sdx_.Close();
  open_ = false;
  levels_.fill(0);
}

int32_t CGiFIndex::RowSize() const {
  return CColumnSet::FromGeneralFlags(header_.GeneralFlags).Size();
}

int64_t CGiFIndex::ItemFileSize() const { return fst_size_; }

void CGiFIndex::Damaged(const char* method, const std::string& what,
                        const CExceptionBase* inner) const {
  throw CGiFIndexException::Text("Damaged findex %s: %s", method, inner, name_, what);
}

void CGiFIndex::RequireOpen(const char* method) const {
  if (!open_) throw CGiFIndexException::Text("Findex not open", method, nullptr);
}

CBlock& CGiFIndex::TreeBlock(int level, int32_t number) {
  auto slot = static_cast<std::size_t>(level);
  if (levels_[slot] == number) return blocks_[slot];
  if (number < 1 || number >= block_count_) {
    Damaged("ReadBlock", "tree block " + std::to_string(number) + " lies outside the word tree (" +
                             std::to_string(block_count_) + " blocks)");
  }
  levels_[slot] = 0;
  try {
    sdx_.SeekToBlock(number);
    sdx_.ReadBlock(blocks_[slot]);
  } catch (const CException& e) {
    Damaged("ReadBlock", "tree block " + std::to_string(number) + " cannot be read", &e);
  }
  levels_[slot] = number;
  return blocks_[slot];
}

template <class OnChild, class OnSeparator>
bool CGiFIndex::ReadNodeEntries(int level, int32_t number, OnChild on_child,
                                OnSeparator on_separator) {
  CBlock& node = TreeBlock(level, number);
  if (node.GetUsed() == CBlock::kHeaderBytes) return false;
  const auto type = static_cast<VALUE_TYPE>(header_.FindexType);
  try {
    node.SetCursor(CBlock::kHeaderBytes);
    on_child(node.ReadInt());
    while (!node.AtEnd()) {
      if (!on_separator(node.ReadValueView(type))) break;
      if (node.AtEnd()) break;
      on_child(node.ReadInt());
    }
  } catch (const CException& e) {
    Damaged("ReadNode", "tree block " + std::to_string(number) + " does not decode", &e);
  }
  return true;
}

template <class Visit>
bool CGiFIndex::VisitLeafRows(int32_t number, Visit&& visit) {
  CBlock& leaf = TreeBlock(3, number);
  const auto type = static_cast<VALUE_TYPE>(header_.FindexType);
  leaf.SetCursor(CBlock::kHeaderBytes);
  while (!leaf.AtEnd()) {
    LeafRow row;
    try {
      row.value = leaf.ReadValueView(type);
      row.position = leaf.ReadInt();
    } catch (const CException& e) {
      Damaged("ReadLeaf", "leaf block " + std::to_string(number) + " does not decode", &e);
    }
    if (!visit(row)) return false;
  }
  return true;
}

int32_t CGiFIndex::Descend(const CValue& value) {
  if (header_.BlockNum < 2) return 0;
  int32_t number = 1;
  for (int level = 0; level < 3; ++level) {
    // The child before the first separator not below the value, else the last.
    int32_t child = 0;
    const bool entries = ReadNodeEntries(
        level, number, [&](int32_t c) { child = c; },
        [&](const BlockValue& separator) { return separator.Compare(value) == -1; });
    if (!entries) {
      // An empty root is an empty tree; an empty node below it is the end
      // leaf that follows the last word.
      return level == 0 ? 0 : number;
    }
    // A node written after a split comes after its first child, so only the
    // range is checked; the descent has its fixed number of levels.
    if (child < 2 || child == number || child >= block_count_) {
      Damaged("Descend", "tree block " + std::to_string(number) + " points to block " +
                             std::to_string(child));
    }
    number = child;
  }
  return number;
}

void CGiFIndex::ReadTreeBlock(int level, int32_t number) {
  Guarded("ReadTreeBlock", [&] {
    RequireOpen("ReadTreeBlock");
    if (level < 0 || level > 3) {
      throw CGiFIndexException::Text("No tree level %i", "ReadTreeBlock", nullptr, level);
    }
    TreeBlock(level, number);
  });
}

CGiFIndex::Node CGiFIndex::ReadNode(int level, int32_t number) {
  return Guarded("ReadNode", [&] {
    RequireOpen("ReadNode");
    if (level < 0 || level > 2) {
      throw CGiFIndexException::Text("No node level %i", "ReadNode", nullptr, level);
    }
    Node node;
    ReadNodeEntries(
        level, number, [&](int32_t child) { node.children.push_back(child); },
        [&](const BlockValue& separator) {
          separator.CopyTo(node.separators.emplace_back());
          return true;
        });
    return node;
  });
}

CGiFIndex::LeafLinks CGiFIndex::ReadLeafLinks(int32_t number) {
  return Guarded("ReadLeafLinks", [&] {
    RequireOpen("ReadLeafLinks");
    const CBlock& leaf = TreeBlock(3, number);
    return LeafLinks{leaf.GetLinkWord1(), leaf.GetLinkWord2()};
  });
}

bool CGiFIndex::ReadLeafRows(int32_t number, const std::function<bool(const LeafRow&)>& visit) {
  return Guarded("ReadLeafRows", [&] {
    RequireOpen("ReadLeafRows");
    return VisitLeafRows(number, visit);
  });
}

int32_t CGiFIndex::FindLeaf(const CValue& value, int32_t& block) {
  return Guarded("FindLeaf", [&] {
    RequireOpen("FindLeaf");
    block = Descend(value);
    return block == 0 ? kNothingFound : kFound;
  });
}

void CGiFIndex::WalkLeaves(int32_t block, const std::function<bool(const LeafRow&)>& visit) {
  int64_t last_position = 0;
  int32_t number = block;
  while (number != 0) {
    const bool whole = VisitLeafRows(number, [&](const LeafRow& row) {
      if (row.position < last_position || row.position > fst_size_) {
        Damaged("ReadLeaf", "leaf block " + std::to_string(number) + " holds item position " +
                                std::to_string(row.position) + " (item file " +
                                std::to_string(fst_size_) + " bytes)");
      }
      last_position = row.position;
      return visit(row);
    });
    if (!whole) return;
    // Still the leaf level's block, unless the visit read another leaf.
    const int32_t next = TreeBlock(3, number).GetLinkWord1();
    // Leaves are written in ascending block order: a link back is damage,
    // and following it could go round for ever.
    if (next != 0 && (next <= number || next >= block_count_)) {
      Damaged("ReadLeaf", "leaf block " + std::to_string(number) + " links to block " +
                              std::to_string(next));
    }
    number = next;
  }
}

CGiFIndex::Boundary CGiFIndex::FindBoundary(const CValue& value, bool after) {
  Boundary result;
  result.position = fst_size_;
  const int32_t leaf = Descend(value);
  if (leaf == 0) return result;
  WalkLeaves(leaf, [&](const LeafRow& row) {
    const int c = row.value.Compare(value);
    if (c == kNotComparable) {
      throw CGiFIndexException::Text("The value sought is not of the findex's type %i",
                                     "FindStartStop", nullptr, header_.FindexType);
    }
    if (after ? c > 0 : c >= 0) {
      result.position = row.position;
      result.found = true;
      result.equal = c == 0;
      return false;
    }
    return true;
  });
  return result;
}

int32_t CGiFIndex::FindStartStop(const CValue& start, const CValue& stop, int64_t& start_pos,
                                 int64_t& stop_pos, bool single, int32_t flags) {
  return Guarded("FindStartStop", [&]() -> int32_t {
    RequireOpen("FindStartStop");
    start_pos = 0;
    stop_pos = 0;
    if (Descend(start) == 0) return kNothingFound;
    using namespace compare_flags;
    if ((flags & kGreater) != 0) {
      const bool equal = (flags & kEqual) != 0;
      const Boundary b = FindBoundary(equal ? start : stop, !equal);
      if (!b.found) return kNothingFound;
      start_pos = b.position;
      stop_pos = fst_size_;
      return kStopBeyondEnd;
    }
    if ((flags & kLess) != 0) {
      const bool equal = (flags & kEqual) != 0;
      const Boundary b = FindBoundary(equal ? stop : start, equal);
      start_pos = 0;
      stop_pos = b.position;
      if (stop_pos == 0) return kNothingFound;
      return b.found ? kFound : kStopBeyondEnd;
    }
    const Boundary first = FindBoundary(start, false);
    if (!first.found) return kNothingFound;
    if (single) {
      if (!first.equal) return kNothingFound;
      start_pos = first.position;
      stop_pos = RunEndAt(start_pos);
      return kFound;
    }
    const Boundary last = FindBoundary(stop, true);
    start_pos = first.position;
    stop_pos = last.position;
    if (start_pos >= stop_pos) return kNothingFound;
    return last.found ? kFound : kStopBeyondEnd;
  });
}

int64_t CGiFIndex::RunEnd(int64_t position) {
  return Guarded("RunEnd", [&] {
    RequireOpen("RunEnd");
    return RunEndAt(position);
  });
}

int32_t CGiFIndex::RunRows(int64_t position) {
  return Guarded("RunRows", [&] {
    RequireOpen("RunRows");
    return RunRowsAt(position);
  });
}

int32_t CGiFIndex::RunRowsAt(int64_t position) {
  if (position < 0 || position + 4 > fst_size_) {
    Damaged("RunEnd", "a run at " + std::to_string(position) + " lies outside the item file (" +
                          std::to_string(fst_size_) + " bytes)");
  }
  uint8_t raw[4] = {0, 0, 0, 0};
  ReadFst(position, raw, sizeof raw, "RunEnd");
  return bytes::LoadI32(raw);
}

int64_t CGiFIndex::RunEndAt(int64_t position) {
  const int64_t count = RunRowsAt(position);
  const int64_t end = position + count * RowSize();
  if (count < 1 || end > fst_size_) {
    Damaged("RunEnd", "the run at " + std::to_string(position) + " counts " +
                          std::to_string(count) + " rows, past the end of the item file");
  }
  return end;
}

void CGiFIndex::ReadFst(int64_t position, uint8_t* data, std::size_t n, const char* method) {
  platform::FileHandle fst = platform::OpenFileAs(fst_path_, platform::FileAccess::Read,
                                                  platform::FileDisposition::OpenExisting);
  if (!fst.IsOpen()) Damaged(method, "its item file " + fst_path_ + " cannot be opened");
  if (platform::SeekFile(fst.Get(), position, platform::SeekFrom::Begin) != position) {
    Damaged(method, "cannot seek to " + std::to_string(position) + " in " + fst_path_);
  }
  const ssize_t got = platform::ReadFull(fst.Get(), data, n);
  if (got < 0 || static_cast<std::size_t>(got) != n) {
    Damaged(method, "a read of " + std::to_string(n) + " bytes at " + std::to_string(position) +
                        " in " + fst_path_ + " came back short");
  }
}

void CGiFIndex::ReadItems(CItems& items, int64_t start, int64_t stop, int64_t limit,
                          bool& truncated) {
  Guarded("ReadItems", [&] {
    RequireOpen("ReadItems");
    items.Clear();
    int32_t runs = 0;
    ReadRange(items, start, stop, limit, truncated, runs);
  });
}

int32_t CGiFIndex::ReadMoreItems(CItems& items, int64_t filled, int64_t start, int64_t stop,
                                 int64_t limit, bool& truncated) {
  return Guarded("ReadMoreItems", [&] {
    RequireOpen("ReadMoreItems");
    const int64_t row_size = RowSize();
    if (filled < 0 || filled % row_size != 0 || filled / row_size > items.Count()) {
      throw CGiFIndexException::Text("%i bytes filled do not fit the item array", "ReadMoreItems",
                                     nullptr, filled);
    }
    items.Truncate(static_cast<int32_t>(filled / row_size));
    int32_t runs = 0;
    return ReadRange(items, start, stop, limit, truncated, runs);
  });
}

int32_t CGiFIndex::ReadRange(CItems& items, int64_t start, int64_t stop, int64_t limit,
                             bool& truncated, int32_t& runs) {
  const int64_t row_size = RowSize();
  if (items.RowSize() != row_size) {
    throw CGiFIndexException::Text("Item rows of %i bytes cannot take findex %s's rows of %i bytes",
                                   "ReadItems", nullptr, items.RowSize(), name_, row_size);
  }
  if (start < 0 || start > stop || stop > fst_size_ || (stop - start) % row_size != 0) {
    Damaged("ReadItems", "the item range " + std::to_string(start) + ".." + std::to_string(stop) +
                             " does not fit the item file (" + std::to_string(fst_size_) +
                             " bytes, rows of " + std::to_string(row_size) + ")");
  }
  int64_t rows = (stop - start) / row_size;
  if (rows == 0) return 0;
  bool cut = false;
  if (limit > 0) {
    const int64_t room = limit / row_size - items.Count();
    if (room <= 0) {
      truncated = true;
      return 0;
    }
    if (rows > room) {
      rows = room;
      cut = true;
    }
  }
  const int32_t first = items.Count();
  if (rows > int64_t{INT32_MAX} - first) {
    Damaged("ReadItems", "the item range holds more rows than an array can");
  }
  platform::FileHandle fst = platform::OpenFileAs(fst_path_, platform::FileAccess::Read,
                                                  platform::FileDisposition::OpenExisting);
  if (!fst.IsOpen()) Damaged("ReadItems", "its item file " + fst_path_ + " cannot be opened");
  if (platform::SeekFile(fst.Get(), start, platform::SeekFrom::Begin) != start) {
    Damaged("ReadItems", "cannot seek to " + std::to_string(start) + " in " + fst_path_);
  }
  const auto wanted = static_cast<int32_t>(rows);
  const int32_t got = items.AppendStoredRows(wanted, [&](uint8_t* data, std::size_t n) {
    const ssize_t read = platform::ReadFull(fst.Get(), data, n);
    return read < 0 ? std::size_t{0} : static_cast<std::size_t>(read);
  });
  if (got != wanted) {
    items.Truncate(first);
    Damaged("ReadItems", "a read of " + std::to_string(wanted) + " rows at " +
                             std::to_string(start) + " in " + fst_path_ + " came back short (" +
                             std::to_string(got) + " rows)");
  }
  // The rows read must be whole runs, each led by its count row; only a cut
  // may end inside the last one, whose count then says what was read.
  int32_t at = first;
  const int32_t end = first + got;
  while (at < end) {
    const int32_t count = items.Key(at);
    if (count < 1 || (count > end - at && !cut)) {
      items.Truncate(first);
      Damaged("ReadItems", "the count row at " + std::to_string(start + int64_t{at - first} * row_size) +
                               " holds " + std::to_string(count) + " rows, " +
                               std::to_string(end - at) + " remain in its range");
    }
    ++runs;
    if (count > end - at) {
      items.Row(at)[0] = end - at;
      break;
    }
    at += count;
  }
  if (cut) truncated = true;
  return got;
}

CLookupResult CGiFIndex::GetItems(CItems& items, const CWordSearch& word, int32_t flags,
                                  int32_t modifier, int64_t limit, bool append) {
  return Guarded("GetItems", [&] {
    RequireOpen("GetItems");
    CLookupResult result;
    if (!append) items.Clear();
    if (header_.BlockNum < 2) return result;
    const int64_t row_size = RowSize();
    if (limit > 0) limit -= limit % row_size;
    using namespace compare_flags;
    const bool text = IsText(header_.FindexType);
    if (text && (flags & (kSimilarPercent | kSimilarDistance)) != 0) {
      return ScanSimilar(items, word, flags, modifier, limit);
    }
    if (text && !word.exact && (flags & (kGreater | kLess)) == 0) {
      return ScanPattern(items, word, limit);
    }
    Trace(defs_.TraceLevel1(), kTraceTag, "Quick Search Starting");
    int64_t start = 0;
    int64_t stop = 0;
    const int32_t found = FindStartStop(word.low, word.high, start, stop,
                                        word.low.Compare(word.high) == 0, flags);
    if (found != kNothingFound && start < stop) {
      result.rows = ReadRange(items, start, stop, limit, result.truncated, result.runs);
      result.found = result.rows > 0 || result.truncated;
    }
    Trace(defs_.TraceLevel1(), kTraceTag,
          "Quick Search. Number of items found in %s (including count item) : %i", fst_path_,
          result.rows);
    return result;
  });
}

// Walks the leaves from leaf on and reads each run of consecutive matching
// words with one read, from the first match to the first word after the run;
// a run still open at the end is read to the end of the .fst. match(row) says
// whether a word matches and whether the walk goes on after it.
template <class Match>
CLookupResult CGiFIndex::ReadMatchingRuns(CItems& items, int32_t leaf, int64_t limit,
                                          Match match) {
  CLookupResult result;
  if (leaf == 0) return result;
  bool open = false;
  int64_t run_start = 0;
  auto read_run = [&](int64_t stop) {
    int32_t runs = 0;
    result.rows += ReadRange(items, run_start, stop, limit, result.truncated, runs);
    result.runs += runs;
    open = false;
  };
  WalkLeaves(leaf, [&](const LeafRow& row) {
    const auto [matched, go_on] = match(row);
    if (matched) {
      result.found = true;
      if (!open) {
        open = true;
        run_start = row.position;
      }
      return true;
    }
    if (open) read_run(row.position);
    return go_on && !result.truncated;
  });
  if (open && !result.truncated) read_run(fst_size_);
  return result;
}

CLookupResult CGiFIndex::ScanPattern(CItems& items, const CWordSearch& word, int64_t limit) {
  const bool narrow = header_.FindexType == static_cast<int32_t>(VALUE_TYPE::AsciiString);
  std::u16string wide;
  return ReadMatchingRuns(items, Descend(word.low), limit, [&](const LeafRow& row) {
    CWordPattern::Outcome outcome;
    if (narrow) {
      outcome = word.pattern.MatchUtf8(row.value.narrow);
    } else {
      wide = row.value.WideText();
      outcome = word.pattern.Match(wide);
    }
    return std::pair{outcome == CWordPattern::kMatch, outcome != CWordPattern::kPastPrefix};
  });
}

CLookupResult CGiFIndex::ScanSimilar(CItems& items, const CWordSearch& word, int32_t flags,
                                     int32_t modifier, int64_t limit) {
  const bool narrow = header_.FindexType == static_cast<int32_t>(VALUE_TYPE::AsciiString);
  const std::u32string sought = CodePointsOf(word.word);
  int64_t allowed = 0;
  if ((flags & compare_flags::kSimilarPercent) != 0) {
    const int64_t percent = modifier >= 0 ? modifier : 25;
    allowed = static_cast<int64_t>(sought.size()) * percent / 100;
  } else {
    allowed = modifier >= 0 ? modifier : 1;
  }
  const auto bound = static_cast<int32_t>(std::min<int64_t>(allowed, 1 << 20));
  // Similar words can sort anywhere: every leaf is read, from the first.
  CValue lowest(static_cast<VALUE_TYPE>(header_.FindexType));
  std::u32string candidate;
  return ReadMatchingRuns(items, Descend(lowest), limit, [&](const LeafRow& row) {
    candidate = narrow ? CodePointsOf(std::string_view(row.value.narrow))
                       : CodePointsOf(std::u16string_view(row.value.WideText()));
    return std::pair{BoundedEditDistance(sought, candidate, bound) <= bound, true};
  });
}

void CGiFIndex::GetFindexWordsW(const CWordPattern& filter, int32_t first, int32_t last,
                                std::vector<std::u16string>& words, int32_t& total) {
  Guarded("GetFindexWordsW", [&] {
    RequireOpen("GetFindexWordsW");
    words.clear();
    total = 0;
    if (!IsText(header_.FindexType)) {
      throw CGiFIndexException::Text("Index type must be Text", "GetFindexWordsW", nullptr);
    }
    if (header_.BlockNum < 2) return;
    const bool narrow = header_.FindexType == static_cast<int32_t>(VALUE_TYPE::AsciiString);
    const bool every = !filter.HasWildcards() && filter.Literal().empty();
    CValue prefix(static_cast<VALUE_TYPE>(header_.FindexType));
    if (narrow) {
      prefix.SetText(filter.LiteralPrefixUtf8());
    } else {
      prefix.SetTextW(filter.LiteralPrefix());
    }
    const int32_t leaf = Descend(prefix);
    if (leaf == 0) return;
    std::u16string text;
    WalkLeaves(leaf, [&](const LeafRow& row) {
      text = narrow ? Utf8ToUtf16(row.value.narrow) : row.value.WideText();
      const CWordPattern::Outcome outcome =
          every ? CWordPattern::kMatch
                : (narrow ? filter.MatchUtf8(row.value.narrow) : filter.Match(text));
      if (outcome == CWordPattern::kPastPrefix) return false;
      if (outcome == CWordPattern::kMatch) {
        ++total;
        if (total >= first && total <= last) words.push_back(text);
      }
      return true;
    });
  });
}

}  // namespace qm
