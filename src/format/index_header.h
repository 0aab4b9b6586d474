// CIndexHeader: the definition and build statistics of one findex, as kept in
// memory. The same fields, in this order, make up block 0 of the .sdx file
// (ReadInfo/WriteInfo; docs/formats.md has the byte layout).
#pragma once

#include <cstdint>
#include <map>
#include <string>

#include "base/value.h"

namespace qm {

class BFile;

// The tags of one indexed column: tag name -> value (CONTENT_WEIGHT=3 ...).
using TagMap = std::map<std::string, std::string>;
// The indexed columns, keyed and so ordered by column name (byte-wise).
using ColumnMap = std::map<std::string, TagMap>;

struct CIndexHeader {
  int32_t HeaderWord0 = 0;
  int32_t BlockNum = 0;  // blocks in the .sdx file; below 2 the findex holds no words
  int32_t Version = 0;   // the file writer stamps the engine's version (614, "6.14")
  std::string VersionText;
  int32_t BuildState = 0;  // 1 once a build has completed
  int32_t FindexType = 0;  // VALUE_TYPE code of the indexed words; 0 before a build
  std::string IndexName;
  std::string TableName;
  int32_t SqlUsedAsTable = 0;  // 1: SqlSelect is the data source
  std::string SqlSelect;
  std::string KeyColumn;
  ColumnMap Columns;
  int32_t SortMax = 0;  // highest key read so far
  int32_t WordCount = 0;
  int32_t KeyCount = 0;
  int32_t DistinctWordCount = 0;
  std::string ConnectionString;  // plain here; scrambled only in the file
  std::string DisplayName;
  DateTimeValue BuildTime;
  DateTimeValue LastUpdateTime;
  std::string DateTimeKeyColumn;
  DateTimeValue MaxDateTimeKey;
  int32_t ExtraWord1 = 0;
  int32_t ExtraWord3 = 0;
  int32_t ExtraWord2 = 1;
  int32_t GeneralFlags = 14;  // index general option flags
  int32_t IndexMaxSize = 0;   // units of 100,000 keys
  int32_t IndexStartValue = 0;
  std::u16string Separators;
  int32_t UpdateFlags = 0;
  int32_t UpdateSupport = 0;
  int32_t LanguageFlags = 20;
  int32_t Language = 2;

  // Reads block 0 of the file: the version must be 601..700 (checked before
  // the later fields); the connection string is unscrambled. On failure the
  // header keeps its contents and a "HighStructures" error is raised.
  void ReadInfo(BFile& file);
  // Writes every field into a fresh block stored as block 0, stamped with the
  // engine's version (614, "6.14"); the connection string only when general
  // flag 8 (save the connection) is set, scrambled. A header that does not fit
  // the block is refused before anything is written.
  void WriteInfo(BFile& file) const;
  // The bytes block 0 would use for this header (its 6 header bytes included),
  // and whether that fits: callers can refuse an over-long definition early.
  int64_t EncodedSize() const;
  bool FitsHeaderBlock() const;

  bool operator==(const CIndexHeader&) const = default;

  // Back to the values of a fresh header, lists emptied.
  void Reset() { *this = CIndexHeader{}; }

  // The column names joined with ",".
  std::string ColumnNames() const {
    std::string out;
    for (const auto& [name, tags] : Columns) {
      if (!out.empty()) out += ',';
      out += name;
    }
    return out;
  }
};

}  // namespace qm
