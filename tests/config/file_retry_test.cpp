// Opens, deletes and renames that meet a failure: how often they try, how long
// they wait, when they give up, and what they say then. A folder where a file
// is expected makes unlink, open-for-writing and rename fail for any user.
#include <gtest/gtest.h>

#include <filesystem>
#include <string>

#include "support/file_test_util.h"
#include "base/exception_family.h"
#include "config/file_operations.h"
#include "config/win_file.h"
#include "support/test_support.h"

namespace qm {
namespace {

namespace fs = std::filesystem;
using platform::FileAccess;
using test::PauseRecorder;
using test::RaisedText;

class FileRetryTest : public ::testing::Test {
 protected:
  std::string Path(const std::string& name) const { return dir_.Path() + name; }
  std::string Folder(const std::string& name) const {
    fs::create_directories(Path(name) + "/inner");
    return Path(name);
  }
  test::ScratchDir dir_{"retry"};
};

TEST_F(FileRetryTest, DeletesRetryAsOftenAsTheirKindSaysThenRaise) {
  const std::string busy = Folder("busy");
  {
    PauseRecorder pauses;
    EXPECT_EQ(RaisedText<CSTDFUNException>([&] { DropFile(busy); }),
              "Error deleting file: " + busy + " (Module:STDFUN,Method:DropFile)");
    EXPECT_TRUE(pauses.Were(9, 1000));
  }
  {
    PauseRecorder pauses;
    EXPECT_EQ(RaisedText<CSTDFUNException>([&] { DeleteFile(busy); }),
              "Error deleting file " + busy + " (Module:STDFUN,Method:DeleteFile)");
    EXPECT_TRUE(pauses.Were(4, 1000));
  }
  PauseRecorder pauses;
  DropFile(Path("never-there"));  // nothing to drop
  EXPECT_EQ(RaisedText<CSTDFUNException>([&] { DeleteFile(Path("never-there")); }),
            "Error deleting file " + Path("never-there") + " (Module:STDFUN,Method:DeleteFile)");
  EXPECT_TRUE(pauses.Pauses().empty());  // a missing name is not waited for
}

TEST_F(FileRetryTest, ARetrySucceedsOnceTheObstacleIsGone) {
  const std::string path = Folder("freed");
  PauseRecorder pauses([&](std::size_t n) {
    if (n == 2) fs::remove_all(path);
  });
  WinFile f;
  f.OpenWinFile(path, FileAccess::ReadWrite);  // created on the third attempt
  EXPECT_TRUE(f.IsOpen());
  EXPECT_TRUE(pauses.Were(2, 500));
}

TEST_F(FileRetryTest, OpenWinFileTriesThreeTimesButNotForAMissingFileOrFolder) {
  const std::string busy = Folder("busy");
  WinFile f;
  {
    PauseRecorder pauses;
    EXPECT_EQ(RaisedText<CWinFileException>([&] { f.OpenWinFile(busy, FileAccess::ReadWrite); }),
              "Error opening file: " + busy + " (Module:WinFile,Method:OpenWinFile)");
    EXPECT_TRUE(pauses.Were(2, 500));
  }
  PauseRecorder pauses;
  const std::string no_folder = Path("no-folder/file");
  EXPECT_EQ(RaisedText<CWinFileException>([&] { f.OpenWinFile(no_folder, FileAccess::ReadWrite); }),
            "Error opening file: " + no_folder + " (Module:WinFile,Method:OpenWinFile)");
  EXPECT_TRUE(pauses.Pauses().empty());
}

TEST_F(FileRetryTest, RemoveFileReplacesTheTargetRetriesAndRefusesAMissingSource) {
  const std::string source = Path("source"), target = Path("target");
  test::WriteFile(source, "new");
  test::WriteFile(target, "old");
  WinFile::RemoveFile(source, target);
  EXPECT_EQ(test::ReadFile(target), "new");
  EXPECT_FALSE(fs::exists(source));
  {
    PauseRecorder pauses;
    EXPECT_EQ(RaisedText<CWinFileException>([&] { WinFile::RemoveFile(source, target); }),
              "Error renaming file: " + source + " to " + target +
                  " (Module:WinFile,Method:RemoveFile)");
    EXPECT_TRUE(pauses.Pauses().empty());
    EXPECT_EQ(test::ReadFile(target), "new");
  }
  PauseRecorder pauses;
  const std::string busy = Folder("busy");  // a non-empty folder cannot be replaced
  EXPECT_EQ(RaisedText<CWinFileException>([&] { WinFile::RemoveFile(target, busy); }),
            "Error renaming file: " + target + " to " + busy + " (Module:WinFile,Method:RemoveFile)");
  EXPECT_TRUE(pauses.Were(9, 1000));
}

TEST_F(FileRetryTest, WinFileAndWholeFileFailures) {
  WinFile f;
  const std::string bad = Path("missing/plain");
  EXPECT_EQ(RaisedText<CWinFileException>([&] { f.CreateWinFile(bad, FileAccess::ReadWrite); }),
            "Error creating file: " + bad + " (Module:WinFile,Method:CreateWinFile)");
  f.OpenWinFile(Path("plain"), FileAccess::Write);
  char buffer[4];
  EXPECT_EQ(RaisedText<CWinFileException>([&] { f.Read(buffer, 1); }),
            "Error reading from file (Module:WinFile,Method:ReadFromFile)");
  f.OpenWinFile("/dev/full", FileAccess::Write);
  EXPECT_EQ(RaisedText<CWinFileException>([&] { f.Write("x", 1); }),
            "Error writing to file (Module:WinFile,Method:WriteToFile)");

  const std::string text(9000, 't');  // more than one read chunk
  WriteTextFile(Path("text"), text);
  EXPECT_EQ(loadtext(Path("text")), text);
  EXPECT_EQ(RaisedText<CSTDFUNException>([&] { loadtext(Path("nope")); }),
            "Access denied or disk full. Could not open or create file: " + Path("nope") +
                ". If you are running this component from a web server, the Internet user must "
                "have write access to the Quillmere Search data directory. "
                "(Module:STDFUN,Method:OpenWindowsFile)");
  EXPECT_EQ(RaisedText<CSTDFUNException>([&] { WriteTextFile("/dev/full", "x"); }),
            "Error writing to file: /dev/full (Module:STDFUN,Method:WriteTextFile)");
}

}  // namespace
}  // namespace qm
