// Findex headers and order infos in block 0: every field back as written, the
// version rule, the bytes on disk, over-long definitions, damaged header blocks
// and the order SELECT.
#include <gtest/gtest.h>

#include <random>
#include <string>
#include <vector>

#include "support/file_test_util.h"
#include "format/bfile.h"
#include "base/connection_scramble.h"
#include "base/exception_family.h"
#include "format/index_header.h"
#include "format/order_info.h"

namespace qm {
namespace {

using test::RaisedChain;
using test::RaisedText;

CIndexHeader FullHeader() {
  CIndexHeader h;
  h.HeaderWord0 = -5; h.BlockNum = 77; h.BuildState = 1; h.FindexType = 4;
  h.IndexName = "Books"; h.TableName = "books"; h.SqlUsedAsTable = 1; h.KeyColumn = "id";
  h.SqlSelect = "select id, title from books where x = 'ä'";
  h.Columns = {{"body", {}}, {"title", {{"CONTENT_WEIGHT", "3"}, {"CONTENT_TYPE", "URL"}}}};
  h.SortMax = 123456; h.WordCount = 9; h.KeyCount = 8; h.DistinctWordCount = 7;
  h.ConnectionString = "DSN=books;UID=sa;PWD=secret"; h.DisplayName = "BOOKS";
  h.BuildTime = {2024, 3, 9, 14, 5, 7, 0}; h.LastUpdateTime = {2024, 3, 10, 1, 2, 3, 0};
  h.DateTimeKeyColumn = "changed"; h.MaxDateTimeKey = {2023, 12, 31, 23, 59, 59, 999999999};
  h.ExtraWord1 = 11; h.ExtraWord3 = 33; h.ExtraWord2 = 22; h.GeneralFlags = 1 | 2 | 8 | 16;
  h.IndexMaxSize = 2; h.IndexStartValue = 100; h.Separators = u" .,;\u00ab"; h.UpdateFlags = 3;
  h.UpdateSupport = 1; h.LanguageFlags = 21; h.Language = 5;
  return h;
}

COrderInfo FullOrder() {
  COrderInfo o;
  o.OrderType = 2; o.OrderName = "ByTitle"; o.TableName = "books"; o.SqlSelect = "select * from books";
  o.Columns = {{"title", {1, 2, 3}}, {"price", {-4, 5, 6}}};
  o.KeyColumn = "id"; o.Count = 42; o.SortMax = 500; o.ConnectionString = "DSN=books";
  o.DisplayName = "BOOKS"; o.BuildTime = {2024, 1, 2, 3, 4, 5, 6}; o.LastUpdateTime = {2024, 1, 2, 3, 4, 6, 0};
  o.DateTimeKeyColumn = "changed"; o.MaxDateTimeKey = {2024, 3, 9, 14, 5, 7, 5};
  o.GeneralFlags = 3; o.IgnoreChars = u"-_"; o.UpdateFlags = 3;
  return o;
}

class HeaderFile : public ::testing::Test {
 protected:
  std::string Path(const std::string& name) const { return dir_.Path() + name; }
  template <class Record>
  void Write(const Record& r, const std::string& name) {
    BFile file;
    file.OpenFile(Path(name), BFile::kCreate, 64);
    r.WriteInfo(file);
    file.Close();
  }
  template <class Record>
  Record Read(const std::string& name, Record r = Record{}) {
    BFile file;
    file.OpenFile(Path(name), BFile::kReadOnly, 64);
    r.ReadInfo(file);
    return r;
  }
  // Puts a 32-bit value at offset of the file.
  void Patch(const std::string& name, std::size_t offset, int32_t v) {
    std::string bytes = test::ReadFile(Path(name));
    for (int i = 0; i < 4; ++i) bytes[offset + i] = static_cast<char>((v >> (8 * i)) & 0xFF);
    test::WriteFile(Path(name), bytes);
  }
  test::ScratchDir dir_{"headers"};
};

TEST_F(HeaderFile, EveryIndexFieldReadsBackStampedWithTheEngineVersion) {
  const CIndexHeader written = FullHeader();
  Write(written, "h.sdx");
  const std::string bytes = test::ReadFile(Path("h.sdx"));
  ASSERT_EQ(bytes.size(), 4096u);
  const auto used = static_cast<std::size_t>(written.EncodedSize());
  // used as 32 bits, then header word 0, the block count, 614 and "6.14".
  const std::string used_word({static_cast<char>(used & 0xFF), static_cast<char>(used >> 8), 0, 0, 0, 0});
  EXPECT_EQ(bytes.substr(0, 24),
            used_word + std::string("\xFB\xFF\xFF\xFF\x4D\0\0\0\x66\x02\0\0\x04\0", 14) + "6.14");
  EXPECT_EQ(bytes.find_first_not_of('\0', used), std::string::npos);  // a fresh block behind the fields

  // The connection is stored scrambled.
  std::string scrambled = written.ConnectionString;
  ScrambleConnectionText(scrambled);
  EXPECT_EQ(bytes.find(written.ConnectionString), std::string::npos);
  EXPECT_NE(bytes.find(scrambled), std::string::npos);

  CIndexHeader expected = written;
  expected.Version = 614;
  expected.VersionText = "6.14";
  EXPECT_EQ(Read<CIndexHeader>("h.sdx"), expected);

  // Without flag 8 the connection is not saved.
  CIndexHeader unsaved = written;
  unsaved.GeneralFlags = 6;
  Write(unsaved, "u.sdx");
  EXPECT_EQ(Read<CIndexHeader>("u.sdx").ConnectionString, "");
  EXPECT_EQ(test::ReadFile(Path("u.sdx")).find(scrambled), std::string::npos);
}

TEST_F(HeaderFile, EveryOrderFieldReadsBack) {
  COrderInfo written = FullOrder();
  written.UpdateSupport = 1;
  Write(written, "o.sri");
  EXPECT_EQ(test::ReadFile(Path("o.sri")).substr(6, 10), std::string("\x66\x02\0\0\x04\0", 6) + "6.14");
  COrderInfo holder;
  holder.UpdateSupport = 9;  // not in the file: stays
  COrderInfo expected = written;
  expected.Version = 614;
  expected.VersionText = "6.14";
  expected.UpdateSupport = 9;
  EXPECT_EQ(Read<COrderInfo>("o.sri", holder), expected);
}

TEST_F(HeaderFile, SameHeaderSameBytes) {
  const CIndexHeader h = FullHeader();
  Write(h, "a.sdx");
  const std::string first = test::ReadFile(Path("a.sdx"));
  CIndexHeader longer = h;
  longer.SqlSelect.append(1500, 'x');
  BFile file;
  file.OpenFile(Path("b.sdx"), BFile::kCreate, 64);
  longer.WriteInfo(file);
  h.WriteInfo(file);  // over the longer one in place
  file.Close();
  EXPECT_EQ(test::ReadFile(Path("b.sdx")), first);
}

TEST_F(HeaderFile, VersionsFrom601To700Only) {
  for (int32_t version : {600, 601, 700, 701, -1}) {
    Write(FullHeader(), "v.sdx");
    Patch("v.sdx", 14, version);
    Write(FullOrder(), "v.sri");
    Patch("v.sri", 6, version);
    if (version == 601 || version == 700) {
      EXPECT_EQ(Read<CIndexHeader>("v.sdx").Version, version);
      EXPECT_EQ(Read<COrderInfo>("v.sri").Version, version);
      continue;
    }
    CIndexHeader kept = FullHeader();
    EXPECT_EQ(RaisedChain<CHighStructuresException>([&] { Read("v.sdx", kept); }),
              std::vector<std::string>{
                  "Unsupported index version. Quillmere Search v6.14 does not support indexes build "
                  "with Quillmere Search lower than v601 (Module:HighStructures,Method:ReadHeader)"})
        << version;
    EXPECT_EQ(RaisedText<CHighStructuresException>([&] { Read<COrderInfo>("v.sri"); }),
              "Unsupported order version. Quillmere Search v6.14 does not support orders build "
              "with Quillmere Search lower than v601 (Module:HighStructures,Method:ReadHeader)")
        << version;
  }
}

TEST_F(HeaderFile, FailedReadsAreWrappedAndLeaveTheRecordAlone) {
  Write(FullHeader(), "t.sdx");
  test::WriteFile(Path("t.sdx"), test::ReadFile(Path("t.sdx")).substr(0, 4000));
  CIndexHeader h;
  h.IndexName = "Kept";
  BFile file;
  file.OpenFile(Path("t.sdx"), BFile::kReadOnly, 64);
  EXPECT_EQ(RaisedChain<CHighStructuresException>([&] { h.ReadInfo(file); }),
            (std::vector<std::string>{
                "General Error (Module:HighStructures,Method:CIndexHeader::ReadInfo)",
                "Error reading block 0 of " + Path("t.sdx") +
                    ": 4000 of 4096 bytes read (Module:BFile,Method:ReadBlock)"}));
  EXPECT_EQ(h.IndexName, "Kept");

  // A used count that ends inside the fields: the read that runs past it fails.
  Write(FullOrder(), "s.sri");
  Patch("s.sri", 0, 40);
  const auto chain = RaisedChain<CHighStructuresException>([&] { Read<COrderInfo>("s.sri"); });
  ASSERT_EQ(chain.size(), 3u);
  EXPECT_EQ(chain[0], "General Error (Module:HighStructures,Method:COrderInfo::ReadInfo)");
  EXPECT_EQ(chain[2], "Error reading string at byte 40 of block 0 of " + Path("s.sri") +
                          ", used 40 (Module:Block,Method:ReadStr)");
}

TEST_F(HeaderFile, OverLongDefinitionsAreRefusedBeforeWriting) {
  CIndexHeader h = FullHeader();
  h.SqlSelect.clear();
  const int64_t base = h.EncodedSize();
  h.SqlSelect.assign(static_cast<std::size_t>(4095 - base), 's');
  EXPECT_EQ(h.EncodedSize(), 4095);
  EXPECT_TRUE(h.FitsHeaderBlock());
  Write(h, "edge.sdx");
  EXPECT_EQ(Read<CIndexHeader>("edge.sdx").SqlSelect, h.SqlSelect);

  h.Columns["one_more"] = {};
  EXPECT_FALSE(h.FitsHeaderBlock());
  BFile file;
  file.OpenFile(Path("edge.sdx"), 2, 64);
  EXPECT_EQ(RaisedText<CHighStructuresException>([&] { h.WriteInfo(file); }),
            "Index definition too long: its header needs " + std::to_string(h.EncodedSize()) +
                " bytes, block 0 holds 4095 (Module:HighStructures,Method:CIndexHeader::WriteInfo)");
  file.Close();
  EXPECT_EQ(test::ReadFile(Path("edge.sdx")), "");  // not even a truncated block

  COrderInfo o = FullOrder();
  o.Columns.resize(400, OrderColumn{"column", {}});
  file.OpenFile(Path("o.sri"), BFile::kCreate, 64);
  EXPECT_FALSE(o.FitsHeaderBlock());
  EXPECT_THROW(o.WriteInfo(file), CHighStructuresException);
  EXPECT_EQ(file.BlockCount(), 0);
}

// Every way a header block can be damaged ends in a HighStructures error (the
// unknown exception would mean something escaped the checks), never in a
// crash or an endless loop.
TEST_F(HeaderFile, TruncatedOrScrambledHeaderBlocksAreRefused) {
  Write(FullHeader(), "h");
  Write(FullOrder(), "o");
  const std::string header = test::ReadFile(Path("h")), order = test::ReadFile(Path("o"));
  for (std::size_t cut = 0; cut < 4096; cut += 293) {
    test::WriteFile(Path("t"), header.substr(0, cut));
    EXPECT_THROW(Read<CIndexHeader>("t"), CHighStructuresException) << cut;
  }
  // A few bytes changed within the fields behind the version, sometimes the
  // used count too; or noise behind a valid version.
  std::mt19937 random(99);
  for (int round = 0; round < 400; ++round) {
    const bool index = round % 2 == 0;
    std::string bytes = index ? header : order;
    if (round % 4 < 2) {
      const int64_t used = index ? FullHeader().EncodedSize() : FullOrder().EncodedSize();
      for (int k = 0; k < 3; ++k) bytes[18 + random() % static_cast<uint32_t>(used - 18)] = static_cast<char>(random());
      if (round % 7 == 0) bytes[1] = static_cast<char>(random() % 32);
    } else {
      for (std::size_t i = 18; i < bytes.size(); ++i) {
        bytes[i] = static_cast<char>(random() % 3 == 0 ? random() % 3 : random());
      }
      bytes[0] = static_cast<char>(0xFF);
      bytes[1] = 0x0F;
    }
    test::WriteFile(Path("r"), bytes);
    try {
      index ? static_cast<void>(Read<CIndexHeader>("r")) : static_cast<void>(Read<COrderInfo>("r"));
    } catch (const CHighStructuresException&) {
    }
  }
}

}  // namespace
}  // namespace qm
