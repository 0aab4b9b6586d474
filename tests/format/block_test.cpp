// Blocks and block files: the header on disk, every item encoding, the exact
// room tests, sorted leaf inserts, the row searches with every answer on
// hand-built leaves, and random block contents that end in Block errors.
#include <gtest/gtest.h>

#include <array>
#include <random>
#include <string>
#include <utility>
#include <vector>

#include "support/file_test_util.h"
#include "format/bfile.h"
#include "format/block.h"
#include "base/cwstr.h"
#include "base/exception_family.h"

namespace qm {
namespace {

using test::RaisedChain;
using test::RaisedText;
using test::Value;
using Rows = std::vector<std::pair<std::string, int32_t>>;

std::string Word(uint16_t v) { return {static_cast<char>(v & 0xFF), static_cast<char>(v >> 8)}; }
std::vector<uint8_t> Bytes(const CBlock& b) { return {b.Data(), b.Data() + b.Size() + CBlock::kHeaderBytes}; }
const DateTimeValue kDate{-12, 3, 9, 14, 5, 7, 123456789};

// A leaf whose rows are appended as given (no sorting).
CBlock Leaf(const Rows& rows) {
  CBlock block(64);
  for (const auto& [value, id] : rows) {
    block.InsertValue(Value(value));
    block.InsertInt(id);
  }
  return block;
}

Rows RowsOf(CBlock& block) {
  Rows rows;
  block.SetCursor(6);
  while (!block.AtEnd()) {
    CValue v(VALUE_TYPE::AsciiString);
    block.ReadValue(v);
    rows.emplace_back(std::string(v.Narrow()), block.ReadInt());
  }
  return rows;
}

TEST(Block, HeaderPositionsResetAndReleasedBlocks) {
  CBlock block(64);
  EXPECT_EQ(std::string(reinterpret_cast<const char*>(block.Data()), 6), Word(6) + Word(0) + Word(0));
  EXPECT_EQ(block.GetCursor(), 6);
  block.InsertStr("stale bytes");
  block.SetUsed(300);
  block.Reset();
  EXPECT_EQ(block.GetUsed(), 6);
  EXPECT_EQ(Bytes(block), Bytes(CBlock(64)));  // a reset block is a new block

  EXPECT_EQ(RaisedText<CBlockException>([] { CBlock b(512); }),
            "Could not allocate memory size: 32772 (Module:Block,Method:Blobk)");
  test::ConfiguredHome home;
  block.Release();
  EXPECT_EQ(RaisedText<CBlockException>([&] { block.Reset(); }),
            "General Error (Module:Block,Method:Reset)");
  // The cause is traced whatever the trace level.
  EXPECT_TRUE(test::Has(test::TraceOf(home, "SHARELIB_ERROR"), " Block.Reset - Block not open\r\n"));
}

class BFileTest : public ::testing::Test {
 protected:
  std::string Path(const std::string& name) const { return dir_.Path() + name; }
  test::ScratchDir dir_{"bfile"};
};

TEST_F(BFileTest, ModesSizesAndDamage) {
  BFile file;
  EXPECT_EQ(RaisedText<CBFileException>([&] { file.OpenFile(Path("i"), 4, 64); }),
            "Unknown index mode (Module:BFile,Method:OpenFile)");
  EXPECT_EQ(RaisedChain<CBFileException>([&] { file.OpenFile(Path("i"), BFile::kReadOnly, 64); }),
            (std::vector<std::string>{
                "General Error (Module:BFile,Method:OpenFile)",
                "Error opening file: " + Path("i") + " (Module:WinFile,Method:OpenWinFile)"}));
  test::WriteFile(Path("i"), std::string(100, 'x'));
  file.OpenFile(Path("i"), 2, 64);  // 2 also starts the file afresh
  EXPECT_EQ(file.BlockCount(), 0);
  CBlock half(32);
  const std::string mismatch = "Block size missmatch (Module:BFile,Method:";
  EXPECT_EQ(RaisedText<CBFileException>([&] { file.ReadBlock(half); }), mismatch + "ReadBlock)");
  EXPECT_EQ(RaisedText<CBFileException>([&] { file.AddBlock(half); }), mismatch + "addblock)");
  EXPECT_EQ(file.BlockCount(), 0);

  CBlock block(64);  // a used count outside 6..block size is damage
  block.SetUsed(5000);
  file.AddBlock(block);
  block.SetUsed(5);
  file.AddBlock(block);
  file.SeekToBlock(0);
  EXPECT_EQ(RaisedText<CBFileException>([&] { file.ReadBlock(block); }),
            "Damaged block 0 of " + Path("i") + ": used count 5000 (Module:BFile,Method:ReadBlock)");
  EXPECT_EQ(block.GetUsed(), 6);  // nothing of it is trusted
  EXPECT_EQ(RaisedText<CBFileException>([&] { file.ReadBlock(block); }),
            "Damaged block 1 of " + Path("i") + ": used count 5 (Module:BFile,Method:ReadBlock)");
}

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

TEST(BlockItems, InsertsFitOnlyBeforeTheBlockSizeAndRefusalsAreTraced) {
  test::ConfiguredHome home;
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
  refuses(4080, [&] { block.InsertDate(kDate); });
  refuses(4084, [&] { block.InsertStr("0123456789"); });  // 4,084 + 2 + 10 = 4,096
  refuses(4080, [&] { block.InsertRow(Value("0123456789abcd")); });
  refuses(-1, [&] { block.InsertInt(1); });
  block.SetCursor(4092);
  EXPECT_EQ(RaisedText<CBlockException>([&] { block.InsertInt(1); }),
            "General Error (Module:Block,Method:InsertInt)");
  block.SetCursor(4083);
  block.InsertStr("0123456789");  // 4,095 < 4,096
  block.SetCursor(4087);
  block.InsertDouble(2);
  EXPECT_EQ(block.GetUsed(), 4095);

  // Row room: at used = 4096 - 6 - bytes - 1 there is room, a byte later none.
  const std::vector<std::pair<CValue, int32_t>> cases = {
      {Value("0123456789"), 12}, {Value(u"abcd"), 10}, {Value(1), 4}, {Value(1.0), 8}, {Value(kDate), 16}};
  for (const auto& [value, bytes] : cases) {
    block.SetUsed(4096 - 6 - bytes - 1);
    EXPECT_TRUE(block.IsFreeRowLeaf(value) && block.IsFreeRowNode(value)) << bytes;
    block.SetUsed(4096 - 6 - bytes);
    EXPECT_FALSE(block.IsFreeRowLeaf(value) || block.IsFreeRowNode(value)) << bytes;
  }
  CValue odd;
  odd.SetType(static_cast<VALUE_TYPE>(5));
  EXPECT_EQ(RaisedText<CBlockException>([&] { block.IsFreeRowLeaf(odd); }),
            "General Error (Module:Block,Method:IsFreeRowLeaf)");
  EXPECT_TRUE(test::Has(test::TraceOf(home, "SHARELIB_ERROR"), "Block.IsFreeRowLeaf - Unrecognized type 5"));
}

TEST(BlockItems, ReadsPastTheUsedBytesNameTheBlockAndStringLengthsAreChecked) {
  test::ConfiguredHome home;  // keeps the traced causes out of the real home
  CBlock block(64);
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

  block = CBlock(64);
  block.InsertStr("hello");
  block.InsertStrW(u"hi");
  block.SetCursor(6);
  std::array<char, 5> small{};
  EXPECT_THROW(block.ReadStr(std::span<char>(small)), CBlockException);  // no room for the 0
  EXPECT_EQ(block.GetCursor(), 6);
  std::array<char, 6> fits{};
  EXPECT_EQ(block.ReadStr(std::span<char>(fits)), 5u);
  EXPECT_STREQ(fits.data(), "hello");

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
}

TEST(LeafInsert, KeepsValueOrderWithNewRowsBeforeEqualOnesAndRefusesWhatDoesNotFit) {
  CBlock block(64);
  for (const auto& [value, id] : Rows{{"b", 1}, {"a", 2}, {"c", 3}, {"b", 4}, {"bb", 5}}) {
    block.InsertRowLeaf(Value(value), id);
  }
  EXPECT_EQ(block.GetCursor(), 6);
  const Rows expected = {{"a", 2}, {"b", 4}, {"b", 1}, {"bb", 5}, {"c", 3}};
  EXPECT_EQ(RowsOf(block), expected);
  EXPECT_EQ(Bytes(block), Bytes(Leaf(expected)));  // byte for byte the appended rows

  CBlock full(64);
  full.InsertRowLeaf(Value(std::string(4000, 'm')), 1);
  full.SetCursor(40);
  const auto before = Bytes(full);
  const int32_t used = full.GetUsed();
  // In front of the row (moving it), and behind it.
  for (const std::string& v : {std::string(80, 'a'), std::string(80, 'z')}) {
    EXPECT_FALSE(full.IsFreeRowLeaf(Value(v)));
    EXPECT_THROW(full.InsertRowLeaf(Value(v), 2), CBlockException);
    EXPECT_EQ(Bytes(full), before);
    EXPECT_EQ(full.GetUsed(), used);
    EXPECT_EQ(full.GetCursor(), 40);
  }
  // What IsFreeRowLeaf admits always goes in.
  const std::string fits(4096 - 6 - used - 2 - 1, 'a');
  ASSERT_TRUE(full.IsFreeRowLeaf(Value(fits)));
  full.InsertRowLeaf(Value(fits), 3);
  EXPECT_EQ(RowsOf(full).front(), std::make_pair(fits, 3));
}

TEST(RowSearch, StopSearchesFindWhereAKeysItemsEnd) {
  CBlock leaf = Leaf({{"d", 10}, {"m", 20}});
  CBlock descending = Leaf({{"m", 20}, {"d", 10}});
  CBlock empty(64);
  struct Case {
    const char* key;
    int32_t stop, at_or_after, descending;
  };
  const Case cases[] = {
      {"a", 10, 10, CBlock::kReachedEnd},
      {"d", 20, 10, 10},  // the first row above d; at or after: d itself
      {"k", 20, 20, 10},
      {"m", 20, 20, 20},  // the last row, equal
      {"z", CBlock::kReachedEnd, CBlock::kReachedEnd, 20},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.key);
    EXPECT_EQ(leaf.GetRowStopId(Value(c.key)), c.stop);
    EXPECT_EQ(leaf.GetRowStopIdAtOrAfter(Value(c.key)), c.at_or_after);
    EXPECT_EQ(descending.GetRowStopIdDescending(Value(c.key)), c.descending);
    EXPECT_EQ(empty.GetRowStopId(Value(c.key)), CBlock::kNoRows);
    EXPECT_EQ(empty.GetRowStopIdAtOrAfter(Value(c.key)), CBlock::kNoRows);
    EXPECT_EQ(empty.GetRowStopIdDescending(Value(c.key)), CBlock::kNoRows);
  }
}

TEST(RowSearch, StartSearchGivesEveryAnswer) {
  CBlock leaf = Leaf({{"apple", 10}, {"banana", 20}, {"cherry", 30}});
  constexpr int32_t kNeither = 2;  // a match mode that matches nothing
  struct Case {
    const char* key;
    const char* upper;
    int32_t mode, flags, expected;
  };
  const Case cases[] = {
      // Exact (mode 1) and matching (mode 0: contains the key, not above upper).
      {"banana", "", 1, 0, 20},
      {"ban", "zzz", 0, 0, 20},
      {"ban", "bam", 0, 0, CBlock::kNotFound},
      {"b", "", 1, 0, CBlock::kNotFound},
      {"cherry", "", kNeither, 0, CBlock::kReachedEnd},
      {"zebra", "", 1, 0, CBlock::kReachedEnd},
      // Greater (64), with and without equal (1).
      {"b", "", kNeither, 64, 20},
      {"banana", "", kNeither, 64, CBlock::kInNextBlock},
      {"banana", "", kNeither, 65, 20},
      {"zebra", "", kNeither, 65, CBlock::kInNextBlock},
      // Less (128): the last row below the key, or the key itself with equal.
      {"b", "", kNeither, 128, 10},
      {"cherry", "", kNeither, 128, 20},
      {"cherry", "", kNeither, 129, 30},
      {"zebra", "", kNeither, 128, 30},
      {"apple", "", kNeither, 128, CBlock::kInPreviousBlock},
      {"a", "", kNeither, 129, CBlock::kInPreviousBlock},
  };
  for (const Case& c : cases) {
    EXPECT_EQ(leaf.GetRowStartId(Value(c.key), Value(c.upper), c.mode, c.flags), c.expected)
        << c.key << " " << c.upper << " " << c.mode << " " << c.flags;
  }
  EXPECT_EQ(CBlock(64).GetRowStartId(Value("a"), Value(""), 1, 0), CBlock::kNoRows);

  // Numbers match when not smaller than the key and not above the upper bound.
  CBlock numbers(64);
  for (int32_t v : {5, 9, 30}) numbers.InsertRowLeaf(Value(v), v * 100);
  EXPECT_EQ(numbers.GetRowStartId(Value(7), Value(10), 0, 0), 900);
  EXPECT_EQ(numbers.GetRowStartId(Value(10), Value(20), 0, 0), CBlock::kReachedEnd);  // 30 is above 20
  EXPECT_EQ(numbers.GetRowStartId(Value(6), Value(8), 0, 0), CBlock::kNotFound);    // 9 is above 8
  EXPECT_EQ(numbers.GetRowStartId(Value(9), Value(0), 1, 0), 900);
  EXPECT_EQ(numbers.GetRowStopId(Value(9)), 3000);
}

// Random block contents: every operation gives an answer or a Block error,
// never a crash, a read outside the block or an endless loop.
TEST(DamagedBlocks, RandomContentsGiveAnswersOrBlockErrors) {
  constexpr VALUE_TYPE kTypes[] = {VALUE_TYPE::Integer, VALUE_TYPE::AsciiString, VALUE_TYPE::DateTime,
                                   VALUE_TYPE::UnicodeString, VALUE_TYPE::Double};
  std::mt19937 random(4242);
  const auto survives = [](auto op) {
    try {
      op();
    } catch (const CBlockException&) {
    }
  };
  for (int round = 0; round < 800; ++round) {
    CBlock block(round % 2 == 0 ? 1 : 64);
    const int32_t size = block.Size();
    // Short rows are likelier with small lengths: bias half the bytes to 0..3.
    for (int32_t i = 6; i < size; ++i) {
      block.Data()[i] = static_cast<uint8_t>(random() % 2 == 0 ? random() % 4 : random());
    }
    block.SetUsed(6 + static_cast<int32_t>(random() % static_cast<uint32_t>(size - 5)));
    const VALUE_TYPE type = kTypes[round % 5];
    CValue key;
    switch (type) {
      case VALUE_TYPE::AsciiString: key.SetText(std::string(random() % 4, static_cast<char>('a' + random() % 26))); break;
      case VALUE_TYPE::UnicodeString: key.SetTextW(std::u16string(random() % 4, static_cast<char16_t>(random()))); break;
      case VALUE_TYPE::Integer: key.SetInteger(static_cast<int32_t>(random())); break;
      case VALUE_TYPE::Double: key.SetDouble(static_cast<double>(static_cast<int32_t>(random()))); break;
      case VALUE_TYPE::DateTime: key.SetDateTime({static_cast<int16_t>(random() % 3000), 1, 1, 0, 0, 0, 0}); break;
    }
    const auto flags = static_cast<int32_t>(random() % 256);

    survives([&] { block.GetRowStartId(key, key, static_cast<int32_t>(random() % 3), flags); });
    survives([&] { block.GetRowStopId(key); });
    survives([&] { block.GetRowStopIdAtOrAfter(key); });
    survives([&] { block.GetRowStopIdDescending(key); });
    survives([&] {
      block.SetCursor(6);
      CValue v(type);
      while (!block.AtEnd()) block.ReadValue(v);
    });
    const int32_t used = block.GetUsed();
    survives([&] { block.InsertRowLeaf(key, 1); });
    if (block.GetUsed() != used) {  // went in: whole, and before the block size
      ASSERT_EQ(block.GetUsed(), used + CBlock::ValueBytes(key) + 4);
      ASSERT_LT(block.GetUsed(), size);
    }
  }
}

TEST_F(BFileTest, BlocksRoundTripWithTheirUsedCountAndLinkWords) {
  BFile file;
  file.OpenFile(Path("tree"), BFile::kCreate, 64);
  CBlock block(64);
  for (int i = 0; i < 3; ++i) {
    block.Reset();
    block.Data()[6] = static_cast<uint8_t>('a' + i);
    block.SetUsed(300 + i);
    file.AddBlock(block);
  }
  file.SetLinkWord1(0, 1);
  file.SetLinkWord2(2, 0xBEEF);
  file.SeekToBlock(1);  // rewriting block 1 keeps the others
  block.Data()[6] = 'B';
  block.SetUsed(4096);
  file.WriteBlock(block);
  EXPECT_EQ(file.BlockCount(), 3);
  const std::string bytes = test::ReadFile(Path("tree"));
  EXPECT_EQ(bytes.substr(0, 7), Word(300) + Word(1) + Word(0) + "a");
  EXPECT_EQ(bytes.substr(4096, 7), Word(4096) + Word(0) + Word(0) + "B");
  EXPECT_EQ(bytes.substr(8192, 7), Word(302) + Word(0) + Word(0xBEEF) + "c");

  file.OpenFile(Path("tree"), BFile::kReadOnly, 64);
  file.SeekToBlock(2);
  file.ReadBlock(block);
  EXPECT_EQ(block.GetUsed(), 302);
  EXPECT_EQ(block.GetLinkWord2(), 0xBEEF);
  EXPECT_EQ(block.GetCursor(), 6);
  file.SeekToBlock(0);
  file.ReadBlock(block);
  EXPECT_EQ(block.GetLinkWord1(), 1);
  file.ReadBlock(block);  // on from the current position
  EXPECT_EQ(block.GetUsed(), 4096);
  file.ReadBlock(block);
  EXPECT_EQ(RaisedText<CBFileException>([&] { file.ReadBlock(block); }),
            "Error reading block 3 of " + Path("tree") +
                ": 0 of 4096 bytes read (Module:BFile,Method:ReadBlock)");
}

}  // namespace
}  // namespace qm
