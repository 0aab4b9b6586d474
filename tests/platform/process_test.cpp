// What child processes get: command lines split into arguments by the usual
// quoting rules, and no engine descriptor.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <string>

#include "platform/file_io.h"
#include "platform/process.h"
#include "support/test_support.h"

namespace qm::platform {
namespace {

using Args = std::vector<std::string>;

TEST(SplitCommandLine, QuotingRules) {
  const std::pair<const char*, Args> cases[] = {
      {"", {}},
      {"a  b\tc ", {"a", "b", "c"}},
      {"\"a b\" c", {"a b", "c"}},
      {"x\"b c\"d", {"xb cd"}},
      {"\"\" a", {"", "a"}},
      // Backslash + quote is a quote; other backslashes are literal (folder
      // placeholders and Windows-style paths survive).
      {"say \\\"hi\\\"", {"say", "\"hi\""}},
      {"[QUILLMERE_DATA_CONVERTERS]\\conv C:\\a\\b", {"[QUILLMERE_DATA_CONVERTERS]\\conv", "C:\\a\\b"}},
      // Backslashes before a quote: pairs become one backslash each.
      {"\"a\\\\\" b", {"a\\", "b"}},
      {"a\\\\\\\"b", {"a\\\"b"}},
      // Shell syntax means nothing here.
      {"a;b |c $(d) 'e f'", {"a;b", "|c", "$(d)", "'e", "f'"}},
  };
  for (const auto& [line, args] : cases) EXPECT_EQ(SplitCommandLine(line), args) << line;
}

TEST(FileIoTest, AChildProcessNeverInheritsAnEngineDescriptor) {
  test::ScratchDir dir("cloexec");
  FileHandle engine = OpenFileAs(dir.Path() + "index.sdx", FileAccess::ReadWrite, FileDisposition::CreateAlways);
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
