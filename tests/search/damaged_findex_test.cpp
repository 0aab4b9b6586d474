// Findex files damaged after their build (cut short, bytes overwritten, counts
// and links that point nowhere): every lookup either answers or raises an error
// naming the findex; none crashes, hangs or sizes a read by a bad count.
#include <gtest/gtest.h>

#include <cstdint>
#include <filesystem>
#include <random>
#include <string>
#include <vector>

#include "base/byte_layout.h"
#include "search/findex_check.h"
#include "search/lookup_fixture.h"

namespace qm {
namespace {

using namespace compare_flags;

constexpr std::size_t kBlock = 4096;

class DamagedFindexTest : public test::LookupFixture {
 protected:
  void SetUp() override {
    test::LookupFixture::SetUp();
    std::vector<std::string> rows;
    for (int id = 1; id <= 1500; ++id) {
      rows.push_back(std::to_string(id) + ", 'word" + std::to_string(id) + " common'");
    }
    Build("LkSound", "varchar(40)", rows);
    sdx_ = test::ReadFile(IndexFolder() + "LKSOUND.sdx");
    fst_ = test::ReadFile(IndexFolder() + "LKSOUND.fst");
    ASSERT_GT(sdx_.size(), 6 * kBlock) << "several leaves";
  }

  // Writes a damaged copy under name; returns it.
  std::string Copy(const std::string& name, const std::string& sdx, const std::string& fst) {
    test::WriteFile(IndexFolder() + name + ".sdx", sdx);
    test::WriteFile(IndexFolder() + name + ".fst", fst);
    return name;
  }

  static int32_t IntAt(const std::string& bytes, std::size_t at) {
    return bytes::LoadI32(reinterpret_cast<const uint8_t*>(bytes.data() + at));
  }
  static void PutInt(std::string& bytes, std::size_t at, int32_t v) {
    bytes::StoreI32(reinterpret_cast<uint8_t*>(bytes.data() + at), v);
  }
  // The first leaf: the leading child of the root, then of each node below it.
  int32_t FirstLeaf() const {
    int32_t block = 1;
    for (int level = 0; level < 3; ++level) block = IntAt(sdx_, block * kBlock + 6);
    return block;
  }

  // Every kind of lookup on name; the errors met, as texts.
  std::vector<std::string> Errors(const std::string& name) {
    std::vector<std::string> errors;
    struct Probe {
      std::u16string word;
      int32_t flags;
    };
    for (const Probe& p : std::vector<Probe>{{u"WORD700", 0},
                                             {u"COMMON", 0},
                                             {u"WORD7*", 0},
                                             {u"*9", 0},
                                             {u"WORD5", kGreater},
                                             {u"WORD5", kLess | kEqual},
                                             {u"WORD12", kSimilarDistance}}) {
      const test::Found found = Text(name, p.word, p.flags);
      if (!found.error.empty()) errors.push_back(found.error);
    }
    return errors;
  }

  void ExpectEveryLookupFailsNaming(const std::string& name, const std::string& what) {
    const std::vector<std::string> errors = Errors(name);
    EXPECT_EQ(errors.size(), 7u) << what;
    for (const std::string& e : errors) {
      EXPECT_NE(e.find(name), std::string::npos) << what << ": " << e;
    }
  }

  std::string sdx_;
  std::string fst_;
};

TEST_F(DamagedFindexTest, CutFilesBadCountsAndStrayLinksAreErrorsNamingTheFindex) {
  ASSERT_EQ(Errors("LkSound"), std::vector<std::string>{}) << "the sound copy answers";

  struct DamageCase {
    std::string name;
    std::string sdx;
    std::string fst;
    bool every_lookup;  // every probe must fail (else at least one)
  };
  std::vector<DamageCase> cases;
  // The item file cut in half: leaf positions run past its end.
  cases.push_back({"DMG_FST_CUT", sdx_, fst_.substr(0, fst_.size() / 2), false});
  // The word tree cut to three blocks: the header counts more.
  cases.push_back({"DMG_SDX_CUT", sdx_.substr(0, 3 * kBlock), fst_, true});
  {  // The root's first child far outside the file.
    std::string sdx = sdx_;
    PutInt(sdx, kBlock + 6, 60000);
    cases.push_back({"DMG_CHILD", sdx, fst_, false});
  }
  {  // Every count row claims two billion rows.
    std::string fst = fst_;
    for (std::size_t at = 0; at + 8 <= fst.size();) {
      const int32_t count = IntAt(fst, at);
      PutInt(fst, at, 0x7FFFFFFF);
      at += static_cast<std::size_t>(count) * 8;
      if (count <= 0) break;
    }
    cases.push_back({"DMG_COUNT", sdx_, fst, true});
  }
  {  // The first leaf links to itself: a walk would go round for ever.
    std::string sdx = sdx_;
    const int32_t leaf = FirstLeaf();
    sdx[leaf * kBlock + 2] = static_cast<char>(leaf & 0xFF);
    sdx[leaf * kBlock + 3] = static_cast<char>(leaf >> 8);
    cases.push_back({"DMG_LOOP", sdx, fst_, false});
  }
  {  // The first leaf's used count past the block.
    std::string sdx = sdx_;
    PutInt(sdx, static_cast<std::size_t>(FirstLeaf()) * kBlock, 5000);
    cases.push_back({"DMG_USED", sdx, fst_, false});
  }
  for (const DamageCase& c : cases) {
    SCOPED_TRACE(c.name);
    Copy(c.name, c.sdx, c.fst);
    // The check reads what lookups read: what they meet, it reports.
    EXPECT_NE(CheckFindexFiles(defs_, c.name), std::vector<std::string>{});
    if (c.every_lookup) {
      ExpectEveryLookupFailsNaming(c.name, c.name);
    } else {
      const std::vector<std::string> errors = Errors(c.name);
      EXPECT_FALSE(errors.empty());
      for (const std::string& e : errors) EXPECT_NE(e.find(c.name), std::string::npos) << e;
    }
  }
}

TEST_F(DamagedFindexTest, AnItemFileThatShrinksUnderAnOpenFindexIsAShortRead) {
  Copy("DMG_SHRINK", sdx_, fst_);
  CGiFIndex findex(defs_);
  findex.Open("DMG_SHRINK");
  test::WriteFile(IndexFolder() + "DMG_SHRINK.fst", fst_.substr(0, 64));
  CItems items(CColumnSet::FromGeneralFlags(findex.Header().GeneralFlags));
  try {
    findex.GetItems(items, CWordSearch::ForText(u"COMMON", 2), 0, -1, 0, false);
    ADD_FAILURE() << "a short read answered";
  } catch (const CGiFIndexException& e) {
    EXPECT_NE(e.GetFullTextUtf8(kLevelGeneral).find("came back short"), std::string::npos)
        << e.GetFullTextUtf8(kLevelGeneral);
  }
}

TEST_F(DamagedFindexTest, RandomBytesInTreeAndItemBlocksNeverCrashOrHang) {
  std::mt19937 random(20261206);
  int failed = 0;
  int answered = 0;
  for (int trial = 0; trial < 60; ++trial) {
    std::string sdx = sdx_;
    std::string fst = fst_;
    std::string& target = trial % 3 == 2 ? fst : sdx;
    // Block 0 (the header) is left whole on the tree file: its own checks
    // are the header's.
    const std::size_t from = &target == &sdx ? kBlock : 0;
    std::uniform_int_distribution<std::size_t> where(from, target.size() - 1);
    std::uniform_int_distribution<int> byte(0, 255);
    for (int i = 0; i < 24; ++i) target[where(random)] = static_cast<char>(byte(random));
    const std::string name = "DMG_RANDOM_" + std::to_string(trial);
    Copy(name, sdx, fst);
    const std::vector<std::string> errors = Errors(name);
    failed += errors.empty() ? 0 : 1;
    answered += errors.size() < 7 ? 1 : 0;
    if (!errors.empty()) {
      EXPECT_NE(CheckFindexFiles(defs_, name), std::vector<std::string>{}) << errors.front();
    }
    std::filesystem::remove(IndexFolder() + name + ".sdx");
    std::filesystem::remove(IndexFolder() + name + ".fst");
  }
  // Damage that a lookup meets is reported; damage it does not meet is not.
  EXPECT_GT(failed, 0);
  EXPECT_GT(answered, 0);
}

}  // namespace
}  // namespace qm
