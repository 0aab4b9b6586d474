// Opens, deletes and renames that meet a failure: how often they try, how long
// they wait, when they give up, and what they say then.
#include <gtest/gtest.h>

#include <filesystem>
#include <string>

#include "file_test_util.h"
#include "shared/exception_family.h"
#include "shared/file_operations.h"
#include "shared/win_file.h"
#include "support/test_support.h"

namespace qm {
namespace {

namespace fs = std::filesystem;
using test::PauseRecorder;
using test::RaisedText;

class FileRetryTest : public ::testing::Test {
 protected:
  std::string PathOf(const std::string& name) const { return dir_.Path() + name; }
  test::ScratchDir dir_{"retry"};
};

// Running as any user, a directory where a file is expected makes unlink,
// open for writing and rename fail for a reason other than a missing name.
TEST_F(FileRetryTest, DropFileTriesTenTimesASecondApartThenRaises) {
  const std::string path = PathOf("busy");
  fs::create_directory(path);
  PauseRecorder pauses;
  EXPECT_EQ(RaisedText<CSTDFUNException>([&] { DropFile(path); }),
            "Error deleting file: " + path + " (Module:STDFUN,Method:DropFile)");
  EXPECT_TRUE(pauses.Were(9, 1000));
}

TEST_F(FileRetryTest, DropFileSucceedsOnceTheObstacleIsGoneAndIgnoresMissingFiles) {
  const std::string path = PathOf("freed");
  fs::create_directory(path);
  PauseRecorder pauses([&](std::size_t n) {
    if (n == 3) {
      fs::remove(path);
      test::WriteFile(path, "x");
    }
  });
  DropFile(path);
  EXPECT_FALSE(fs::exists(path));
  EXPECT_EQ(pauses.Pauses().size(), 3u);
  DropFile(PathOf("never-there"));
  EXPECT_EQ(pauses.Pauses().size(), 3u);
}

TEST_F(FileRetryTest, DeleteFileTriesFiveTimesAndAMissingFileFailsAtOnce) {
  const std::string busy = PathOf("busy");
  fs::create_directory(busy);
  {
    PauseRecorder pauses;
    EXPECT_EQ(RaisedText<CSTDFUNException>([&] { DeleteFile(busy); }),
              "Error deleting file " + busy + " (Module:STDFUN,Method:DeleteFile)");
    EXPECT_TRUE(pauses.Were(4, 1000));
  }
  PauseRecorder pauses;
  const std::string missing = PathOf("missing");
  EXPECT_EQ(RaisedText<CSTDFUNException>([&] { DeleteFile(missing); }),
            "Error deleting file " + missing + " (Module:STDFUN,Method:DeleteFile)");
  EXPECT_TRUE(pauses.Pauses().empty());
  const std::string present = PathOf("present");
  test::WriteFile(present, "x");
  DeleteFile(present);
  EXPECT_FALSE(fs::exists(present));
}

TEST_F(FileRetryTest, OpenWinFileTriesThreeTimesHalfASecondApart) {
  const std::string path = PathOf("dir-not-file");
  fs::create_directory(path);
  PauseRecorder pauses;
  WinFile f;
  EXPECT_EQ(RaisedText<CWinFileException>(
                [&] { f.OpenWinFile(path, platform::FileAccess::ReadWrite); }),
            "Error opening file: " + path + " (Module:WinFile,Method:OpenWinFile)");
  EXPECT_TRUE(pauses.Were(2, 500));
  EXPECT_FALSE(f.IsOpen());
}

TEST_F(FileRetryTest, OpenWinFileStopsAtOnceWhenTheFileOrFolderIsMissing) {
  PauseRecorder pauses;
  WinFile f;
  const std::string in_missing_folder = PathOf("no-such-folder/file");
  EXPECT_EQ(RaisedText<CWinFileException>(
                [&] { f.OpenWinFile(in_missing_folder, platform::FileAccess::ReadWrite); }),
            "Error opening file: " + in_missing_folder + " (Module:WinFile,Method:OpenWinFile)");
  const std::string missing = PathOf("missing");
  EXPECT_EQ(RaisedText<CWinFileException>([&] {
              f.OpenWinFile(missing, platform::FileAccess::Read, platform::kFileAttributeNormal,
                            platform::FileDisposition::OpenExisting);
            }),
            "Error opening file: " + missing + " (Module:WinFile,Method:OpenWinFile)");
  EXPECT_TRUE(pauses.Pauses().empty());
}

TEST_F(FileRetryTest, OpenWinFileSucceedsWhenALaterAttemptCan) {
  const std::string path = PathOf("late");
  fs::create_directory(path);
  PauseRecorder pauses([&](std::size_t n) {
    if (n == 2) fs::remove(path);
  });
  WinFile f;
  f.OpenWinFile(path, platform::FileAccess::ReadWrite);
  EXPECT_TRUE(f.IsOpen());
  EXPECT_EQ(pauses.Pauses().size(), 2u);
}

TEST_F(FileRetryTest, RemoveFileRenamesOntoAnExistingTargetAndRetriesTenTimes) {
  const std::string source = PathOf("source");
  const std::string target = PathOf("target");
  test::WriteFile(source, "new");
  test::WriteFile(target, "old");
  WinFile::RemoveFile(source, target);
  EXPECT_EQ(test::ReadFile(target), "new");
  EXPECT_FALSE(fs::exists(source));

  // A non-empty folder as target cannot be replaced by a file.
  test::WriteFile(source, "again");
  const std::string folder = PathOf("folder");
  test::WriteFile(folder + "/inside", "x");
  PauseRecorder pauses;
  EXPECT_EQ(RaisedText<CWinFileException>([&] { WinFile::RemoveFile(source, folder); }),
            "Error renaming file: " + source + " to " + folder +
                " (Module:WinFile,Method:RemoveFile)");
  EXPECT_TRUE(pauses.Were(9, 1000));
}

TEST_F(FileRetryTest, RemoveFileOfAMissingSourceRaisesAtOnce) {
  PauseRecorder pauses;
  const std::string source = PathOf("gone");
  const std::string target = PathOf("target");
  test::WriteFile(target, "kept");
  EXPECT_EQ(RaisedText<CWinFileException>([&] { WinFile::RemoveFile(source, target); }),
            "Error renaming file: " + source + " to " + target +
                " (Module:WinFile,Method:RemoveFile)");
  EXPECT_TRUE(pauses.Pauses().empty());
  EXPECT_EQ(test::ReadFile(target), "kept");
}

TEST_F(FileRetryTest, WinFileReadsWritesAndReportsCreateFailures) {
  const std::string path = PathOf("plain");
  WinFile f;
  f.CreateWinFile(path, platform::FileAccess::ReadWrite);
  f.Write("hello world", 11);
  f.WriteAt("W", 1, 6);
  EXPECT_EQ(f.Size(), 11);
  f.Seek(0);
  char buffer[32] = {};
  EXPECT_EQ(f.Read(buffer, sizeof buffer), 11u);
  EXPECT_EQ(std::string(buffer, 11), "hello World");
  f.Close();
  f.Close();  // closing twice is harmless

  const std::string bad = PathOf("missing/plain");
  EXPECT_EQ(RaisedText<CWinFileException>(
                [&] { f.CreateWinFile(bad, platform::FileAccess::ReadWrite); }),
            "Error creating file: " + bad + " (Module:WinFile,Method:CreateWinFile)");

  f.OpenWinFile(path, platform::FileAccess::Write);
  EXPECT_EQ(RaisedText<CWinFileException>([&] { f.Read(buffer, 1); }),
            "Error reading from file (Module:WinFile,Method:ReadFromFile)");
  WinFile full;
  full.OpenWinFile("/dev/full", platform::FileAccess::Write);
  EXPECT_EQ(RaisedText<CWinFileException>([&] { full.Write("x", 1); }),
            "Error writing to file (Module:WinFile,Method:WriteToFile)");
}

TEST_F(FileRetryTest, WholeFileHelpers) {
  const std::string path = PathOf("text.txt");
  std::string text;
  for (int i = 0; i < 9000; ++i) text.push_back(static_cast<char>('A' + i % 26));
  WriteTextFile(path, text);
  EXPECT_EQ(loadtext(path), text);
  WriteTextFile(path, "short");  // truncates
  EXPECT_EQ(loadtext(path), "short");

  const std::string missing = PathOf("missing.txt");
  EXPECT_EQ(RaisedText<CSTDFUNException>([&] { loadtext(missing); }),
            "Access denied or disk full. Could not open or create file: " + missing +
                ". If you are running this component from a web server, the Internet user must "
                "have write access to the Quillmere Search data directory. "
                "(Module:STDFUN,Method:OpenWindowsFile)");
  EXPECT_EQ(RaisedText<CSTDFUNException>([&] { WriteTextFile("/dev/full", "x"); }),
            "Error writing to file: /dev/full (Module:STDFUN,Method:WriteTextFile)");
}

}  // namespace
}  // namespace qm
