// Block items: every encoding written and read back, the exact room tests, and
// failed inserts and reads that leave the block as it was and say why.
#include <gtest/gtest.h>

#include <array>
#include <string>
#include <vector>

#include "core_test_support.h"
#include "file_test_util.h"
#include "shared/block.h"
#include "shared/cwstr.h"
#include "shared/exception_family.h"
#include "test_values.h"

namespace qm {
namespace {

using test::RaisedChain;
using test::RaisedText;
using test::Value;

std::vector<uint8_t> Bytes(const CBlock& b) {
  return {b.Data(), b.Data() + b.Size() + CBlock::kHeaderBytes};
}

const DateTimeValue kDate{-12, 3, 9, 14, 5, 7, 123456789};

TEST(BlockItems, EveryItemReadsBackAsWritten) {
  CBlock block(64);
  block.InsertInt(-7);
  block.InsertShort(65535);
  block.InsertDouble(-2.5e300);
  block.InsertDate(kDate);
  block.InsertStr("Grüße");
  block.InsertStrW(u"\u00e9\u4e2d\U0001F600");
  block.InsertStr("");
  for (const CValue& v : {Value("abc"), Value(u"x\u0100"), Value(INT32_MIN), Value(0.125), Value(kDate)}) {
    block.InsertValue(v);
  }
  // Little-endian, no tags: the int and the short open the items.
  EXPECT_EQ(std::vector<uint8_t>(block.Data() + 6, block.Data() + 12),
            (std::vector<uint8_t>{0xF9, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF}));
  const int32_t used = block.GetUsed();

  block.SetCursor(6);
  EXPECT_EQ(block.ReadInt(), -7);
  EXPECT_EQ(block.ReadShort(), 65535);
  EXPECT_EQ(block.ReadDouble(), -2.5e300);
  EXPECT_EQ(block.ReadDate(), kDate);
  std::string narrow = "old";
  block.ReadStr(narrow);
  EXPECT_EQ(narrow, "Grüße");
  CWStr wide;
  block.ReadStrW(wide);
  EXPECT_EQ(wide.View(), u"\u00e9\u4e2d\U0001F600");
  block.ReadStr(narrow);
  EXPECT_EQ(narrow, "");
  std::vector<CValue> values = {CValue(VALUE_TYPE::AsciiString), CValue(VALUE_TYPE::UnicodeString),
                                CValue(VALUE_TYPE::Integer), CValue(VALUE_TYPE::Double),
                                CValue(VALUE_TYPE::DateTime)};
  for (CValue& v : values) block.ReadValue(v);
  EXPECT_EQ(values[0].Narrow(), "abc");
  EXPECT_EQ(values[1].Wide(), u"x\u0100");
  EXPECT_EQ(values[2].GetInteger(), INT32_MIN);
  EXPECT_EQ(values[3].GetDouble(), 0.125);
  EXPECT_EQ(values[4].GetDateTime(), kDate);
  EXPECT_TRUE(block.AtEnd());
  EXPECT_EQ(block.GetUsed(), used);
}

TEST(BlockItems, InsertsFitOnlyBeforeTheBlockSize) {
  CBlock block(64);
  block.SetCursor(4090);
  block.InsertInt(1);  // 4,094 < 4,096
  EXPECT_EQ(block.GetUsed(), 4094);
  // Each refusal leaves every byte, the used count and the cursor unchanged.
  const auto refuses = [&](int32_t cursor, auto insert) {
    block.SetCursor(cursor);
    const auto before = Bytes(block);
    EXPECT_THROW(insert(), CBlockException) << cursor;
    EXPECT_EQ(Bytes(block), before);
    EXPECT_EQ(block.GetUsed(), 4094);
    EXPECT_EQ(block.GetCursor(), cursor);
  };
  refuses(4092, [&] { block.InsertInt(1); });
  refuses(4088, [&] { block.InsertDouble(1); });
  refuses(4080, [&] { block.InsertDate(kDate); });
  refuses(4094, [&] { block.InsertShort(1); });
  refuses(4084, [&] { block.InsertStr("0123456789"); });  // 4,084 + 2 + 10 = 4,096
  refuses(4088, [&] { block.InsertStrW(u"abc"); });
  refuses(4088, [&] { block.InsertValue(Value(1.0)); });
  refuses(4080, [&] { block.InsertRow(Value("0123456789abcd")); });
  refuses(-1, [&] { block.InsertInt(1); });
  block.SetCursor(4083);
  block.InsertStr("0123456789");  // 4,095 < 4,096
  block.SetCursor(4087);
  block.InsertDouble(2);
  EXPECT_EQ(block.GetUsed(), 4095);
}

TEST(BlockItems, RowRoomIsUsedPlusValuePlusSixBelowTheSize) {
  CBlock block(64);
  // Room at used = 4096 - 6 - bytes - 1 (4,077 for ten narrow bytes), none a byte later.
  const std::vector<std::pair<CValue, int32_t>> cases = {
      {Value("0123456789"), 12}, {Value(u"abcd"), 10}, {Value(1), 4}, {Value(1.0), 8}, {Value(kDate), 16}};
  for (const auto& [value, bytes] : cases) {
    block.SetUsed(4096 - 6 - bytes - 1);
    EXPECT_TRUE(block.IsFreeRowLeaf(value) && block.IsFreeRowNode(value)) << bytes;
    block.SetUsed(4096 - 6 - bytes);
    EXPECT_FALSE(block.IsFreeRowLeaf(value) || block.IsFreeRowNode(value)) << bytes;
  }
  test::ConfiguredHome home;
  CValue odd;
  odd.SetType(static_cast<VALUE_TYPE>(5));
  EXPECT_EQ(RaisedText<CBlockException>([&] { block.IsFreeRowLeaf(odd); }),
            "General Error (Module:Block,Method:IsFreeRowLeaf)");
  EXPECT_NE(test::TraceOf(home, "SHARELIB_ERROR").find("Block.IsFreeRowLeaf - Unrecognized type 5"),
            std::string::npos);
}

TEST(BlockItems, FailuresAreTracedAlwaysAndReadsNameTheBlock) {
  test::ConfiguredHome home;
  CBlock block(64);
  block.SetCursor(4092);
  EXPECT_EQ(RaisedText<CBlockException>([&] { block.InsertInt(1); }),
            "General Error (Module:Block,Method:InsertInt)");
  block.SetCursor(4090);
  EXPECT_THROW(block.InsertValue(Value("abcd")), CBlockException);

  block.Reset();
  block.InsertInt(1);  // used 10: a second int lies past the used bytes
  EXPECT_EQ(RaisedChain<CBlockException>([&] { block.ReadInt(); }),
            (std::vector<std::string>{
                "General Error (Module:Block,Method:ReadInt)",
                "Error reading int at byte 10 of a block in memory, used 10 (Module:Block,Method:ReadInt)"}));
  block.SetOrigin(7, "/idx/Books.sdx");
  block.SetCursor(8);
  EXPECT_EQ(RaisedChain<CBlockException>([&] { block.ReadDouble(); }).back(),
            "Error reading double at byte 8 of block 7 of /idx/Books.sdx, used 10 "
            "(Module:Block,Method:ReadDouble)");
  EXPECT_EQ(block.GetCursor(), 8);

  const std::string log = test::TraceOf(home, "SHARELIB_ERROR");
  for (const char* line : {"Block.InsertInt - Error inserting int\r\n",
                           "Block.InsertValue - Error inserting string value\r\n",
                           "Block.ReadInt - Error reading int at byte 10",
                           "Block.ReadDouble - Error reading double at byte 8 of block 7"}) {
    EXPECT_NE(log.find(line), std::string::npos) << line << "\n" << log;
  }
}

TEST(BlockItems, StringLengthsAreChecked) {
  CBlock block(64);
  block.InsertStr("hello");
  block.InsertStrW(u"hi");
  block.SetCursor(6);
  std::array<char, 5> small{};
  EXPECT_THROW(block.ReadStr(std::span<char>(small)), CBlockException);  // no room for the 0
  EXPECT_EQ(block.GetCursor(), 6);
  std::array<char, 6> fits{};
  EXPECT_EQ(block.ReadStr(std::span<char>(fits)), 5u);
  EXPECT_STREQ(fits.data(), "hello");
  std::array<char16_t, 3> wide{};
  EXPECT_EQ(block.ReadStrW(std::span<char16_t>(wide)), 2u);
  EXPECT_EQ(std::u16string(wide.data()), u"hi");

  // A negative length, and a length running past the used bytes.
  block.Reset();
  for (uint16_t v : {0x8000, 3, 0x4141}) block.InsertShort(v);
  std::string text;
  block.SetCursor(6);
  EXPECT_EQ(RaisedChain<CBlockException>([&] { block.ReadStr(text); }).back(),
            "Error reading string at byte 6 of a block in memory, used 12 (Module:Block,Method:ReadStr)");
  block.SetCursor(8);
  std::u16string wtext;
  EXPECT_EQ(RaisedChain<CBlockException>([&] { block.ReadStrW(wtext); }).back(),
            "Error reading unicode string at byte 8 of a block in memory, used 12 "
            "(Module:Block,Method:ReadStrW)");
  CValue value(VALUE_TYPE::AsciiString);
  EXPECT_THROW(block.ReadValue(value), CBlockException);
  EXPECT_EQ(block.GetCursor(), 8);
}

TEST(BlockItems, ResetAndReleasedBlocks) {
  CBlock block(64);
  block.InsertStr("stale bytes");
  block.Reset();
  EXPECT_EQ(Bytes(block), Bytes(CBlock(64)));  // a reset block is a new block
  block.Release();
  EXPECT_THROW(block.InsertInt(1), CBlockException);
  EXPECT_THROW(block.GetRowStopId(Value(1)), CBlockException);
}

}  // namespace
}  // namespace qm
