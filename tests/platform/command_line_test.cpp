// Command lines split into arguments, and programs run without a shell.
#include <gtest/gtest.h>

#include <cerrno>

#include "platform/process.h"
#include "support/test_support.h"

namespace qm::platform {
namespace {

using Args = std::vector<std::string>;

TEST(SplitCommandLine, QuotingRules) {
  EXPECT_EQ(SplitCommandLine(""), Args{});
  EXPECT_EQ(SplitCommandLine(" \t "), Args{});
  EXPECT_EQ(SplitCommandLine("a  b\tc "), (Args{"a", "b", "c"}));
  EXPECT_EQ(SplitCommandLine("\"a b\" c"), (Args{"a b", "c"}));
  EXPECT_EQ(SplitCommandLine("x\"b c\"d"), (Args{"xb cd"}));
  EXPECT_EQ(SplitCommandLine("\"\" a"), (Args{"", "a"}));
  EXPECT_EQ(SplitCommandLine("\"open end"), (Args{"open end"}));
  // Backslash + quote is a quote; other backslashes are literal (folder
  // placeholders and Windows-style paths survive).
  EXPECT_EQ(SplitCommandLine("say \\\"hi\\\""), (Args{"say", "\"hi\""}));
  EXPECT_EQ(SplitCommandLine("[QUILLMERE_DATA_CONVERTERS]\\conv C:\\a\\b"),
            (Args{"[QUILLMERE_DATA_CONVERTERS]\\conv", "C:\\a\\b"}));
  // Backslashes before a quote: pairs become one backslash each.
  EXPECT_EQ(SplitCommandLine("\"a\\\\\" b"), (Args{"a\\", "b"}));
  EXPECT_EQ(SplitCommandLine("a\\\\\\\"b"), (Args{"a\\\"b"}));
  // Shell syntax means nothing here.
  EXPECT_EQ(SplitCommandLine("a;b |c $(d) 'e f'"), (Args{"a;b", "|c", "$(d)", "'e", "f'"}));
}

TEST(RunProcess, ExitStatusAndStartFailure) {
  const std::string helper = test::HelperPath("sample_converter");
  const ProcessResult failed = RunProcess({helper, "fail"}, std::chrono::seconds(50));
  EXPECT_TRUE(failed.started);
  EXPECT_FALSE(failed.timed_out);
  EXPECT_EQ(failed.exit_status, 3);

  const ProcessResult missing = RunProcess({"/no/such/program"}, std::chrono::seconds(50));
  EXPECT_FALSE(missing.started);
  EXPECT_EQ(missing.start_error, ENOENT);

  EXPECT_FALSE(RunProcess({}, std::chrono::seconds(50)).started);
}

}  // namespace
}  // namespace qm::platform
