// Block items: every encoding written and read back, the exact room tests, and
// failed inserts and reads that leave the block as it was and say why.
#include <gtest/gtest.h>

#include <array>
#include <string>
#include <vector>

#include "core_test_support.h"
#include "file_test_util.h"
#include "shared/block.h"
#include "shared/cstr.h"
#include "shared/cwstr.h"
#include "shared/exception_family.h"

namespace qm {
namespace {

using test::RaisedChain;
using test::RaisedText;

CValue Narrow(std::string_view s) {
  CValue v;
  v.SetText(s);
  return v;
}
CValue Wide(std::u16string_view s) {
  CValue v;
  v.SetTextW(s);
  return v;
}
CValue Int(int32_t i) {
  CValue v;
  v.SetInteger(i);
  return v;
}
CValue Real(double d) {
  CValue v;
  v.SetDouble(d);
  return v;
}
CValue Date(const DateTimeValue& d) {
  CValue v;
  v.SetDateTime(d);
  return v;
}

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
  for (const CValue& v : {Narrow("abc"), Wide(u"x\u0100"), Int(INT32_MIN), Real(0.125), Date(kDate)}) {
    block.InsertValue(v);
  }
  // Little-endian, no tags: the int and the short open the items.
  EXPECT_EQ(std::vector<uint8_t>(block.Data() + 6, block.Data() + 12),
            (std::vector<uint8_t>{0xF9, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF}));
  const int32_t used = block.GetUsed();
  EXPECT_EQ(used, block.GetCursor());

  block.SetCursor(6);
  EXPECT_EQ(block.ReadInt(), -7);
  EXPECT_EQ(block.ReadShort(), 65535);
  EXPECT_EQ(block.ReadDouble(), -2.5e300);
  EXPECT_EQ(block.ReadDate(), kDate);
  std::string narrow;
  block.ReadStr(narrow);
  EXPECT_EQ(narrow, "Grüße");
  CWStr wide;
  block.ReadStrW(wide);
  EXPECT_EQ(wide.View(), u"\u00e9\u4e2d\U0001F600");
  CStr empty("old");
  block.ReadStr(empty);
  EXPECT_EQ(empty.Length(), 0u);
  CValue text(VALUE_TYPE::AsciiString), wtext(VALUE_TYPE::UnicodeString), i, d(VALUE_TYPE::Double),
      t(VALUE_TYPE::DateTime);
  for (CValue* v : {&text, &wtext, &i, &d, &t}) block.ReadValue(*v);
  EXPECT_EQ(text.Narrow(), "abc");
  EXPECT_EQ(wtext.Wide(), u"x\u0100");
  EXPECT_EQ(i.GetInteger(), INT32_MIN);
  EXPECT_EQ(d.GetDouble(), 0.125);
  EXPECT_EQ(t.GetDateTime(), kDate);
  EXPECT_TRUE(block.AtEnd());
  EXPECT_EQ(block.GetUsed(), used);
}

TEST(BlockItems, InsertsFitOnlyBeforeTheBlockSize) {
  CBlock block(64);
  block.SetCursor(4090);
  block.InsertInt(1);  // 4,094 < 4,096
  EXPECT_EQ(block.GetUsed(), 4094);

  // Each failure leaves every byte, the used count and the cursor unchanged.
  const auto refuses = [&](int32_t cursor, auto insert) {
    block.SetCursor(cursor);
    const auto before = Bytes(block);
    const int32_t used = block.GetUsed();
    EXPECT_THROW(insert(), CBlockException) << cursor;
    EXPECT_EQ(Bytes(block), before);
    EXPECT_EQ(block.GetUsed(), used);
    EXPECT_EQ(block.GetCursor(), cursor);
  };
  refuses(4092, [&] { block.InsertInt(1); });
  refuses(4088, [&] { block.InsertDouble(1); });
  refuses(4080, [&] { block.InsertDate(kDate); });
  refuses(4094, [&] { block.InsertShort(1); });
  refuses(4084, [&] { block.InsertStr("0123456789"); });  // 4,084 + 2 + 10 = 4,096
  refuses(4088, [&] { block.InsertStrW(u"abc"); });
  refuses(4088, [&] { block.InsertValue(Real(1)); });
  refuses(4080, [&] { block.InsertRow(Narrow("0123456789abcd")); });
  refuses(-1, [&] { block.InsertInt(1); });
  block.SetCursor(4083);
  block.InsertStr("0123456789");  // 4,095 < 4,096
  EXPECT_EQ(block.GetUsed(), 4095);
  block.SetCursor(4093);
  block.InsertShort(2);
  block.SetCursor(4087);
  block.InsertDouble(2);
}

TEST(BlockItems, RowRoomIsUsedPlusValuePlusSixBelowTheSize) {
  CBlock block(64);
  // The edge of each type: room at used = 4096 - 6 - bytes - 1, none a byte later.
  const std::vector<std::pair<CValue, int32_t>> cases = {
      {Narrow("0123456789"), 12}, {Wide(u"abcd"), 10}, {Int(1), 4}, {Real(1), 8}, {Date(kDate), 16}};
  for (const auto& [value, bytes] : cases) {
    block.SetUsed(4096 - 6 - bytes - 1);
    EXPECT_TRUE(block.IsFreeRowLeaf(value)) << bytes;
    EXPECT_TRUE(block.IsFreeRowNode(value)) << bytes;
    block.SetUsed(4096 - 6 - bytes);
    EXPECT_FALSE(block.IsFreeRowLeaf(value)) << bytes;
    EXPECT_FALSE(block.IsFreeRowNode(value)) << bytes;
  }
  EXPECT_EQ(4096 - 6 - 12 - 1, 4077);

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
  EXPECT_THROW(block.InsertValue(Narrow("abcd")), CBlockException);

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
  EXPECT_THROW(block.ReadStr(std::span<char>(small)), CBlockException);  // needs room for 0
  EXPECT_EQ(block.GetCursor(), 6);
  std::array<char, 6> fits{};
  EXPECT_EQ(block.ReadStr(std::span<char>(fits)), 5u);
  EXPECT_STREQ(fits.data(), "hello");
  std::array<char16_t, 3> wide{};
  EXPECT_EQ(block.ReadStrW(std::span<char16_t>(wide)), 2u);
  EXPECT_EQ(std::u16string(wide.data()), u"hi");

  // A negative length, and a length running past the used bytes.
  block.Reset();
  block.InsertShort(0x8000);
  block.InsertShort(3);
  block.InsertShort(0x4141);
  std::string text;
  block.SetCursor(6);
  EXPECT_EQ(RaisedChain<CBlockException>([&] { block.ReadStr(text); }).back(),
            "Error reading string at byte 6 of a block in memory, used 12 (Module:Block,Method:ReadStr)");
  block.SetCursor(8);
  EXPECT_THROW(block.ReadStr(text), CBlockException);
  block.SetCursor(8);
  std::u16string wtext;
  EXPECT_EQ(RaisedChain<CBlockException>([&] { block.ReadStrW(wtext); }).back(),
            "Error reading unicode string at byte 8 of a block in memory, used 12 "
            "(Module:Block,Method:ReadStrW)");
  CValue value(VALUE_TYPE::AsciiString);
  block.SetCursor(8);
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
  EXPECT_THROW(block.ReadInt(), CBlockException);
  EXPECT_THROW(block.GetRowStopId(Int(1)), CBlockException);
}

}  // namespace
}  // namespace qm
