// quillmere analyze, run as a user runs it: text on standard input, one line a word.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support/test_support.h"

namespace qm {
namespace {

int Analyze(const std::string& input, const std::vector<std::string>& options, std::string& out) {
  test::ScratchDir dir("analyze");
  const std::string file = dir.Path() + "input.txt";
  test::WriteFile(file, input);
  std::vector<std::string> argv{"/bin/sh", "-c", "f=$1; shift; exec \"$@\" < \"$f\"", "sh", file,
                                QM_CLI_PATH, "analyze"};
  argv.insert(argv.end(), options.begin(), options.end());
  return test::RunProgram(argv, &out);
}

TEST(AnalyzeCommand, PrintsPositionWordAndFormWithSentenceGaps) {
  std::string out;
  ASSERT_EQ(Analyze("One two. three<b>x</b>\n\xC3\xA9t\xC3\xA9", {"--html"}, out), 0);
  EXPECT_EQ(out,
            "1\tONE\tONE\n"
            "2\tTWO\tTWO\n"
            "4\tTHREEX\tTHREEX\n"
            "5\t\xC3\x89T\xC3\x89\t\xC3\x89T\xC3\x89\n");
}

TEST(AnalyzeCommand, SeparatorOptions) {
  std::string out;
  // Only "/" separates: blanks end up inside the cut and are trimmed away.
  ASSERT_EQ(Analyze("a b/c-d", {"--separators", "/", "--no-default-separators"}, out), 0);
  EXPECT_EQ(out, "1\tA B\tA B\n2\tC-D\tC-D\n");
  ASSERT_EQ(Analyze("a%b c", {"--separators", "%037"}, out = {}), 0);
  EXPECT_EQ(out, "1\tA\tA\n2\tB\tB\n3\tC\tC\n");
  ASSERT_EQ(Analyze(". ; ", {}, out = {}), 0);
  EXPECT_EQ(out, "");
}

TEST(AnalyzeCommand, RejectsBadOptions) {
  std::string out;
  EXPECT_EQ(Analyze("x", {"--language", "13"}, out), 2);
  EXPECT_EQ(Analyze("x", {"--separators"}, out), 2);
  EXPECT_EQ(Analyze("x", {"--bogus"}, out), 2);
  EXPECT_EQ(out, "");
}

}  // namespace
}  // namespace qm
