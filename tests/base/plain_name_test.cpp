// Names that become file and lock names: what is refused and how it is shown.
#include "base/plain_name.h"

#include <gtest/gtest.h>

#include <string>

#include "base/exception_family.h"

namespace qm {
namespace {

TEST(PlainName, AcceptsOrdinaryNamesUpToTheLimitAndRefusesTheRest) {
  for (const std::string& name :
       {std::string("x.y"), std::string("with space"), std::string(199, 'n'), std::string("...")}) {
    EXPECT_TRUE(IsPlainName(name)) << name;
  }
  // 199 two-byte characters are 398 bytes but still 199 characters.
  std::string accented;
  for (int i = 0; i < 199; ++i) accented += "\xC3\xA9";
  EXPECT_TRUE(IsPlainName(accented));
  EXPECT_FALSE(IsPlainName(accented + "e"));
  // Refused: whatever could leave its folder, control characters and over-long names.
  for (const std::string& name :
       {std::string(), std::string(".."), std::string("../x"), std::string("a\\b"), std::string("tab\there"),
        std::string("nul\0x", 5), std::string("c1\xC2\x85"), std::string(200, 'n')}) {
    EXPECT_FALSE(IsPlainName(name)) << ShowName(name);
  }
}

TEST(PlainName, RefusalNamesTheKindTheNameAndTheReason) {
  try {
    RequirePlainName<CPiStartPointException>("findex", "..", "ExecuteW");
    FAIL() << "not refused";
  } catch (const CPiStartPointException& e) {
    EXPECT_EQ(e.GetFullTextUtf8(100),
              "Invalid findex name \"..\": a name must not be \".\" or \"..\" "
              "(Module:PiStartPoint,Method:ExecuteW)\r\n");
  }
  EXPECT_EQ(ShowName(std::string("a\x01") + "b\xC2\x9F"), "a\\x01b\\x9F");
  EXPECT_EQ(ShowName(std::string(70, 'x')), std::string(60, 'x') + "...");
  EXPECT_NO_THROW(RequirePlainName<CPiStartPointException>("group", "PUBLIC", "SetGroup"));
}

}  // namespace
}  // namespace qm
