// Damaged index files: random and truncated block contents and header blocks
// end in the family's "Block"/"BFile"/"HighStructures" errors, never in a
// crash, a read outside the block or an endless loop.
#include <gtest/gtest.h>

#include <random>
#include <string>
#include <vector>

#include "file_test_util.h"
#include "shared/bfile.h"
#include "shared/block.h"
#include "shared/exception_family.h"
#include "shared/index_header.h"
#include "shared/order_info.h"
#include "support/test_support.h"

namespace qm {
namespace {

constexpr VALUE_TYPE kTypes[] = {VALUE_TYPE::Integer, VALUE_TYPE::AsciiString, VALUE_TYPE::DateTime,
                                 VALUE_TYPE::UnicodeString, VALUE_TYPE::Double};

CValue Key(VALUE_TYPE type, std::mt19937& random) {
  CValue v;
  switch (type) {
    case VALUE_TYPE::AsciiString: v.SetText(std::string(random() % 4, static_cast<char>('a' + random() % 26))); break;
    case VALUE_TYPE::UnicodeString: v.SetTextW(std::u16string(random() % 4, static_cast<char16_t>(random()))); break;
    case VALUE_TYPE::Integer: v.SetInteger(static_cast<int32_t>(random())); break;
    case VALUE_TYPE::Double: v.SetDouble(static_cast<double>(static_cast<int32_t>(random()))); break;
    case VALUE_TYPE::DateTime: v.SetDateTime({static_cast<int16_t>(random() % 3000), 1, 1, 0, 0, 0, 0}); break;
  }
  return v;
}

// Runs op; a Block error is an acceptable answer to damage, anything else is not.
template <class Op>
void Survives(Op op) {
  try {
    op();
  } catch (const CBlockException&) {
  }
}

TEST(DamagedBlocks, RandomContentsGiveAnswersOrBlockErrors) {
  std::mt19937 random(4242);
  for (int round = 0; round < 1500; ++round) {
    CBlock block(round % 2 == 0 ? 1 : 64);
    const int32_t size = block.Size();
    // Short rows are likelier with small lengths: bias half the bytes to 0..3.
    for (int32_t i = 6; i < size; ++i) {
      block.Data()[i] = static_cast<uint8_t>(random() % 2 == 0 ? random() % 4 : random());
    }
    block.SetUsed(6 + static_cast<int32_t>(random() % static_cast<uint32_t>(size - 5)));
    const VALUE_TYPE type = kTypes[round % 5];
    const CValue key = Key(type, random);
    const auto flags = static_cast<int32_t>(random() % 256);

    Survives([&] { block.GetRowStartId(key, key, static_cast<int32_t>(random() % 3), flags); });
    Survives([&] { block.GetRowStopId(key); });
    Survives([&] { block.GetRowStopIdAtOrAfter(key); });
    Survives([&] { block.GetRowStopIdDescending(key); });
    Survives([&] { block.GetNodeChildId(key); });
    Survives([&] {
      block.SetCursor(6);
      CValue v(type);
      while (!block.AtEnd()) block.ReadValue(v);
    });
    const int32_t used = block.GetUsed();
    Survives([&] { block.InsertRowLeaf(key, 1); });
    if (block.GetUsed() != used) {  // went in: whole, and before the block size
      ASSERT_EQ(block.GetUsed(), used + CBlock::ValueBytes(key) + 4);
      ASSERT_LT(block.GetUsed(), size);
    }
  }
}

class DamagedFiles : public ::testing::Test {
 protected:
  std::string Path(const std::string& name) const { return dir_.Path() + name; }
  test::ScratchDir dir_{"damaged"};
};

// Every way a header block can be damaged ends in a HighStructures error (the
// unknown exception would mean something escaped the checks).
template <class Record>
void ReadsOrRefuses(const std::string& path) {
  BFile file;
  file.OpenFile(path, BFile::kReadOnly, 64);
  Record r;
  try {
    r.ReadInfo(file);
  } catch (const CHighStructuresException&) {
  }
}

TEST_F(DamagedFiles, HeaderBlocksTruncatedOrScrambled) {
  CIndexHeader h;
  h.IndexName = "Books";
  h.Columns = {{"title", {{"CONTENT_WEIGHT", "3"}}}, {"body", {}}};
  h.Separators = u" .,";
  COrderInfo o;
  o.OrderName = "ByTitle";
  o.Columns = {{"title", {1, 2, 3}}};
  BFile file;
  file.OpenFile(Path("h"), BFile::kCreate, 64);
  h.WriteInfo(file);
  file.OpenFile(Path("o"), BFile::kCreate, 64);
  o.WriteInfo(file);
  file.Close();
  const std::string header = test::ReadFile(Path("h"));
  const std::string order = test::ReadFile(Path("o"));

  for (std::size_t cut = 0; cut < 4096; cut += 97) {
    test::WriteFile(Path("t"), header.substr(0, cut));
    file.OpenFile(Path("t"), BFile::kReadOnly, 64);
    CIndexHeader read;
    EXPECT_THROW(read.ReadInfo(file), CHighStructuresException) << cut;
    file.Close();
  }

  // A few bytes changed within the fields behind the version, sometimes the
  // used count too; or noise behind a valid version.
  std::mt19937 random(99);
  for (int round = 0; round < 800; ++round) {
    const bool index = round % 2 == 0;
    std::string bytes = index ? header : order;
    if (round % 4 < 2) {
      const int64_t used = index ? h.EncodedSize() : o.EncodedSize();
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
    if (index) {
      ReadsOrRefuses<CIndexHeader>(Path("r"));
    } else {
      ReadsOrRefuses<COrderInfo>(Path("r"));
    }
  }
}

}  // namespace
}  // namespace qm
