// Temporary files of builds: a killed build's files are removed by the next
// sweep, a live build's never, and nothing else in the folder is touched.
#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <optional>
#include <string>
#include <vector>

#include "config/temp_file_claim.h"
#include "config/temp_file_sweep.h"
#include "platform/file_io.h"
#include "support/test_support.h"

namespace qm {
namespace {

class TempFileSweepTest : public ::testing::Test {
 protected:
  std::string Path(const std::string& name) const { return dir_.Path() + name; }
  bool Exists(const std::string& name) const { return platform::FileExists(Path(name)); }

  test::ScratchDir dir_{"temp-sweep"};
};

TEST_F(TempFileSweepTest, AKilledBuildsFilesGoALiveBuildsAndOtherFilesStay) {
  // What a killed findex build, order build and deleted-key replace leave.
  const std::vector<std::string> killed = {"tmpxxxx_5_7.tmp1",     "tmpxxxx_5_7.tmp2",
                                           "tmpxxxx_6_8.sri.tmp",  "tmpxxxx_6_8_1.tmp",
                                           "tmpxxxx_5_6.tmp1.old", "tmpAb12Cd"};
  std::vector<std::string> argv{test::HelperPath("killed_temp_writer")};
  for (const std::string& name : killed) argv.push_back(Path(name));
  ASSERT_EQ(test::RunProgram(argv), 128 + SIGKILL);
  for (const std::string& name : killed) ASSERT_TRUE(Exists(name)) << name;

  // A build still running holds its files; the others are no temporaries.
  std::optional<TempFileClaim> live = TempFileClaim::Create(Path("tmpxxxx_5_9.tmp1"));
  ASSERT_TRUE(live);
  const std::vector<std::string> kept = {"tmpxxxx_5_9.tmp1", "BOOKS.sdx", "BOOKS.del",
                                         "tmp12.tmp", "tmpAb12Cde", "TITLES_TMPXXXX_1.col"};
  for (const std::string& name : kept) {
    if (!Exists(name)) test::WriteFile(Path(name), "data");
  }

  std::vector<std::string> removed = SweepOrphanedTempFiles(dir_.Path());
  std::vector<std::string> expected;
  for (const std::string& name : killed) expected.push_back(Path(name));
  std::sort(removed.begin(), removed.end());
  std::sort(expected.begin(), expected.end());
  EXPECT_EQ(removed, expected);
  for (const std::string& name : kept) EXPECT_TRUE(Exists(name)) << name;

  // Once its build ends (or dies), the file is an orphan too.
  live->Release();
  EXPECT_EQ(SweepOrphanedTempFiles(dir_.Path()),
            std::vector<std::string>{Path("tmpxxxx_5_9.tmp1")});
}

TEST_F(TempFileSweepTest, AClaimFollowsItsFileThroughARenameAndNamesAreNotShared) {
  std::optional<TempFileClaim> claim = TempFileClaim::Create(Path("tmpxxxx_5_1.tmp1"));
  ASSERT_TRUE(claim);
  // The name is taken: a second build must choose another.
  errno = 0;
  EXPECT_FALSE(TempFileClaim::Create(Path("tmpxxxx_5_1.tmp1")));
  EXPECT_EQ(errno, EEXIST);
  // Set aside under another temporary name, the file is still held.
  ASSERT_EQ(platform::RenameFile(Path("tmpxxxx_5_1.tmp1"), Path("tmpxxxx_5_2.tmp1.old")), 0);
  EXPECT_TRUE(SweepOrphanedTempFiles(dir_.Path()).empty());
  EXPECT_TRUE(Exists("tmpxxxx_5_2.tmp1.old"));
}

}  // namespace
}  // namespace qm
