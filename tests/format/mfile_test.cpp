// The buffered file: when bytes reach the disk, what is read back, and every
// failure it reports.
#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <vector>

#include "support/file_test_util.h"
#include "base/connection_scramble.h"
#include "base/cstr.h"
#include "base/cwstr.h"
#include "base/exception_family.h"
#include "format/mfile.h"
#include "support/test_support.h"

namespace qm {
namespace {

using test::RaisedChain;
using test::RaisedText;

class MFileTest : public ::testing::Test {
 protected:
  std::string Path(const std::string& name) const { return dir_.Path() + name; }
  std::size_t OnDisk(const std::string& name) const { return test::ReadFile(Path(name)).size(); }
  test::ScratchDir dir_{"mfile"};
};

TEST_F(MFileTest, WritesAreGatheredUntilTheBufferWouldOverflow) {
  MFile f;
  f.OpenFile(Path("w"), MFile::kCreate);
  const std::string a(4999, 'a'), full(5000, 'f'), big(6000, 'b');
  f.mwrite(a.data(), a.size());
  EXPECT_EQ(OnDisk("w"), 0u);
  f.mwrite("bc", 2);
  EXPECT_EQ(OnDisk("w"), 4999u);  // one platform write of the 4,999 bytes
  f.MCommit();
  f.MCommit();  // nothing new: nothing more written
  EXPECT_EQ(OnDisk("w"), 5001u);
  f.mwrite(full.data(), full.size());
  EXPECT_EQ(OnDisk("w"), 5001u);
  f.mwrite(big.data(), big.size());  // commits the buffer, then goes straight through
  EXPECT_EQ(test::ReadFile(Path("w")), a + "bc" + full + big);
}

TEST_F(MFileTest, ReadsWritesAndSeeksKeepTheLogicalPosition) {
  test::WriteFile(Path("p"), "ABCDEFGHIJ");
  MFile f;
  f.OpenFile(Path("p"), MFile::kOpenOrCreate);
  char c[3];
  ASSERT_EQ(f.mread(c, 3), 3u);
  f.MCommit();  // bytes only read are never written back
  EXPECT_EQ(test::ReadFile(Path("p")), "ABCDEFGHIJ");
  f.mwrite("xy", 2);  // lands behind what was read, not behind the read-ahead
  f.MCommit();
  f.mread(c, 1);
  EXPECT_EQ(c[0], 'F');
  f.Seek(8);  // the read buffer of the old position is dropped
  f.mread(c, 1);
  EXPECT_EQ(c[0], 'I');
  f.Seek(0);
  f.mwrite("z", 1);
  EXPECT_EQ(f.FileSize(false), 10);
  f.SeekToEnd();
  EXPECT_EQ(test::ReadFile(Path("p")), "zBCxyFGHIJ");
}

TEST_F(MFileTest, LargeReadsAfterBufferedOnesKeepBytesAndPositionUpToTheEnd) {
  std::string content;
  for (int i = 0; i < 12000; ++i) content.push_back(static_cast<char>('a' + i % 23));
  test::WriteFile(Path("l"), content);
  MFile f;
  f.OpenFile(Path("l"), MFile::kOpenOrCreate);
  std::string got(100, '\0');
  ASSERT_EQ(f.mread(got.data(), got.size()), got.size());
  // The rest of the buffer, then more than a buffer from the file.
  got.assign(6000, '\0');
  ASSERT_EQ(f.mread(got.data(), got.size()), got.size());
  EXPECT_EQ(got, content.substr(100, 6000));
  f.mwrite("XY", 2);  // lands right behind the bytes read
  f.MCommit();
  content.replace(6100, 2, "XY");
  EXPECT_EQ(test::ReadFile(Path("l")), content);
  got.assign(5898, '\0');
  ASSERT_EQ(f.mread(got.data(), got.size()), got.size());
  EXPECT_EQ(got, content.substr(6102));
  EXPECT_EQ(f.mread(got.data(), got.size()), 0u) << "nothing left at all";
  const std::string eof = "EOF error reading from disk (Module:MFile,Method:mread)";
  // A large read that finds the end in its middle fails, and so does a small one.
  f.Seek(7000);
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.mread(got.data(), got.size()); }), eof);
  f.Seek(11996);
  char rest[10];
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.mread(rest, 10); }), eof);
  EXPECT_TRUE(f.IsEOF());
  EXPECT_EQ(f.mread(rest, 1), 0u);
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.mrefill(false); }), eof);
}

TEST_F(MFileTest, StringLengthsOutsideTheShortFieldAreRefused) {
  MFile f;
  f.OpenFile(Path("l"), MFile::kCreate);
  const CValue longest = test::Value(std::string(32767, 'x')), too_long = test::Value(std::string(32768, 'x')),
               too_long_wide = test::Value(std::u16string(32768, u'x'));
  f.WriteValue(longest);
  const std::string refused = "Fatal error writting len to file (Module:MFile,Method:";
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.WriteValue(too_long); }), refused + "WriteValue)");
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.WriteValue(too_long_wide); }),
            refused + "WriteValue)");
  EXPECT_EQ(f.FileSize(), 2 + 32767);  // nothing of the refused values

  f.Seek(0);
  f.WriteShort(-1);
  f.Seek(0);
  CValue back(VALUE_TYPE::AsciiString);
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.ReadValue(back); }),
            "General Error (Module:MFile,Method:ReadValue)");
}

TEST_F(MFileTest, FailedDiskWritesNameTheStepAndKeepTheCause) {
  MFile f;
  f.OpenFile("/dev/full", MFile::kOpenOrCreate);  // takes no byte
  const std::string commit_failed = "Error writing to disk (Module:MFile,Method:MCommit)";
  f.WriteInt(1);
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.MCommit(); }), commit_failed);
  const std::string big(6000, 'b');
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.mwrite(big.data(), big.size()); }),
            "OS error writing 6000 bytes to disk (Module:MFile,Method:mwrite)");
  const std::pair<CValue, std::string> cases[] = {
      {test::Value(1), "int"}, {test::Value(1.5), "double"},
      {test::Value(DateTimeValue{2001, 1, 1, 0, 0, 0, 0}), "date"}, {test::Value(big), "string"}};
  for (const auto& [value, what] : cases) {
    // A nearly full buffer makes the failing write commit it.
    const std::string filler(what == "string" ? 4998 : 4999, 'f');
    f.mwrite(filler.data(), filler.size());
    EXPECT_EQ(RaisedChain<CMFileException>([&] { f.WriteValue(value); }),
              (std::vector<std::string>{
                  "Fatal error writting " + what + " to file (Module:MFile,Method:WriteValue)",
                  commit_failed}));
  }
}

TEST_F(MFileTest, OpenModesAndTheirFailures) {
  test::WriteFile(Path("m"), "old");
  MFile f;
  f.OpenFile(Path("m"), MFile::kOpenOrCreate);
  EXPECT_EQ(f.FileSize(), 3);
  f.OpenFile(Path("m"), MFile::kCreate);
  EXPECT_EQ(f.FileSize(), 0);
  EXPECT_EQ(RaisedText<CMFileException>([&] { f.OpenFile(Path("m"), 4); }),
            "Error opening file " + Path("m") + " (Module:MFile,Method:OpenFile)");
  EXPECT_EQ(RaisedChain<CMFileException>([&] { f.OpenFile(Path("missing"), MFile::kReadOnly); }),
            (std::vector<std::string>{
                "General Error (Module:MFile,Method:OpenFile)",
                "Access denied or disk full. Could not open or create file: " + Path("missing") +
                    ". If you are running this component from a web server, the Internet user "
                    "must have write access to the Quillmere Search data directory. "
                    "(Module:STDFUN,Method:OpenWindowsFile)"}));
}

// The option files: scrambled "key value" lines with comments, blank lines,
// escaped blanks in keys and continued lines.
TEST_F(MFileTest, ScrambledKeyValueLines) {
  std::string stored =
      "first one\n# a comment\n\n \t \n  spaced\\ key   the value\t \r\n"
      "lonely\nlong line\\\ncontinued\nlast without end";
  ScrambleConnectionText(stored);
  test::WriteFile(Path("o"), stored);
  MFile f;
  f.OpenFile(Path("o"), MFile::kReadOnly);
  std::vector<std::pair<std::string, std::string>> pairs;
  CStr key, value;
  while (f.ReadKeyValueLine(key, value)) pairs.emplace_back(key.View(), value.View());
  EXPECT_EQ(pairs, (std::vector<std::pair<std::string, std::string>>{
                       {"first", "one"},
                       {"spaced key", "the value"},
                       {"lonely", ""},
                       {"long", "line\\\ncontinued"},
                       {"last", "without end"}}));
}

TEST_F(MFileTest, TakeOverHandsOnThePositionAndPendingBytes) {
  test::WriteFile(Path("p"), "zBCxyFGHIJ");
  MFile f;
  f.OpenFile(Path("p"), MFile::kOpenOrCreate);
  char c[1];
  f.Seek(1);
  f.mread(c, 1);
  MFile g;
  g.TakeOver(f);
  EXPECT_FALSE(f.IsOpen());
  g.mread(c, 1);
  EXPECT_EQ(c[0], 'C');
  g.mwrite("12", 2);  // pending when handed on
  MFile h;
  h.TakeOver(g);
  h.mwrite("3", 1);
  h.MCommit();
  EXPECT_EQ(test::ReadFile(Path("p")), "zBC123GHIJ");
  EXPECT_EQ(h.GetMode(), MFile::kOpenOrCreate);
}

TEST_F(MFileTest, TruncateDropsPendingAndOldBytesAndLeavesTheFileThere) {
  MFile f;
  f.OpenFile(Path("t"), MFile::kCreate);
  f.mwrite("abcdefgh", 8);
  f.Seek(0);
  char c[2];
  f.mread(c, 2);   // read-ahead holds the whole file
  f.mwrite("XY", 2);  // pending: committed before the cut
  f.Truncate(3);
  f.mwrite("z", 1);
  f.MCommit();
  EXPECT_EQ(test::ReadFile(Path("t")), "abXz");
  f.Truncate(0);
  EXPECT_TRUE(f.IsEOF());
  EXPECT_EQ(f.FileSize(), 0);
}

TEST_F(MFileTest, TypedItemsRoundTripInTheirByteLayout) {
  const DateTimeValue date{2004, 3, 9, 14, 5, 7, 123456};
  const CValue text = test::Value("naïve"), wide = test::Value(u"w\u00fc"), number = test::Value(-42),
               when = test::Value(date);
  const int32_t row[] = {7, -8};
  MFile f;
  f.OpenFile(Path("t"), MFile::kCreate);
  f.WriteStr(CWStr(u"ab"));
  f.WriteDate(date);
  f.WriteShort(-2);
  f.WriteDouble(2.5);
  f.WriteStrW(u"\u4e2d");
  f.WriteItemRow(row);
  for (const CValue* v : {&text, &wide, &number, &when}) f.WriteValue(*v);
  f.MCommit();
  EXPECT_EQ(test::ReadFile(Path("t")).substr(0, 22),
            std::string("\x02\x00\x61\x00\x62\x00"
                        "\xD4\x07\x03\x00\x09\x00\x0E\x00\x05\x00\x07\x00\x40\xE2\x01\x00",
                        22));

  f.Seek(0);
  CWStr ab;
  f.ReadStr(ab);
  EXPECT_EQ(std::u16string(ab.View()), u"ab");
  EXPECT_EQ(f.ReadDate(), date);
  EXPECT_EQ(f.ReadShort(), -2);
  EXPECT_EQ(f.ReadDouble(), 2.5);
  std::u16string chinese;
  f.ReadStrW(chinese, 1);
  EXPECT_EQ(chinese, u"\u4e2d");
  int32_t back[2] = {};
  CValue text2(VALUE_TYPE::AsciiString), wide2(VALUE_TYPE::UnicodeString);
  CValue number2(VALUE_TYPE::Integer), when2(VALUE_TYPE::DateTime);
  ASSERT_EQ(f.ReadRow(back, text2), 0);
  f.ReadValue(wide2);
  f.ReadValue(number2);
  f.ReadValue(when2);
  EXPECT_EQ(back[1], -8);
  EXPECT_EQ(text2.Narrow(), "naïve");
  EXPECT_EQ(wide2.Wide(), u"w\u00fc");
  EXPECT_EQ(number2.GetInteger(), -42);
  EXPECT_EQ(when2.GetDateTime(), date);
  EXPECT_EQ(f.ReadRow(back, text2), 1);  // the end: nothing read
}

}  // namespace
}  // namespace qm
