// Recovering from damage and from killed builds through the command object:
// damaged findexes and orders are dropped and rebuilt, the temporaries of a
// killed build go with the next build or drop, and the order check finds
// what is broken in an order's files.
#include <gtest/gtest.h>

#include <csignal>
#include <filesystem>
#include <functional>
#include <string>
#include <vector>

#include "base/byte_layout.h"
#include "index/order_check.h"
#include "platform/file_io.h"
#include "support/data_source_fixture.h"
#include "support/file_test_util.h"

namespace qm {
namespace {

namespace fs = std::filesystem;
using test::Source;

class DamagedFilesTest : public test::DataSourceTest {
 protected:
  void SetUp() override {
    DataSourceTest::SetUp();
    books_ = Table("books", "id integer, title varchar(40), year integer",
                   {"1, 'River fish', 1990", "2, 'Mountain', 1985", "3, 'Quiet lake', 1990",
                    "4, 'River', 2001"});
  }

  std::string Orders() const { return GroupFolder() + "Orders/"; }
  bool There(const std::string& path) const { return platform::FileExists(path); }
  std::string CreateFindex() {
    return Run("CREATE FINDEX Books ON TABLE " + books_ + " COLUMNS title KEY id");
  }
  std::string CreateOrder() {
    return Run("CREATE ORDER Titles ON TABLE " + books_ + " COLUMNS title,year KEY id");
  }
  std::vector<std::string> CheckTitles() {
    CGlobalDefs defs = Defs();
    return CheckOrderFiles(defs, "Titles");
  }

  std::string books_;
};

TEST_P(DamagedFilesTest, DamagedFindexesAndOrdersAreDroppedOrRebuiltFromTheirHeaders) {
  struct Case {
    const char* damage;
    bool findex;
    std::function<void()> apply;
    bool rebuilds;  // the header still holds the definition
  };
  const std::vector<Case> cases = {
      {"truncated .sdx", true,
       [this] { fs::resize_file(IndexFolder() + "BOOKS.sdx", 4096 + 100); }, true},
      {".sdx cut inside its header", true,
       [this] { fs::resize_file(IndexFolder() + "BOOKS.sdx", 100); }, false},
      {"missing .fst", true, [this] { fs::remove(IndexFolder() + "BOOKS.fst"); }, true},
      {"damaged .sri", false,
       [this] { test::WriteFile(Orders() + "TITLES.sri", std::string(4096, '\x55')); },
       false},
      {"missing .col", false, [this] { fs::remove(Orders() + "TITLES_YEAR.col"); }, true},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.damage);
    ASSERT_EQ(c.findex ? CreateFindex() : CreateOrder(), "");
    c.apply();
    const std::string rebuild = c.findex ? "UPDATE FINDEX Books REBUILD" : "UPDATE ORDER Titles REBUILD";
    if (c.rebuilds) {
      EXPECT_EQ(Run(rebuild), "");
      if (!c.findex) {
        EXPECT_EQ(CheckTitles(), std::vector<std::string>{});
      }
      c.apply();
    } else {
      EXPECT_NE(Run(rebuild).find("cannot be read from its header: drop it and create it again"),
                std::string::npos);
    }
    EXPECT_EQ(Run(c.findex ? "DROP FINDEX Books" : "DROP ORDER Titles"), "");
    for (const char* file : {"BOOKS.sdx", "BOOKS.fst"}) EXPECT_FALSE(There(IndexFolder() + file));
    for (const char* file : {"TITLES.sri", "TITLES.srt", "TITLES_TITLE.col", "TITLES_YEAR.col"}) {
      EXPECT_FALSE(There(Orders() + file)) << file;
    }
  }
  EXPECT_TRUE(test::Has(test::TraceOf(home_, "PILIB"), "Dropped file " + Orders() + "TITLES_TITLE.col"));
  // A name without any file is still an error.
  EXPECT_NE(Run("DROP FINDEX Books"), "");
  EXPECT_NE(Run("DROP ORDER Titles"), "");
}

TEST_P(DamagedFilesTest, AKilledBuildsTemporariesGoWithTheNextBuildOrDrop) {
  const std::vector<std::string> findex_leftovers = {IndexFolder() + "tmpxxxx_5_41.tmp1",
                                                     IndexFolder() + "tmpxxxx_5_41.tmp2"};
  const std::vector<std::string> order_leftovers = {Orders() + "tmpxxxx_6_42.sri.tmp",
                                                    Orders() + "tmpxxxx_6_42_1.tmp"};
  std::vector<std::string> argv{test::HelperPath("killed_temp_writer")};
  argv.insert(argv.end(), findex_leftovers.begin(), findex_leftovers.end());
  argv.insert(argv.end(), order_leftovers.begin(), order_leftovers.end());
  ASSERT_EQ(test::RunProgram(argv), 128 + SIGKILL);

  ASSERT_EQ(CreateFindex(), "");
  for (const std::string& path : findex_leftovers) EXPECT_FALSE(There(path)) << path;
  for (const std::string& path : order_leftovers) EXPECT_TRUE(There(path)) << path;
  ASSERT_EQ(CreateOrder(), "");
  ASSERT_EQ(test::RunProgram(argv), 128 + SIGKILL);
  EXPECT_EQ(Run("DROP ORDER Titles"), "");
  for (const std::string& path : order_leftovers) EXPECT_FALSE(There(path)) << path;
  EXPECT_TRUE(test::Has(test::TraceOf(home_, "PILIB"),
                        "Removed temporary file of a killed build: " + order_leftovers[0]));
}

TEST_P(DamagedFilesTest, TheOrderCheckFindsEachKindOfDamage) {
  ASSERT_EQ(CreateOrder(), "");
  EXPECT_EQ(CheckTitles(), std::vector<std::string>{});
  const std::string srt = Orders() + "TITLES.srt";
  auto int32 = [](int32_t v) {
    std::string b(4, '\0');
    bytes::StoreI32(reinterpret_cast<uint8_t*>(b.data()), v);
    return b;
  };
  // Rows of key, title rank, year rank: 12 bytes each after the count.
  struct Case {
    const char* damage;
    std::function<void(std::string& srt_bytes)> apply;
    const char* found;
  };
  const std::vector<Case> cases = {
      {"truncated rows", [](std::string& b) { b.resize(b.size() - 6); },
       "TITLES.srt: 46 bytes, but 4 rows of 3 integers take 52"},
      {"keys out of order", [&](std::string& b) { b.replace(4 + 12, 4, int32(9)); },
       "TITLES.srt row 3: keys out of order (key 3 after 9)"},
      {"rank past the values", [&](std::string& b) { b.replace(4 + 8, 4, int32(7)); },
       "TITLES.srt row 1: rank 7 of column year is not among its 3 values"},
      {"rank of another value", [&](std::string& b) { b.replace(4 + 4, 4, int32(0)); },
       "TITLES_TITLE.col value 4: key 1 has rank 0 in TITLES.srt"},
  };
  const std::string sound = test::ReadFile(srt);
  for (const Case& c : cases) {
    SCOPED_TRACE(c.damage);
    std::string bytes = sound;
    c.apply(bytes);
    test::WriteFile(srt, bytes);
    const std::vector<std::string> problems = CheckTitles();
    bool found = false;
    for (const std::string& p : problems) found = found || p.find(c.found) != std::string::npos;
    EXPECT_TRUE(found) << ::testing::PrintToString(problems);
  }
  test::WriteFile(srt, sound);
  fs::remove(Orders() + "TITLES_YEAR.col");
  EXPECT_EQ(CheckTitles(), std::vector<std::string>{"TITLES_YEAR.col: missing"});
}

INSTANTIATE_TEST_SUITE_P(Sources, DamagedFilesTest, ::testing::Values(Source::SQLite),
                         test::SourceName);

}  // namespace
}  // namespace qm
