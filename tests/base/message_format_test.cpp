#include "base/message_format.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>
#include <string>

#include "base/cstr.h"
#include "base/cwstr.h"

namespace qm {
namespace {

TEST(MessageFormat, EachDirectiveTakesTheNextArgumentByItsOwnType) {
  const std::string narrow = "n\xC3\xA9";
  const std::u16string wide = u"w\u00E9";
  // Either string directive renders either width: the argument decides.
  EXPECT_EQ(FormatWide(u"%s|%S|%i|%d|%%", 100, narrow, wide, -7, 42), u"n\u00E9|w\u00E9|-7|42|%");
  EXPECT_EQ(FormatNarrow("%S|%s|%d|%i", 100, wide, narrow, 0, 3), "w\xC3\xA9|n\xC3\xA9|0|3");
  EXPECT_EQ(FormatNarrow("[%s]", 100, static_cast<const char*>(nullptr)), "[]");
  EXPECT_EQ(FormatNarrow("%i %i", 100, std::numeric_limits<uint64_t>::max(),
                         std::numeric_limits<int64_t>::min()),
            "18446744073709551615 -9223372036854775808");
}

TEST(MessageFormat, DirectivesWithoutArgumentAndArgumentTextsStayLiteral) {
  EXPECT_EQ(FormatNarrow("%s and %i and %d", 100, "x"), "x and %i and %d");
  // Unknown directives, a trailing "%" and an escaped "%s" consume nothing.
  EXPECT_EQ(FormatNarrow("%x %n %5s %%s %s %", 100, "A"), "%x %n %5s %s A %");
  // Arguments are never read as directives; invalid narrow text is replaced in wide text.
  EXPECT_EQ(FormatNarrow("%s-%i", 100, "%s%n%i", 5), "%s%n%i-5");
  EXPECT_EQ(FormatWide(u"%S-%i", 100, std::string("%%"), 5), u"%%-5");
  EXPECT_EQ(FormatWide(u"<%S>", 100, std::string("a\xFF")), u"<a\uFFFD>");
}

TEST(MessageFormat, CutsAtTheLimitOnACharacterBoundary) {
  // A surrogate pair that would straddle unit 2,047 is dropped whole.
  const std::u16string wide_filler(kMaxExceptionText - 1, u'x');
  const std::u16string wide = FormatWide(u"%s%s", kMaxExceptionText, wide_filler, u"\U0001F600");
  EXPECT_EQ(wide, wide_filler);
  EXPECT_EQ(FormatWide(u"%s", kMaxExceptionText, std::u16string(5000, u'y')).size(),
            kMaxExceptionText);
  // A three-byte character that would straddle byte 1,023 is dropped whole.
  const std::string narrow_filler(kMaxTraceMessage - 2, 'x');
  EXPECT_EQ(FormatNarrow("%s\xE2\x82\xAC", kMaxTraceMessage, narrow_filler), narrow_filler);
  EXPECT_EQ(FormatNarrow("%s", kMaxTraceMessage, std::string(5000, 'y')).size(), kMaxTraceMessage);
}

}  // namespace
}  // namespace qm
