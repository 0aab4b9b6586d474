#include "format/index_header.h"

#include <utility>

#include "format/bfile.h"
#include "format/block.h"
#include "format/header_block_io.h"
#include "base/trace.h"

namespace qm {

namespace {

constexpr std::string_view kVersionMessage =
    "Unsupported index version. Quillmere Search v%S does not support indexes build with "
    "Quillmere Search lower than v%S";

// Every field of block 0 in file order.
template <class Io, class Header>
void IndexHeaderFields(Io& io, Header& h) {
  io.Int(h.HeaderWord0);
  io.Int(h.BlockNum);
  io.Version(h.Version);
  io.VersionText(h.VersionText);
  io.Int(h.BuildState);
  io.Int(h.FindexType);
  io.Str(h.IndexName);
  io.Str(h.TableName);
  io.Int(h.SqlUsedAsTable);
  io.Str(h.SqlSelect);
  io.Str(h.KeyColumn);

  // Column list: count, then per column its name, tag count and tag pairs.
  int32_t columns = static_cast<int32_t>(h.Columns.size());
  io.Count(columns);
  if constexpr (Io::kReads) {
    ColumnMap read;
    for (int32_t i = 0; i < columns; ++i) {
      std::string name;
      int32_t tag_count = 0;
      io.Str(name);
      io.Count(tag_count);
      TagMap tags;
      for (int32_t j = 0; j < tag_count; ++j) {
        std::string tag, value;
        io.Str(tag);
        io.Str(value);
        tags[std::move(tag)] = std::move(value);
      }
      read[std::move(name)] = std::move(tags);
    }
    h.Columns = std::move(read);
  } else {
    for (const auto& [name, tags] : h.Columns) {
      io.Str(name);
      io.Count(static_cast<int32_t>(tags.size()));
      for (const auto& [tag, value] : tags) {
        io.Str(tag);
        io.Str(value);
      }
    }
  }

  io.Int(h.SortMax);
  io.Int(h.WordCount);
  io.Int(h.KeyCount);
  io.Int(h.DistinctWordCount);
  io.Connection(h.ConnectionString, (h.GeneralFlags & 8) != 0);
  io.Str(h.DisplayName);
  io.Date(h.BuildTime);
  io.Date(h.LastUpdateTime);
  io.Str(h.DateTimeKeyColumn);
  io.Date(h.MaxDateTimeKey);
  io.Int(h.ExtraWord1);
  io.Int(h.ExtraWord3);
  io.Int(h.ExtraWord2);
  io.Int(h.GeneralFlags);
  io.Int(h.IndexMaxSize);
  io.Int(h.IndexStartValue);
  io.StrW(h.Separators);
  io.Int(h.UpdateFlags);
  io.Int(h.UpdateSupport);
  io.Int(h.LanguageFlags);
  io.Int(h.Language);
}

}  // namespace

namespace {
constexpr auto kFields = [](auto& io, auto& header) { IndexHeaderFields(io, header); };
}  // namespace

void CIndexHeader::ReadInfo(BFile& file) {
  Guard<CHighStructuresException, CHighStructuresUnknownException>("CIndexHeader::ReadInfo", [&] {
    *this = header_io::ReadBlockZero<CIndexHeader>(file, kVersionMessage, kFields);
    Trace(TraceLevel2.load(), "PILIB,FILIB,GILIB.(SHARELIB)CIndexHeader.ReadInfo", "Index info read");
  });
}

void CIndexHeader::WriteInfo(BFile& file) const {
  Guard<CHighStructuresException, CHighStructuresUnknownException>("CIndexHeader::WriteInfo", [&] {
    Trace(TraceLevel2.load(), "PILIB,FILIB.(SHARELIB)CIndexHeader.WriteInfo", "Writing index info");
    header_io::WriteBlockZero(file, *this, kFields,
                              "Index definition too long: its header needs %i bytes, block 0 holds %i",
                              "CIndexHeader::WriteInfo");
  });
}

int64_t CIndexHeader::EncodedSize() const { return header_io::EncodedSize(*this, kFields); }

bool CIndexHeader::FitsHeaderBlock() const { return EncodedSize() <= header_io::kMaxEncodedSize; }

}  // namespace qm
