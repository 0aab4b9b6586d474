// Text values of type 2 orders as they are compared: case folded on request,
// ignore characters trimmed from both ends only, whole characters at a time.
#include "index/order_text.h"

#include <gtest/gtest.h>

#include "platform/text_encoding.h"

namespace qm {
namespace {

std::string Narrow(const OrderTextPreparation& p, std::string text) {
  p.Prepare(text);
  return text;
}

std::u16string Wide(const OrderTextPreparation& p, std::u16string text) {
  p.Prepare(text);
  return text;
}

TEST(OrderTextTest, IgnoreCharactersGoFromBothEndsOnlyAndFollowTheCase) {
  const OrderTextPreparation folded(1, u"-x");
  EXPECT_EQ(Narrow(folded, "-abc"), "ABC");
  EXPECT_EQ(Narrow(folded, "ABC-"), "ABC");
  EXPECT_EQ(Narrow(folded, "a-bc"), "A-BC");
  EXPECT_EQ(Narrow(folded, "x-Xax-"), "A");  // the ignore characters are folded too
  EXPECT_EQ(Narrow(folded, "--"), "");
  EXPECT_EQ(Wide(folded, u"-x\u00e9t\u00e9X-"), u"\u00c9T\u00c9");

  const OrderTextPreparation cased(0, u"-x");
  EXPECT_EQ(Narrow(cased, "X-abc-x"), "X-abc");
  EXPECT_EQ(Narrow(OrderTextPreparation(0, u""), " Keep  "), " Keep  ");
}

TEST(OrderTextTest, CharactersBeyondOneByteOrOneUnitAreTrimmedWhole) {
  // « and » take two UTF-8 bytes; the clef takes four bytes and two UTF-16 units.
  const OrderTextPreparation p(0, u"\u00ab\u00bb\U0001D11E");
  EXPECT_EQ(Narrow(p, "\u00ab\U0001D11Eword\u00bb\U0001D11E"), "word");
  EXPECT_EQ(Narrow(p, "\u00e9\u00ab"), "\u00e9");  // é shares no byte pattern with «
  EXPECT_EQ(Wide(p, u"\U0001D11E\u00abword\U0001D11E"), u"word");
  EXPECT_EQ(Wide(p, u"word\U0001D11F"), u"word\U0001D11F");  // same high surrogate, other character
  // A broken sequence at the end is kept, not mistaken for an ignored character.
  EXPECT_EQ(Narrow(p, std::string("ab\xC2")), std::string("ab\xC2"));
}

}  // namespace
}  // namespace qm
