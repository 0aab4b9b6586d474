// Running converter programs: arguments filled after splitting, failures by
// exit status and time-out, retries only for programs that cannot start.
#include <gtest/gtest.h>

#include <filesystem>
#include <string>

#include "support/file_test_util.h"
#include "config/converter_runner.h"
#include "base/exception_family.h"
#include "base/trace.h"
#include "support/test_support.h"

namespace qm {
namespace {

using test::PauseRecorder;
using test::RaisedText;

std::string Failure(const std::string& command, int code) {
  return "Error converting file. Could not execute converter. CMD: " + command +
         " - Error Code: " + std::to_string(code) + " (Module:STDFUN,Method:ConvertText)";
}

// Puts one and two in place of "%1" and "%2" in one argument.
std::string ReplacePercent(std::string_view argument, const std::string& one,
                           const std::string& two) {
  std::string out;
  for (std::size_t i = 0; i < argument.size(); ++i) {
    const char next = i + 1 < argument.size() ? argument[i + 1] : '\0';
    if (argument[i] == '%' && (next == '1' || next == '2')) {
      out += next == '1' ? one : two;
      ++i;
    } else {
      out += argument[i];
    }
  }
  return out;
}

TEST(ConverterRunnerTest, ValuesPutIntoArgumentsNeverSplitOrBecomeCommands) {
  test::ScratchDir dir("convert");
  const std::string input = dir.Path() + "in put \"x\"; rm -rf .txt";
  const std::string output = dir.Path() + "out %2 file.txt";
  test::WriteFile(input, "document text");
  ConvertText("/bin/cp \"%1\" %2", [&](std::string_view a) { return ReplacePercent(a, input, output); });
  EXPECT_EQ(test::ReadFile(output), "document text");
  EXPECT_TRUE(std::filesystem::exists(input));
}

TEST(ConverterRunnerTest, ExitStatusTimeOutAndEmptyLinesFailAtOnce) {
  PauseRecorder pauses;
  EXPECT_EQ(RaisedText<CSTDFUNException>([] { ConvertText("/bin/sh -c \"exit 3\""); }),
            Failure("/bin/sh -c exit 3", 3));
  EXPECT_EQ(RaisedText<CSTDFUNException>([] { ConvertText("   "); }), Failure("   ", 22));
  SetConverterTimeoutForTesting(std::chrono::milliseconds(200));
  const std::string text = RaisedText<CSTDFUNException>([] { ConvertText("/bin/sleep 30"); });
  SetConverterTimeoutForTesting(kConverterTimeout);
  EXPECT_EQ(text, Failure("/bin/sleep 30", -1));
  EXPECT_TRUE(pauses.Pauses().empty());
}

TEST(ConverterRunnerTest, AProgramThatCannotStartIsTriedFiveTimes) {
  test::ConfiguredHome home;
  const bool old_level = TraceLevel2;
  TraceLevel2 = true;
  PauseRecorder pauses;
  const std::string command = "/no/such/converter %1";
  const std::string text = RaisedText<CSTDFUNException>(
      [&] { ConvertText(command, [](std::string_view a) { return ReplacePercent(a, "doc", ""); }); });
  TraceLevel2 = old_level;
  EXPECT_EQ(text, Failure("/no/such/converter doc", 2));
  EXPECT_TRUE(pauses.Were(4, 1000));

  EXPECT_TRUE(test::Has(test::TraceOf(home, "PILIB"),
                        " OpenFileRetry - Warning: Could not convert file. CMD: /no/such/converter doc - "
                        "Error Code: 2 - Retrying...\r\n"));
}

}  // namespace
}  // namespace qm
