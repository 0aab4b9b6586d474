// The platform file layer: no child process inherits an engine descriptor.
#include <gtest/gtest.h>
#include <fcntl.h>
#include <unistd.h>

#include <string>

#include "platform/file_io.h"
#include "support/test_support.h"

namespace qm::platform {
namespace {

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
