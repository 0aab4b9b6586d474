// Block files: the block header on disk, link words set in place, and the
// checks that keep a block and a file of another block size apart.
#include <gtest/gtest.h>

#include <filesystem>
#include <string>

#include "file_test_util.h"
#include "shared/bfile.h"
#include "shared/block.h"
#include "shared/exception_family.h"
#include "support/test_support.h"

namespace qm {
namespace {

using test::RaisedChain;
using test::RaisedText;

std::string Word16(uint16_t v) { return {static_cast<char>(v & 0xFF), static_cast<char>(v >> 8)}; }

TEST(BlockTest, ANewBlockHoldsItsHeaderAndResetRestoresIt) {
  CBlock block(64);
  EXPECT_EQ(block.Size(), 4096);
  EXPECT_TRUE(block.IsOpen());
  EXPECT_EQ(block.GetUsed(), 6);
  EXPECT_EQ(block.GetCursor(), 6);
  const std::string head(reinterpret_cast<const char*>(block.Data()), 8);
  EXPECT_EQ(head, std::string("\x06\x00\x00\x00\x00\x00\x00\x00", 8));
  EXPECT_EQ(block.Data()[4096 + 5], 0);  // the 6 spare bytes exist and are zero

  block.Data()[2] = 0x55;
  block.SetUsed(300);
  block.SetPosition(3);
  EXPECT_EQ(block.GetCursor(), 6 + 12);
  block.SetPosition(-1);
  EXPECT_EQ(block.GetCursor(), 0);
  EXPECT_FALSE(block.AtEnd());
  block.SetCursor(300);
  EXPECT_TRUE(block.AtEnd());
  block.Reset();
  EXPECT_EQ(block.GetUsed(), 6);
  EXPECT_EQ(block.GetCursor(), 6);
  EXPECT_EQ(block.Data()[0], 6);
  EXPECT_EQ(block.Data()[2], 0);
}

TEST(BlockTest, ImpossibleSizesAndReleasedBlocksRaise) {
  EXPECT_EQ(RaisedText<CBlockException>([] { CBlock b(0); }),
            "Could not allocate memory size: 4 (Module:Block,Method:Blobk)");
  EXPECT_EQ(RaisedText<CBlockException>([] { CBlock b(CBlock::kMaxUnits + 1); }),
            "Could not allocate memory size: 32772 (Module:Block,Method:Blobk)");

  test::ConfiguredHome home;
  CBlock block(1);
  block.Release();
  EXPECT_FALSE(block.IsOpen());
  EXPECT_EQ(RaisedText<CBlockException>([&] { block.Reset(); }),
            "General Error (Module:Block,Method:Reset)");
  EXPECT_EQ(RaisedText<CBlockException>([&] { block.SetPosition(0); }),
            "General Error (Module:Block,Method:SetPosition)");
  // The cause is always traced, whatever the trace level.
  std::string log;
  for (const auto& entry : std::filesystem::directory_iterator(home.Home() + "Log")) {
    if (entry.path().filename().string().starts_with("trace_SHARELIB_ERROR_")) {
      log += test::ReadFile(entry.path().string());
    }
  }
  EXPECT_NE(log.find(" Block.Reset - Block not open\r\n"), std::string::npos) << log;
  EXPECT_NE(log.find(" Block.SetPosition - Block not open\r\n"), std::string::npos) << log;
}

class BFileTest : public ::testing::Test {
 protected:
  std::string PathOf(const std::string& name) const { return dir_.Path() + name; }
  test::ScratchDir dir_{"bfile"};
};

TEST_F(BFileTest, BlocksRoundTripWithTheirUsedCountAndLinkWords) {
  const std::string path = PathOf("tree.sdx");
  {
    BFile file;
    file.OpenFile(path, BFile::kCreate, 64);
    EXPECT_EQ(file.GetBlockSize(), 4096);
    CBlock block(64);
    for (int i = 0; i < 3; ++i) {
      block.Reset();
      block.Data()[6] = static_cast<uint8_t>('a' + i);
      block.SetUsed(300 + i);
      file.AddBlock(block);
      EXPECT_EQ(block.GetCursor(), 6);
    }
    EXPECT_EQ(file.BlockCount(), 3);
    file.SetLinkWord1(0, 1);
    file.SetLinkWord2(1, 0);
    file.SetLinkWord1(1, 2);
    file.SetLinkWord2(2, 0xBEEF);
    // Rewriting block 1 in place keeps the others.
    file.SeekToBlock(1);
    block.Reset();
    block.Data()[6] = 'B';
    block.SetUsed(4096);
    file.WriteBlock(block);
    file.Close();
  }
  const std::string bytes = test::ReadFile(path);
  ASSERT_EQ(bytes.size(), 3u * 4096);
  EXPECT_EQ(bytes.substr(0, 6), Word16(300) + Word16(1) + Word16(0));
  EXPECT_EQ(bytes.substr(4096, 7), Word16(4096) + Word16(0) + Word16(0) + "B");
  EXPECT_EQ(bytes.substr(8192, 7), Word16(302) + Word16(0) + Word16(0xBEEF) + "c");

  BFile file;
  file.OpenFile(path, BFile::kReadOnly, 64);
  CBlock block(64);
  file.SeekToBlock(2);
  file.ReadBlock(block);
  EXPECT_EQ(block.GetUsed(), 302);
  EXPECT_EQ(block.GetLinkWord2(), 0xBEEF);
  EXPECT_EQ(block.GetCursor(), 6);
  EXPECT_EQ(block.Data()[6], 'c');
  file.SeekToBlock(0);
  file.ReadBlock(block);
  EXPECT_EQ(block.GetUsed(), 300);
  EXPECT_EQ(block.GetLinkWord1(), 1);
  EXPECT_EQ(block.GetLinkWord2(), 0);
  file.ReadBlock(block);  // reads go on from the current position
  EXPECT_EQ(block.GetUsed(), 4096);
  file.ReadBlock(block);
  EXPECT_EQ(RaisedText<CBFileException>([&] { file.ReadBlock(block); }),
            "General Error (Module:BFile,Method:ReadBlock)");
}

TEST_F(BFileTest, ModesSizesAndDamage) {
  const std::string path = PathOf("index.sri");
  BFile file;
  EXPECT_EQ(RaisedText<CBFileException>([&] { file.OpenFile(path, 0, 64); }),
            "Unknown index mode (Module:BFile,Method:OpenFile)");
  EXPECT_EQ(RaisedText<CBFileException>([&] { file.OpenFile(path, 4, 64); }),
            "Unknown index mode (Module:BFile,Method:OpenFile)");

  const auto chain = RaisedChain<CBFileException>([&] { file.OpenFile(path, BFile::kReadOnly, 64); });
  ASSERT_EQ(chain.size(), 2u);
  EXPECT_EQ(chain[0], "General Error (Module:BFile,Method:OpenFile)");
  EXPECT_EQ(chain[1], "Error opening file: " + path + " (Module:WinFile,Method:OpenWinFile)");

  test::WriteFile(path, std::string(100, 'x'));
  file.OpenFile(path, 2, 64);  // 2 also starts the file afresh
  EXPECT_EQ(file.BlockCount(), 0);

  CBlock half(32);
  EXPECT_EQ(RaisedText<CBFileException>([&] { file.ReadBlock(half); }),
            "Block size missmatch (Module:BFile,Method:ReadBlock)");
  EXPECT_EQ(RaisedText<CBFileException>([&] { file.WriteBlock(half); }),
            "Block size missmatch (Module:BFile,Method:writeblock)");
  EXPECT_EQ(RaisedText<CBFileException>([&] { file.AddBlock(half); }),
            "Block size missmatch (Module:BFile,Method:addblock)");
  EXPECT_EQ(file.BlockCount(), 0);

  // A used count beyond the block size is damage, not a count to trust.
  CBlock block(64);
  block.SetUsed(5000);
  file.AddBlock(block);
  file.SeekToBlock(0);
  EXPECT_EQ(RaisedText<CBFileException>([&] { file.ReadBlock(block); }),
            "General Error (Module:BFile,Method:ReadBlock)");
}

}  // namespace
}  // namespace qm
