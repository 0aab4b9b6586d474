// Command lines split into arguments by the usual quoting rules.
#include <gtest/gtest.h>

#include "platform/process.h"

namespace qm::platform {
namespace {

using Args = std::vector<std::string>;

TEST(SplitCommandLine, QuotingRules) {
  EXPECT_EQ(SplitCommandLine(""), Args{});
  EXPECT_EQ(SplitCommandLine("a  b\tc "), (Args{"a", "b", "c"}));
  EXPECT_EQ(SplitCommandLine("\"a b\" c"), (Args{"a b", "c"}));
  EXPECT_EQ(SplitCommandLine("x\"b c\"d"), (Args{"xb cd"}));
  EXPECT_EQ(SplitCommandLine("\"\" a"), (Args{"", "a"}));
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

}  // namespace
}  // namespace qm::platform
