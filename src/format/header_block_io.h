// The three ways the header records of block 0 (CIndexHeader, COrderInfo)
// walk their fields: writing them into a block, reading them back, and
// counting the bytes they take. Each record lists its fields once, in file
// order, in a function template over one of these; so the order, the reader
// and the size check can never disagree.
//
// Field calls: Int, Str (narrow, 16-bit length), StrW (wide), Date, Count (an
// element count that the reader refuses when negative), Version (the version
// number: written as the engine's, checked when read), VersionText and
// Connection (scrambled in the file). kReads tells a walk whether it fills the
// record, so list fields can be built on reading.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "format/bfile.h"
#include "format/block.h"
#include "base/connection_scramble.h"
#include "base/exception_family.h"
#include "config/global_defs.h"

namespace qm::header_io {

// Bytes of block 0 a header may use: every item must end before the block
// size, so the used count (header bytes included) stays below 4,096.
inline constexpr int64_t kHeaderBlockUnits = 64;
inline constexpr int64_t kMaxEncodedSize = kHeaderBlockUnits * CBlock::kUnitBytes - 1;

// Files of format versions 601 (this engine's) up to 700 are read; later
// major formats are refused before any later field is read.
inline constexpr int32_t kLastReadableFileVersion = 700;
inline bool IsReadableFileVersion(int32_t version) {
  return version >= CGlobalDefs::kFileVersion && version <= kLastReadableFileVersion;
}

class Writer {
 public:
  static constexpr bool kReads = false;
  explicit Writer(CBlock& block) : block_(block) {}

  void Int(int32_t v) { block_.InsertInt(v); }
  void Count(int32_t n) { block_.InsertInt(n); }
  void Str(std::string_view text) { block_.InsertStr(text); }
  void StrW(std::u16string_view text) { block_.InsertStrW(text); }
  void Date(const DateTimeValue& d) { block_.InsertDate(d); }
  void Version(int32_t) { block_.InsertInt(CGlobalDefs::kVersion); }
  void VersionText(std::string_view) { block_.InsertStr(CGlobalDefs::kVersionText); }
  void Connection(const std::string& plain, bool save) {
    std::string scrambled = save ? plain : std::string();
    ScrambleConnectionText(scrambled);
    block_.InsertStr(scrambled);
  }

 private:
  CBlock& block_;
};

class SizeCounter {
 public:
  static constexpr bool kReads = false;

  void Int(int32_t) { bytes_ += 4; }
  void Count(int32_t) { bytes_ += 4; }
  void Str(std::string_view text) { bytes_ += 2 + static_cast<int64_t>(text.size()); }
  void StrW(std::u16string_view text) { bytes_ += 2 + 2 * static_cast<int64_t>(text.size()); }
  void Date(const DateTimeValue&) { bytes_ += 16; }
  void Version(int32_t) { bytes_ += 4; }
  void VersionText(std::string_view) { Str(CGlobalDefs::kVersionText); }
  void Connection(const std::string& plain, bool save) { bytes_ += 2 + (save ? plain.size() : 0); }

  // The used count of a block holding the fields (its 6 header bytes included).
  int64_t Bytes() const { return bytes_; }

 private:
  int64_t bytes_ = CBlock::kHeaderBytes;
};

class Reader {
 public:
  static constexpr bool kReads = true;
  // version_text: the unsupported-version message of the record.
  Reader(CBlock& block, std::string_view version_text)
      : block_(block), version_text_(version_text) {}

  void Int(int32_t& v) { v = block_.ReadInt(); }
  void Count(int32_t& n) {
    n = block_.ReadInt();
    if (n < 0) {
      throw CHighStructuresException::Text("Damaged header in %s: negative count %i", "ReadHeader",
                                           nullptr, block_.Describe(), n);
    }
  }
  void Str(std::string& text) { block_.ReadStr(text); }
  void StrW(std::u16string& text) { block_.ReadStrW(text); }
  void Date(DateTimeValue& d) { d = block_.ReadDate(); }
  void Version(int32_t& v) {
    v = block_.ReadInt();
    if (!IsReadableFileVersion(v)) {
      throw CHighStructuresException::Text(version_text_, "ReadHeader", nullptr,
                                           CGlobalDefs::kVersionText,
                                           std::to_string(CGlobalDefs::kFileVersion));
    }
  }
  void VersionText(std::string& text) { block_.ReadStr(text); }
  void Connection(std::string& plain, bool) {
    block_.ReadStr(plain);
    ScrambleConnectionText(plain);  // its own inverse
  }

 private:
  CBlock& block_;
  std::string_view version_text_;
};

// The walks over a whole header record: `fields(io, record)` lists its fields.
template <class Record, class Fields>
int64_t EncodedSize(const Record& record, Fields fields) {
  SizeCounter io;
  fields(io, record);
  return io.Bytes();
}

template <class Record, class Fields>
Record ReadBlockZero(BFile& file, std::string_view version_message, Fields fields) {
  CBlock block(kHeaderBlockUnits);
  file.SeekToBlock(0);
  file.ReadBlock(block);
  Record read;
  Reader io(block, version_message);
  fields(io, read);
  return read;
}

// Refuses (too_long names the record and takes the sizes) a record that does
// not fit block 0 before the file is touched.
template <class Record, class Fields>
void WriteBlockZero(BFile& file, const Record& record, Fields fields, const char* too_long,
                    const char* method) {
  const int64_t size = EncodedSize(record, fields);
  if (size > kMaxEncodedSize) {
    throw CHighStructuresException::Text(too_long, method, nullptr, size, kMaxEncodedSize);
  }
  CBlock block(kHeaderBlockUnits);
  Writer io(block);
  fields(io, record);
  file.SeekToBlock(0);
  file.WriteBlock(block);
}

}  // namespace qm::header_io
