// The buffered file: when bytes reach the disk, what is read back, and every
// failure it reports.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "file_test_util.h"
#include "shared/connection_scramble.h"
#include "shared/cstr.h"
#include "shared/cwstr.h"
#include "shared/exception_family.h"
#include "shared/mfile.h"
#include "support/test_support.h"

namespace qm {
namespace {

using test::RaisedChain;
using test::RaisedText;

class MFileTest : public ::testing::Test {
 protected:
  std::string PathOf(const std::string& name) const { return dir_.Path() + name; }
  int64_t DiskSize(const std::string& path) const {
    return static_cast<int64_t>(test::ReadFile(path).size());
  }
  test::ScratchDir dir_{"mfile"};
};

TEST_F(MFileTest, SmallWritesAreGatheredAndAWriteThatWouldOverflowCommitsFirst) {
  const std::string path = PathOf("gather.bin");
  MFile f;
  f.OpenFile(path, MFile::kCreate);
  const std::string a(4999, 'a');
  f.mwrite(a.data(), a.size());
  EXPECT_EQ(DiskSize(path), 0);
  f.mwrite("bc", 2);
  EXPECT_EQ(DiskSize(path), 4999);  // one platform write of the 4,999 bytes
  f.MCommit();
  EXPECT_EQ(DiskSize(path), 5001);
  f.MCommit();  // nothing new: nothing more is written
  EXPECT_EQ(DiskSize(path), 5001);
  f.Close();
  EXPECT_EQ(test::ReadFile(path), a + "bc");
}

TEST_F(MFileTest, AWriteOfExactlyTheBufferIsGatheredAndALargerOneGoesStraightThrough) {
  const std::string path = PathOf("large.bin");
  MFile f;
  f.OpenFile(path, MFile::kCreate);
  const std::string full(MFile::kBufferSize, 'f');
  f.mwrite(full.data(), full.size());
  EXPECT_EQ(DiskSize(path), 0);
  f.MCommit();
  f.mwrite("0123456789", 10);
  const std::string big(6000, 'b');
  f.mwrite(big.data(), big.size());
  EXPECT_EQ(DiskSize(path), 5000 + 10 + 6000);
  f.Close();
  EXPECT_EQ(test::ReadFile(path), full + "0123456789" + big);
}

TEST_F(MFileTest, CommitNeverWritesBytesThatWereOnlyRead) {
  const std::string path = PathOf("read-then-write.bin");
  test::WriteFile(path, "ABCDEFGHIJ");
  MFile f;
  f.OpenFile(path, MFile::kOpenOrCreate);
  char got[3];
  ASSERT_EQ(f.mread(got, 3), 3u);
  f.MCommit();
  EXPECT_EQ(test::ReadFile(path), "ABCDEFGHIJ");
  // A write after reads lands at the logical position, not behind the read-ahead.
  f.mwrite("xy", 2);
  f.MCommit();
  EXPECT_EQ(test::ReadFile(path), "ABCxyFGHIJ");
  char next = 0;
  ASSERT_EQ(f.mread(&next, 1), 1u);
  EXPECT_EQ(next, 'F');
}

TEST_F(MFileTest, SeekDiscardsTheReadBufferAndCommitsPendingWrites) {
  const std::string path = PathOf("seek.bin");
  test::WriteFile(path, "ABCDEFGHIJ");
  MFile f;
  f.OpenFile(path, MFile::kOpenOrCreate);
  char c = 0;
  f.mread(&c, 1);
  f.Seek(6);
  f.mread(&c, 1);
  EXPECT_EQ(c, 'G');
  f.Seek(0);
  f.mwrite("zz", 2);
  f.SeekToEnd();
  EXPECT_EQ(test::ReadFile(path), "zzCDEFGHIJ");
  f.mwrite("!", 1);
  EXPECT_EQ(f.FileSize(false), 10);
  EXPECT_EQ(f.FileSize(true), 11);
}

TEST_F(MFileTest, ReadsAcrossRefillsAndReportsTheEnd) {
  const std::string path = PathOf("refill.bin");
  std::string content;
  for (int i = 0; i < 12000; ++i) content.push_back(static_cast<char>('a' + i % 26));
  test::WriteFile(path, content);
  MFile f;
  f.OpenFile(path, MFile::kReadOnly);
  std::string got(7000, '\0');
  ASSERT_EQ(f.mread(got.data(), 7000), 7000u);
  EXPECT_EQ(got, content.substr(0, 7000));
  ASSERT_EQ(f.mread(got.data(), 5000), 5000u);
  EXPECT_EQ(got.substr(0, 5000), content.substr(7000));
  EXPECT_TRUE(f.IsEOF());
  EXPECT_EQ(f.mread(got.data(), 1), 0u);
}

TEST_F(MFileTest, AReadThatRunsPastTheEndRaises) {
  const std::string path = PathOf("short.bin");
  test::WriteFile(path, "1234");
  MFile f;
  f.OpenFile(path, MFile::kReadOnly);
  char buffer[10];
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.mread(buffer, 10); }),
            "EOF error reading from disk (Module:MFile,Method:mread)");
  EXPECT_FALSE(f.mrefill(true));
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.mrefill(false); }),
            "EOF error reading from disk (Module:MFile,Method:mread)");
}

TEST_F(MFileTest, TypedItemsRoundTripInTheirByteLayout) {
  const std::string path = PathOf("typed.bin");
  DateTimeValue date{2004, 3, 9, 14, 5, 7, 123456};
  {
    MFile f;
    f.OpenFile(path, MFile::kCreate);
    f.WriteStr(CWStr(u"ab"));
    f.WriteByte(0xFE);
    f.WriteShort(-2);
    f.WriteInt(-100000);
    f.WriteDouble(2.5);
    f.WriteDate(date);
    f.WriteStr(std::string_view("xyz"));
    f.WriteStrW(u"\u00e9\u4e2d");
    const int32_t row[] = {7, -8};
    f.WriteItemRow(row);
    CValue text;
    text.SetText("naïve");
    f.WriteValue(text);
    CValue wide;
    wide.SetTextW(u"w\u00fc");
    f.WriteValue(wide);
    CValue number;
    number.SetInteger(42);
    f.WriteValue(number);
    CValue when;
    when.SetDateTime(date);
    f.WriteValue(when);
    f.MCommit();
    f.Close();
  }
  const std::string bytes = test::ReadFile(path);
  EXPECT_EQ(bytes.substr(0, 6), std::string("\x02\x00\x61\x00\x62\x00", 6));
  EXPECT_EQ(bytes.substr(7, 2), std::string("\xFE\xFF", 2));
  EXPECT_EQ(bytes.substr(21, 16),
            std::string("\xD4\x07\x03\x00\x09\x00\x0E\x00\x05\x00\x07\x00\x40\xE2\x01\x00", 16));

  MFile f;
  f.OpenFile(path, MFile::kReadOnly);
  CWStr ab;
  f.ReadStr(ab);
  EXPECT_EQ(std::u16string(ab.View()), u"ab");
  EXPECT_EQ(f.ReadByte(), 0xFE);
  EXPECT_EQ(f.ReadShort(), -2);
  EXPECT_EQ(f.ReadInt(), -100000);
  EXPECT_EQ(f.ReadDouble(), 2.5);
  EXPECT_EQ(f.ReadDate(), date);
  std::string narrow;
  f.ReadStr(narrow, 3);
  EXPECT_EQ(narrow, "xyz");
  std::u16string wide;
  f.ReadStrW(wide, 2);
  EXPECT_EQ(wide, u"\u00e9\u4e2d");
  int32_t row[2] = {};
  CValue text(VALUE_TYPE::AsciiString);
  ASSERT_EQ(f.ReadRow(row, text), 0);
  EXPECT_EQ(row[0], 7);
  EXPECT_EQ(row[1], -8);
  EXPECT_EQ(text.Narrow(), "naïve");
  CValue wide_value(VALUE_TYPE::UnicodeString);
  f.ReadValue(wide_value);
  EXPECT_EQ(wide_value.Wide(), u"w\u00fc");
  CValue number(VALUE_TYPE::Integer);
  f.ReadValue(number);
  EXPECT_EQ(number.GetInteger(), 42);
  CValue when(VALUE_TYPE::DateTime);
  f.ReadValue(when);
  EXPECT_EQ(when.GetDateTime(), date);
  EXPECT_EQ(f.ReadRow(row, text), 1);  // the end: nothing read
}

TEST_F(MFileTest, TypedReadsAtTheEndNameThemselves) {
  const std::string path = PathOf("empty.bin");
  test::WriteFile(path, "");
  MFile f;
  f.OpenFile(path, MFile::kReadOnly);
  auto general = [](const char* method) {
    return std::string("General Error (Module:MFile,Method:") + method + ")";
  };
  CWStr w;
  CValue v(VALUE_TYPE::Double);
  std::string s;
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.ReadInt(); }), general("ReadInt"));
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.ReadByte(); }), general("ReadByte"));
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.ReadDouble(); }), general("ReadDouble"));
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.ReadDate(); }), general("ReadDate"));
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.ReadStr(s, 2); }), general("ReadStr"));
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.ReadStr(w); }), general("ReadStr(CWStr)"));
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.ReadValue(v); }), general("ReadValue"));
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.ReadShort(); }),
            "Error reading 2 bytes from file. Read: 0 (Module:MFile,Method:ReadShort)");
}

TEST_F(MFileTest, StringLengthsOutsideTheShortFieldAreRefused) {
  const std::string path = PathOf("lengths.bin");
  MFile f;
  f.OpenFile(path, MFile::kCreate);
  CValue longest;
  longest.SetText(std::string(MFile::kMaxStringLength, 'x'));
  f.WriteValue(longest);
  CValue too_long;
  too_long.SetText(std::string(MFile::kMaxStringLength + 1, 'x'));
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.WriteValue(too_long); }),
            "Fatal error writting len to file (Module:MFile,Method:WriteValue)");
  CValue too_long_wide;
  too_long_wide.SetTextW(std::u16string(MFile::kMaxStringLength + 1, u'x'));
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.WriteValue(too_long_wide); }),
            "Fatal error writting len to file (Module:MFile,Method:WriteValue)");
  EXPECT_EQ(RaisedText<CMFileException>(
                [&] { f.WriteStr(CWStr(std::u16string(MFile::kMaxStringLength + 1, u'y'))); }),
            "Fatal error writting len to file (Module:MFile,Method:WriteStr(CWStr))");
  EXPECT_EQ(f.FileSize(true), 2 + static_cast<int64_t>(MFile::kMaxStringLength));

  // A negative length read back is refused, not used as a size.
  f.Seek(0);
  f.WriteShort(-1);
  f.Seek(0);
  CValue back(VALUE_TYPE::AsciiString);
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.ReadValue(back); }),
            "General Error (Module:MFile,Method:ReadValue)");
  f.Seek(0);
  CWStr w;
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.ReadStr(w); }),
            "General Error (Module:MFile,Method:ReadStr(CWStr))");
}

TEST_F(MFileTest, FailedDiskWritesNameTheStepAndKeepTheCause) {
  // /dev/full takes no byte: every platform write fails.
  MFile f;
  f.OpenFile("/dev/full", MFile::kOpenOrCreate);
  f.WriteInt(1);
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.MCommit(); }),
            "Error writing to disk (Module:MFile,Method:MCommit)");
  const std::string big(6000, 'b');
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.mwrite(big.data(), big.size()); }),
            "OS error writing 6000 bytes to disk (Module:MFile,Method:mwrite)");

  struct Case {
    CValue value;
    const char* text;
    std::size_t filler = MFile::kBufferSize - 1;
  };
  std::vector<Case> cases(5);
  cases[0].value.SetInteger(1);
  cases[0].text = "Fatal error writting int to file";
  cases[1].value.SetDouble(1.5);
  cases[1].text = "Fatal error writting double to file";
  cases[2].value.SetDateTime(DateTimeValue{2001, 1, 1, 0, 0, 0, 0});
  cases[2].text = "Fatal error writting date to file";
  cases[3].value.SetText(std::string(6000, 's'));
  cases[3].text = "Fatal error writting string to file";
  cases[3].filler = MFile::kBufferSize - 2;  // the length still fits
  cases[4].value.SetText("ab");
  cases[4].text = "Fatal error writting len to file";
  for (const auto& c : cases) {
    // A nearly full buffer makes the failing write commit it.
    const std::string filler(c.filler, 'f');
    f.mwrite(filler.data(), filler.size());
    const auto chain = RaisedChain<CMFileException>([&] { f.WriteValue(c.value); });
    ASSERT_EQ(chain.size(), 2u) << c.text;
    EXPECT_EQ(chain[0], std::string(c.text) + " (Module:MFile,Method:WriteValue)");
    EXPECT_EQ(chain[1], "Error writing to disk (Module:MFile,Method:MCommit)");
  }
}

TEST_F(MFileTest, ModesCreateKeepOrOnlyRead) {
  const std::string path = PathOf("modes.bin");
  test::WriteFile(path, "old");
  MFile f;
  f.OpenFile(path, MFile::kOpenOrCreate);
  EXPECT_EQ(f.FileSize(), 3);
  f.OpenFile(path, MFile::kCreate);
  EXPECT_EQ(f.FileSize(), 0);
  f.Close();
  f.OpenFile(PathOf("new.bin"), MFile::kOpenOrCreate);
  EXPECT_TRUE(f.IsOpen());
  f.Close();

  EXPECT_EQ(RaisedText<CMFileException>([&] { f.OpenFile(path, 4); }),
            "Error opening file " + path + " (Module:MFile,Method:OpenFile)");
  const std::string missing = PathOf("missing.bin");
  const auto chain = RaisedChain<CMFileException>([&] { f.OpenFile(missing, MFile::kReadOnly); });
  ASSERT_EQ(chain.size(), 2u);
  EXPECT_EQ(chain[0], "General Error (Module:MFile,Method:OpenFile)");
  EXPECT_EQ(chain[1], "Access denied or disk full. Could not open or create file: " + missing +
                          ". If you are running this component from a web server, the Internet "
                          "user must have write access to the Quillmere Search data directory. "
                          "(Module:STDFUN,Method:OpenWindowsFile)");
  EXPECT_FALSE(f.IsOpen());
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.WriteInt(1); }),
            "General Error (Module:MFile,Method:mwrite)");
}

TEST_F(MFileTest, DeleteOnCloseRemovesTheNameAtOnce) {
  const std::string path = PathOf("scratch.tmp");
  MFile f;
  f.OpenFile(path, MFile::kCreate, platform::kFileAttributeDeleteOnClose);
  EXPECT_FALSE(platform::FileExists(path));
  f.WriteInt(77);
  f.Seek(0);
  EXPECT_EQ(f.ReadInt(), 77);
}

TEST_F(MFileTest, TakeOverKeepsPendingWritesAndTheReadPosition) {
  const std::string path = PathOf("take.bin");
  test::WriteFile(path, "0123456789");
  MFile source;
  source.OpenFile(path, MFile::kOpenOrCreate);
  char c = 0;
  source.mread(&c, 1);
  source.mread(&c, 1);
  MFile target;
  target.TakeOver(source);
  EXPECT_FALSE(source.IsOpen());
  EXPECT_EQ(target.Path(), path);
  EXPECT_EQ(target.GetMode(), MFile::kOpenOrCreate);
  target.mread(&c, 1);
  EXPECT_EQ(c, '2');

  target.mwrite("AB", 2);  // pending when handed on
  MFile third;
  third.TakeOver(target);
  third.mwrite("C", 1);
  third.MCommit();
  EXPECT_EQ(test::ReadFile(path), "012ABC6789");
}

TEST_F(MFileTest, ScrambledKeyValueLines) {
  const std::string path = PathOf("options.dat");
  std::string plain =
      "first one\n"
      "# a comment\n"
      "\n"
      " \t \n"
      "  spaced\\ key   the value\t \r\n"
      "lonely\n"
      "long line\\\ncontinued\n"
      "last without end";
  std::string stored = plain;
  ScrambleConnectionText(stored);
  test::WriteFile(path, stored);

  MFile f;
  f.OpenFile(path, MFile::kReadOnly);
  std::vector<std::pair<std::string, std::string>> pairs;
  CStr key;
  CStr value;
  while (f.ReadKeyValueLine(key, value)) pairs.emplace_back(key.View(), value.View());
  const std::vector<std::pair<std::string, std::string>> expected = {
      {"first", "one"},
      {"spaced key", "the value"},
      {"lonely", ""},
      {"long", "line\\\ncontinued"},
      {"last", "without end"},
  };
  EXPECT_EQ(pairs, expected);

  f.Seek(0);
  CStr line;
  ASSERT_TRUE(f.ReadScrambledLine(line, '\n'));
  EXPECT_EQ(line.View(), "first one");
  f.SeekToEnd();
  EXPECT_FALSE(f.ReadScrambledLine(line, '\n'));
}

}  // namespace
}  // namespace qm
