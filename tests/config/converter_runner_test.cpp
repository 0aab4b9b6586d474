// Running converter programs: a program that cannot start is tried again, with
// a pause and a trace line between tries. Splitting, exit statuses, time-outs
// and empty lines are checked through DocConverter, the runner's one caller
// (tests/sources/doc_converter_test.cpp).
#include <gtest/gtest.h>

#include <string>

#include "support/file_test_util.h"
#include "config/converter_runner.h"
#include "base/exception_family.h"
#include "base/trace.h"
#include "support/test_support.h"

namespace qm {
namespace {

TEST(ConverterRunnerTest, AProgramThatCannotStartIsTriedFiveTimes) {
  test::ConfiguredHome home;
  const bool old_level = TraceLevel2;
  TraceLevel2 = true;
  test::PauseRecorder pauses;
  const std::string text =
      test::RaisedText<CSTDFUNException>([] { ConvertText("/no/such/converter doc"); });
  TraceLevel2 = old_level;
  EXPECT_EQ(text,
            "Error converting file. Could not execute converter. CMD: /no/such/converter doc - "
            "Error Code: 2 (Module:STDFUN,Method:ConvertText)");
  EXPECT_TRUE(pauses.Were(4, 1000));

  EXPECT_TRUE(test::Has(test::TraceOf(home, "PILIB"),
                        " OpenFileRetry - Warning: Could not convert file. CMD: /no/such/converter doc - "
                        "Error Code: 2 - Retrying...\r\n"));
}

}  // namespace
}  // namespace qm
