// The platform file layer: dispositions and descriptors no child inherits.
#include <gtest/gtest.h>
#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <string>

#include "platform/file_io.h"
#include "support/test_support.h"

namespace qm::platform {
namespace {

TEST(FileIoTest, DispositionsCreateTruncateKeepOrRefuse) {
  test::ScratchDir dir("fileio");
  const std::string path = dir.Path() + "f";
  EXPECT_FALSE(OpenFileAs(path, FileAccess::Read, FileDisposition::OpenExisting).IsOpen());
  EXPECT_EQ(errno, ENOENT);
  {
    FileHandle f = OpenFileAs(path, FileAccess::ReadWrite, FileDisposition::CreateNew);
    ASSERT_TRUE(f.IsOpen());
    ASSERT_TRUE(WriteAll(f.Get(), "abcdef", 6));
    ASSERT_TRUE(WriteAllAt(f.Get(), "XY", 2, 2));
    EXPECT_EQ(SeekFile(f.Get(), 0, SeekFrom::Current), 6);
    EXPECT_EQ(SeekFile(f.Get(), 1, SeekFrom::Begin), 1);
    char buffer[16];
    EXPECT_EQ(ReadFull(f.Get(), buffer, sizeof buffer), 5);
    EXPECT_EQ(std::string(buffer, 5), "bXYef");
  }
  EXPECT_FALSE(OpenFileAs(path, FileAccess::Write, FileDisposition::CreateNew).IsOpen());
  EXPECT_EQ(errno, EEXIST);
  {
    FileHandle f = OpenFileAs(path, FileAccess::ReadWrite, FileDisposition::OpenAlways);
    EXPECT_EQ(FileSize(f.Get()), 6);
  }
  {
    FileHandle f = OpenFileAs(path, FileAccess::Write, FileDisposition::CreateAlways);
    EXPECT_EQ(FileSize(f.Get()), 0);
  }
  EXPECT_EQ(MakeDirectories(dir.Path() + "a/b/c"), 0);
  EXPECT_TRUE(IsDirectory(dir.Path() + "a/b/c"));
  EXPECT_EQ(MakeDirectories(path), ENOTDIR);  // a file is in the way
  EXPECT_EQ(RenameFile(path, dir.Path() + "a/g"), 0);
  EXPECT_EQ(UnlinkFile(dir.Path() + "a/g"), 0);
  EXPECT_EQ(UnlinkFile(dir.Path() + "a/g"), ENOENT);
}

TEST(FileIoTest, AChildProcessNeverInheritsAnEngineDescriptor) {
  test::ScratchDir dir("cloexec");
  const std::string path = dir.Path() + "index.sdx";
  FileHandle engine = OpenFileAs(path, FileAccess::ReadWrite, FileDisposition::CreateAlways);
  ASSERT_TRUE(engine.IsOpen());
  // A plain duplicate is inherited: it shows the check can see a leak.
  const int inherited = ::fcntl(engine.Get(), F_DUPFD, 100);
  ASSERT_GE(inherited, 0);
  auto child_sees = [&](int fd) {
    std::string out;
    test::RunProgram({"/bin/readlink", "/proc/self/fd/" + std::to_string(fd)}, &out);
    return out.find("index.sdx") != std::string::npos;
  };
  EXPECT_TRUE(child_sees(inherited));
  EXPECT_FALSE(child_sees(engine.Get()));
  ::close(inherited);
}

}  // namespace
}  // namespace qm::platform
