// UTF-8 and UTF-16 conversion, cuts on character boundaries and simple case
// mapping.
#include "platform/text_encoding.h"

#include <gtest/gtest.h>

#include <string>

namespace qm {
namespace {

const std::u16string kFffd(1, u'\xFFFD');
const std::string kFffd8 = "\xEF\xBF\xBD";

TEST(Utf8Utf16, ValidTextRoundTripsAndInvalidTextBecomesReplacement) {
  // 1-, 2-, 3- and 4-byte sequences; the last is a surrogate pair in UTF-16.
  const std::string utf8 = "a\xC3\xA9\xE2\x82\xAC\xF0\x9F\x98\x80z";
  const std::u16string utf16 = u"a\u00E9\u20AC\U0001F600z";
  EXPECT_EQ(Utf8ToUtf16(utf8), utf16);
  EXPECT_EQ(Utf16ToUtf8(utf16), utf8);
  const std::pair<std::string, std::u16string> invalid[] = {
      {"\x80", kFffd},                         // stray continuation
      {"a\xE2\x82", u"a" + kFffd},             // sequence cut by the end
      {"\xC0\xAF", kFffd},                     // overlong "/"
      {"\xED\xA0\x80", kFffd},                 // encoded surrogate
      {"\xF4\x90\x80\x80", kFffd},             // above U+10FFFF
  };
  for (const auto& [in, out] : invalid) EXPECT_EQ(Utf8ToUtf16(in), out) << in;
  // Lone surrogates in UTF-16.
  EXPECT_EQ(Utf16ToUtf8(std::u16string(u"\xD800x")), kFffd8 + "x");
  EXPECT_EQ(Utf16ToUtf8(std::u16string(u"\xDC00\xD800")), kFffd8 + kFffd8);
  // Encoders refuse values that are no character; decoding at the end does not move.
  std::string narrow;
  EncodeUtf8(0x110000, narrow);
  EncodeUtf8(0xD801, narrow);
  EXPECT_EQ(narrow, kFffd8 + kFffd8);
  std::u16string wide;
  EncodeUtf16(0xDFFF, wide);
  EncodeUtf16(0x7FFFFFFF, wide);
  EXPECT_EQ(wide, kFffd + kFffd);
  std::size_t pos = 1;
  EXPECT_EQ(DecodeUtf8("a", pos), char32_t{0xFFFD});
  EXPECT_EQ(pos, 1u);
}

TEST(Utf8Utf16, AsciiRunsOfEveryLengthAroundOtherSequencesConvertAsCodePoints) {
  // Runs of ASCII shorter and longer than eight bytes, with a sequence of
  // every length (and an invalid byte) at every place, appended to text
  // already there: the same as converting code point by code point.
  const std::string others[] = {"\xC3\xA9", "\xE2\x82\xAC", "\xF0\x9F\x98\x80", "\xFF", "\xE2\x82"};
  for (const std::string& other : others) {
    for (std::size_t before = 0; before <= 17; ++before) {
      for (std::size_t after = 0; after <= 9; after += 3) {
        std::string text;
        for (std::size_t i = 0; i < before; ++i) text += static_cast<char>('!' + i * 5 % 90);
        text += other;
        text += std::string(after, '~') + "\x7F";
        std::u16string expected = u"kept";
        for (std::size_t pos = 0; pos < text.size();) EncodeUtf16(DecodeUtf8(text, pos), expected);
        std::u16string got = u"kept";
        AppendUtf8AsUtf16(text, got);
        EXPECT_EQ(got, expected) << before << " " << after;
      }
    }
  }
}

TEST(CutLength, CutsNeverSplitACharacter) {
  const std::string text = "a\xC3\xA9\xE2\x82\xAC\xF0\x9F\x98\x80";  // a é € 😀
  // Cut points inside a character fall back to its start.
  const std::size_t expected[] = {0, 1, 1, 3, 3, 3, 6, 6, 6, 6, 10};
  for (std::size_t max = 0; max <= text.size(); ++max) EXPECT_EQ(Utf8CutLength(text, max), expected[max]) << max;
  EXPECT_EQ(Utf8CutLength(text, 100), text.size());
  // Bytes that belong to no character are no reason to throw the text away.
  EXPECT_EQ(Utf8CutLength(std::string(50, '\x80'), 20), 20u);

  const std::u16string wide = u"a\U0001F600b";
  const std::size_t wide_expected[] = {0, 1, 1, 3, 4};
  for (std::size_t max = 0; max <= 4; ++max) EXPECT_EQ(Utf16CutLength(wide, max), wide_expected[max]) << max;
  // A lone high surrogate is no pair: it is cut like any unit.
  EXPECT_EQ(Utf16CutLength(std::u16string(u"ab\xD800\xD800"), 3), 3u);
}

TEST(CaseMapping, SimpleMappingPerCodePoint) {
  // Sharp s has no single-character upper case, so simple mapping keeps it.
  EXPECT_EQ(ToUpper(std::u16string_view(u"stra\u00DFe")), u"STRA\u00DFE");
  EXPECT_EQ(ToUpper(std::string_view("stra\xC3\x9F" "e")), "STRA\xC3\x9F" "E");
  EXPECT_EQ(ToLower(std::u16string_view(u"\u00C4\u00D6\u00DCX")), u"\u00E4\u00F6\u00FCx");
  // No locale tailoring: "i" is "I" whatever LANG says; final sigma is plain sigma.
  EXPECT_EQ(ToUpper(std::u16string_view(u"i\u03C2")), u"I\u03A3");
  EXPECT_EQ(ToLower(std::u16string_view(u"\u03A3")), u"\u03C3");
  // Supplementary letters (Deseret) map too.
  EXPECT_EQ(ToUpper(std::u16string_view(u"\U00010428")), u"\U00010400");
  EXPECT_EQ(AsciiUpper("stra\xC3\x9F" "e"), "STRA\xC3\x9F" "E");
  // Invalid UTF-8 is replaced, not looped on.
  EXPECT_EQ(ToUpper(std::string_view("a\x80" "b")), "A" + kFffd8 + "B");

  const std::u16string text = u"abc \u00E9t\u00E9 \U00010428x \xD800 stra\u00DFe \u0131";
  std::u16string in_place = text;
  ToUpperInPlace(in_place);
  EXPECT_EQ(in_place, ToUpper(std::u16string_view(text)));
  EXPECT_EQ(in_place.size(), text.size());
}

}  // namespace
}  // namespace qm
