// Temporary names: the generator counter, its file and lock, work files and
// their extensions, and distinct names across concurrent processes.
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <set>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "support/file_test_util.h"
#include "base/byte_layout.h"
#include "base/exception_family.h"
#include "config/global_defs.h"
#include "support/test_support.h"

namespace qm {
namespace {

namespace fs = std::filesystem;
using test::RaisedChain;
using test::RaisedText;

std::string Counter(int32_t v) {
  std::string s(4, '\0');
  bytes::StoreI32(reinterpret_cast<uint8_t*>(s.data()), v);
  return s;
}

class TempNamesTest : public ::testing::Test {
 protected:
  TempNamesTest() {
    fs::create_directories(GroupFolder() + "Config");
    fs::create_directories(GroupFolder() + "WorkData");
  }
  std::string GroupFolder() const { return home_.Data() + "Groups/PUBLIC/"; }
  std::string Generator() const { return GroupFolder() + "Config/generator.dat"; }

  test::ConfiguredHome home_;
  CGlobalDefs defs_;
};

TEST_F(TempNamesTest, TheCounterCountsFromOneToTenThousandAndStartsAgain) {
  EXPECT_EQ(SLGetTempFileName(defs_, true, 7), "tmpxxxx_7_1");  // a new file
  EXPECT_EQ(SLGetTempFileName(defs_, true, 7), "tmpxxxx_7_2");
  EXPECT_EQ(test::ReadFile(Generator()), Counter(2));
  // Short and damaged counters start again like an exhausted one.
  const std::pair<std::string, std::string> cases[] = {
      {Counter(9999), "tmpxxxx_3_10000"}, {Counter(10000), "tmpxxxx_3_1"}, {"\x05\x00", "tmpxxxx_3_1"},
      {Counter(-7), "tmpxxxx_3_1"}};
  for (const auto& [stored, name] : cases) {
    test::WriteFile(Generator(), stored);
    EXPECT_EQ(SLGetTempFileName(defs_, true, 3), name);
  }
}

TEST_F(TempNamesTest, HomeScopeUsesTheHomeConfigFolderAndNeedsAHome) {
  EXPECT_EQ(SLGetTempFileName(defs_, false, 1), "tmpxxxx_1_1");
  EXPECT_EQ(test::ReadFile(home_.Home() + "Config/generator.dat"), Counter(1));

  unsetenv("MORVIL_HOME");  // restored by the configured home
  EXPECT_EQ(RaisedText<CSTDFUNException>([&] { SLGetTempFileName(defs_, false, 1); }),
            "Home path is not set (Module:STDFUN,Method:SLGetTempFileName)");
}

TEST_F(TempNamesTest, AFailedCounterWriteIsReported) {
  fs::create_symlink("/dev/full", Generator());  // reads zeros, takes no byte
  EXPECT_EQ(RaisedChain<CSTDFUNException>([&] { SLGetTempFileName(defs_, true, 1); }),
            (std::vector<std::string>{
                "Error writing to generator.dat (Module:STDFUN,Method:SLGetTempFileName)",
                "Error writing to file (Module:WinFile,Method:WriteToFile)"}));
}

TEST_F(TempNamesTest, WorkFilesAreCreatedExclusivelyWithAUsableExtension) {
  const std::string work = GroupFolder() + "WorkData/";
  test::WriteFile(work + "tmpxxxx_5_1.tmp", "taken");
  const std::string first = SLGetTempWorkFilePath(defs_, 5);
  EXPECT_EQ(first, work + "tmpxxxx_5_2.tmp");  // the taken name is skipped
  EXPECT_TRUE(fs::exists(first));
  EXPECT_EQ(test::ReadFile(work + "tmpxxxx_5_1.tmp"), "taken");
  EXPECT_EQ(SLGetTempWorkFilePath(defs_, 5, "http://host/docs/Report.PDF?x=a.exe#p.js"),
            work + "tmpxxxx_5_3.PDF");

  const std::pair<std::string, std::string> extensions[] = {
      {"C:\\docs\\letter.doc", ".doc"}, {"x.abcdefghijklmnop", ".abcdefghijklmnop"},
      {"x.abcdefghijklmnopq", ".tmp"}, {"dir.d/noext", ".tmp"}, {"evil.a;rm", ".tmp"}};
  for (const auto& [source, extension] : extensions) {
    EXPECT_EQ(TempWorkFileExtension(source), extension) << source;
  }
}

TEST_F(TempNamesTest, AFullWorkFolderOrAMissingOneIsReported) {
  const std::string work = GroupFolder() + "WorkData/";
  for (int i = 1; i <= 10000; ++i) {
    std::ofstream(work + "tmpxxxx_9_" + std::to_string(i) + ".tmp");
  }
  EXPECT_EQ(RaisedText<CSTDFUNException>([&] { SLGetTempWorkFilePath(defs_, 9); }),
            "No available temp file. Please clear the work data folder. "
            "(Module:STDFUN,Method:SLGetTempWorkFilePath)");

  fs::remove_all(work);  // the counter went to 9,999 above
  EXPECT_EQ(RaisedText<CSTDFUNException>([&] { SLGetTempWorkFilePath(defs_, 9); }),
            "Access denied or disk full. Could not open or create file: " + work +
                "tmpxxxx_9_10000.tmp. If you are running this component from a web server, the "
                "Internet user must have write access to the Quillmere Search data directory. "
                "(Module:STDFUN,Method:SLGetTempWorkFilePath)");
}

TEST_F(TempNamesTest, ConcurrentProcessesGetDistinctNames) {
  constexpr int kProcesses = 4;
  constexpr int kNames = 250;
  std::vector<std::string> outputs(kProcesses);
  std::vector<int> statuses(kProcesses, -1);
  std::vector<std::thread> threads;
  for (int p = 0; p < kProcesses; ++p) {
    threads.emplace_back([&, p] {
      // The same caller number everywhere: only the counter tells names apart.
      statuses[p] = test::RunProgram({test::HelperPath("temp_name_taker"), home_.Data(), "public",
                                      "1", std::to_string(kNames)},
                                     &outputs[p]);
    });
  }
  for (auto& t : threads) t.join();
  std::set<std::string> names;
  for (int p = 0; p < kProcesses; ++p) {
    EXPECT_EQ(statuses[p], 0);
    std::istringstream lines(outputs[p]);
    for (std::string line; std::getline(lines, line);) names.insert(line);
  }
  EXPECT_EQ(names.size(), static_cast<std::size_t>(kProcesses * kNames));
  EXPECT_EQ(test::ReadFile(Generator()), Counter(kProcesses * kNames));
}

}  // namespace
}  // namespace qm
