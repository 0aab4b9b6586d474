#include "base/trace.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>
#include <regex>
#include <string>
#include <thread>
#include <vector>

#include "support/file_test_util.h"
#include "base/exception_family.h"

namespace qm {
namespace {

namespace fs = std::filesystem;

std::tm Today() {
  const std::time_t now = std::time(nullptr);
  std::tm t{};
  localtime_r(&now, &t);
  return t;
}

// Time fields carry no leading zeros.
const std::string kStamp = R"(\d{4}-[1-9]\d?-[1-9]\d? (0|[1-9]\d?):(0|[1-9]\d?):(0|[1-9]\d?))";

TEST(TraceLineFormat, NoLeadingZerosAndOptionalArea) {
  std::tm t{};
  t.tm_year = 2004 - 1900, t.tm_mon = 2, t.tm_mday = 9, t.tm_hour = 14, t.tm_min = 5, t.tm_sec = 7;
  EXPECT_EQ(TraceDate(t), "2004-3-9");
  EXPECT_EQ(TraceLine(t, "Block.InsertRow", "Error inserting row"),
            "2004-3-9 14:5:7 Block.InsertRow - Error inserting row\r\n");
  t.tm_hour = t.tm_min = t.tm_sec = 0;
  EXPECT_EQ(TraceLine(t, "", "text"), "2004-3-9 0:0:0  - text\r\n");
}

TEST(TraceFiles, OneFilePerModuleAndDay) {
  test::ConfiguredHome home;
  Trace(true, "SHARELIB_ERROR.Block.InsertRow", "Error inserting row");
  Trace(true, "SHARELIB,PILIB.cmd.TranslateW", "Translating. Statement: %s, Words: %i", "SELECT %s",
        3);
  Trace(false, "SHARELIB.Never", "not written");

  const std::string date = TraceDate(Today());
  EXPECT_TRUE(fs::exists(home.Home() + "Log/trace_SHARELIB_ERROR_" + date + ".log"));
  EXPECT_TRUE(std::regex_match(test::TraceOf(home, "SHARELIB_ERROR"),
                               std::regex(kStamp + " Block.InsertRow - Error inserting row\r\n")));
  const std::regex translating(kStamp +
                               " cmd.TranslateW - Translating. Statement: SELECT %s, Words: 3\r\n");
  EXPECT_TRUE(std::regex_match(test::TraceOf(home, "PILIB"), translating));
}

class TraceRollOver : public ::testing::Test {
 protected:
  void TearDown() override { SetTraceFileLimitForTesting(100'000'000); }
  test::ConfiguredHome home_;
};

TEST_F(TraceRollOver, AFullDayFileContinuesInTheFirstNumberedFileWithRoom) {
  SetTraceFileLimitForTesting(100);
  const std::string date = TraceDate(Today());
  const std::string base = home_.Home() + "Log/trace_ROLL_" + date;
  test::WriteFile(base + ".log", std::string(100, '.'));  // at the limit: still used
  Trace(true, "ROLL.A", "one");
  test::WriteFile(base + "_1.log", std::string(101, '.'));
  test::WriteFile(base + "_2.log", std::string(10, '.'));
  Trace(true, "ROLL.A", "two");  // base.log is now above the limit, _1 too
  Trace(true, "ROLL.A", "three");
  if (TraceDate(Today()) != date) GTEST_SKIP() << "the day changed during the test";

  EXPECT_NE(test::ReadFile(base + ".log").find(" A - one\r\n"), std::string::npos);
  EXPECT_EQ(test::ReadFile(base + "_1.log"), std::string(101, '.'));
  const std::string second = test::ReadFile(base + "_2.log");
  EXPECT_NE(second.find(" A - two\r\n"), std::string::npos);
  EXPECT_NE(second.find(" A - three\r\n"), std::string::npos);
  EXPECT_FALSE(fs::exists(base + "_3.log"));
}

TEST(TraceFailures, NothingIsWrittenOrThrownWithoutAUsableLogFolder) {
  {
    test::ConfiguredHome home;
    unsetenv("MORVIL_HOME");  // no home at all
    Trace(true, "NOHOME.A", "dropped");
    EXPECT_TRUE(fs::is_empty(home.Home() + "Log"));
  }
  {
    test::ConfiguredHome home;
    fs::remove_all(home.Home() + "Log");
    Trace(true, "MISSING.A", "dropped");
    EXPECT_FALSE(fs::exists(home.Home() + "Log"));
    // An exception built while its trace line cannot be written is intact.
    const auto e = CMFileUnknownException::Unknown("Read");
    EXPECT_EQ(e.GetEntries().size(), 1u);
    // A FIFO in place of the day's file: no reader, so the line is dropped, not waited on.
    fs::create_directories(home.Home() + "Log");
    const std::string fifo = home.Home() + "Log/trace_FIFO_" + TraceDate(Today()) + ".log";
    ASSERT_EQ(mkfifo(fifo.c_str(), 0600), 0);
    Trace(true, "FIFO.A", "dropped");
    fs::remove_all(home.Home() + "Log");
    test::WriteFile(home.Home() + "Log", "a file where the folder should be");
    Trace(true, "NOTADIR.A", "dropped");
    EXPECT_TRUE(fs::is_regular_file(home.Home() + "Log"));
  }
}

TEST(TraceFiles, ConcurrentTracersNeverInterleave) {
  test::ConfiguredHome home;
  constexpr int kThreads = 4;
  constexpr int kLines = 200;
  std::vector<std::thread> threads;
  for (int t = 0; t < kThreads; ++t) {
    threads.emplace_back([t] {
      const std::string payload(300, static_cast<char>('a' + t));
      for (int i = 0; i < kLines; ++i) Trace(true, "MANY.Area", "%i %s", t, payload);
    });
  }
  for (auto& th : threads) th.join();
  const std::string all = test::TraceOf(home, "MANY");
  const std::regex line(kStamp + R"( Area - ([0-3]) (a{300}|b{300}|c{300}|d{300}))");
  int count = 0;
  std::size_t pos = 0;
  while (pos < all.size()) {
    const auto end = all.find("\r\n", pos);
    ASSERT_NE(end, std::string::npos);
    EXPECT_TRUE(std::regex_match(all.substr(pos, end - pos), line)) << all.substr(pos, 80);
    ++count;
    pos = end + 2;
  }
  EXPECT_EQ(count, kThreads * kLines);
}

class TraceLevelFile : public ::testing::Test {
 protected:
  void TearDown() override {
    TraceLevel1 = saved_[0];
    TraceLevel2 = saved_[1];
    TraceLevel3 = saved_[2];
  }
  // Writes traceStat.log and returns the flags as "123" / "12" / "".
  std::string LevelsFor(const std::string& content) {
    test::WriteFile(home_.Home() + "Log/traceStat.log", content);
    InitTraceLevels();
    return std::string(TraceLevel1 ? "1" : "") + (TraceLevel2 ? "2" : "") + (TraceLevel3 ? "3" : "");
  }
  bool saved_[3] = {TraceLevel1, TraceLevel2, TraceLevel3};
  test::ConfiguredHome home_;
};

TEST_F(TraceLevelFile, FirstLineDecidesInAnyCase) {
  EXPECT_EQ(LevelsFor("trace level 2\n"), "12");
  EXPECT_EQ(LevelsFor("on: TRACE LEVEL 3\r\nTRACE LEVEL 1"), "123");
  EXPECT_EQ(LevelsFor("TRACE LEVEL 3, TRACE LEVEL 1"), "1");  // level 1 is looked for first
  EXPECT_EQ(LevelsFor(std::string(190, ' ') + "TRACE LEVEL 3"), "");  // beyond 199 characters
  fs::remove(home_.Home() + "Log/traceStat.log");
  TraceLevel1 = true;
  EXPECT_FALSE(InitTraceLevels().level1);
  EXPECT_FALSE(TraceLevel1);
}

}  // namespace
}  // namespace qm
