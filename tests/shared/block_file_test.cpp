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

std::string Word(uint16_t v) { return {static_cast<char>(v & 0xFF), static_cast<char>(v >> 8)}; }

TEST(BlockTest, HeaderPositionsAndReleasedBlocks) {
  CBlock block(64);
  EXPECT_EQ(block.Size(), 4096);
  EXPECT_EQ(std::string(reinterpret_cast<const char*>(block.Data()), 6), Word(6) + Word(0) + Word(0));
  EXPECT_EQ(block.GetCursor(), 6);
  block.SetPosition(3);
  EXPECT_EQ(block.GetCursor(), 18);
  block.SetPosition(-1);
  EXPECT_EQ(block.GetCursor(), 0);
  block.Data()[2] = 0x55;
  block.SetUsed(300);
  block.Reset();
  EXPECT_EQ(block.GetUsed(), 6);
  EXPECT_EQ(block.Data()[2], 0);

  EXPECT_EQ(RaisedText<CBlockException>([] { CBlock b(0); }),
            "Could not allocate memory size: 4 (Module:Block,Method:Blobk)");
  EXPECT_EQ(RaisedText<CBlockException>([] { CBlock b(512); }),
            "Could not allocate memory size: 32772 (Module:Block,Method:Blobk)");
  test::ConfiguredHome home;
  block.Release();
  EXPECT_EQ(RaisedText<CBlockException>([&] { block.Reset(); }),
            "General Error (Module:Block,Method:Reset)");
  std::string log;  // the cause is traced whatever the trace level
  for (const auto& entry : std::filesystem::directory_iterator(home.Home() + "Log")) {
    if (entry.path().filename().string().starts_with("trace_SHARELIB_ERROR_")) {
      log += test::ReadFile(entry.path().string());
    }
  }
  EXPECT_NE(log.find(" Block.Reset - Block not open\r\n"), std::string::npos) << log;
}

class BFileTest : public ::testing::Test {
 protected:
  std::string Path(const std::string& name) const { return dir_.Path() + name; }
  test::ScratchDir dir_{"bfile"};
};

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
  EXPECT_EQ(RaisedText<CBFileException>([&] { file.WriteBlock(half); }), mismatch + "writeblock)");
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

}  // namespace
}  // namespace qm
