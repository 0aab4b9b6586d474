// Random and malformed input for the parsers of the core: they must never
// crash or loop, and fail only with exceptions of the family.
#include <gtest/gtest.h>

#include <random>
#include <string>
#include <string_view>

#include "platform/text_encoding.h"
#include "base/error_messages.h"
#include "base/exception_family.h"
#include "base/tokenizer.h"
#include "base/value.h"

namespace qm {
namespace {

constexpr int kRounds = 2000;

class Random {
 public:
  explicit Random(unsigned seed) : engine_(seed) {}
  std::size_t Below(std::size_t n) { return std::uniform_int_distribution<std::size_t>(0, n - 1)(engine_); }
  bool OneIn(std::size_t n) { return Below(n) == 0; }
  // Text drawn from an alphabet, with an occasional arbitrary byte.
  std::string Text(std::string_view alphabet, std::size_t max_length) {
    std::string s(Below(max_length + 1), ' ');
    for (auto& c : s) c = OneIn(16) ? static_cast<char>(Below(256)) : alphabet[Below(alphabet.size())];
    return s;
  }

 private:
  std::mt19937 engine_;
};

TEST(MalformedInput, TokenizersAlwaysProgress) {
  Random rnd(1);
  const std::string_view alphabet = "ab ,;\"#\t\xC3\xA9";
  for (int round = 0; round < kRounds; ++round) {
    const std::string original = rnd.Text(alphabet, 40);
    const char delimiter = alphabet[rnd.Below(alphabet.size())];
    std::string source = original;
    std::string token;
    std::size_t calls = 0;
    while (GetToken(source, token, delimiter, rnd.OneIn(2))) {
      ASSERT_LT(source.size(), original.size());
      ASSERT_LE(++calls, original.size());
    }
    EXPECT_TRUE(token.empty());

    std::string by_set = original;
    const std::string set = rnd.Text(" ,;\"", 3);
    for (std::size_t guard = 0;; ++guard) {
      ASSERT_LE(guard, original.size() + 1);
      const std::size_t before = by_set.size();
      const int delim = GetTokenBySet(by_set, token, set);
      EXPECT_EQ(token.find_first_of(set), std::string::npos);
      if (delim == -1) {
        EXPECT_TRUE(by_set.empty());
        break;
      }
      EXPECT_NE(set.find(static_cast<char>(delim)), std::string::npos);
      ASSERT_LT(by_set.size(), before);
    }

  }
}

TEST(MalformedInput, DateTextEitherParsesInRangeOrRaisesValueError) {
  Random rnd(3);
  for (int round = 0; round < kRounds; ++round) {
    const std::string text = rnd.Text("0123456789/-: .APMapmx", 24);
    const bool upper = rnd.OneIn(2);
    CValue v;
    try {
      v.SetDateFromText(text, upper);
    } catch (const CValueException& e) {
      EXPECT_EQ(Utf16ToUtf8(e.GetEntries().at(0).text).rfind("Invalid date or time: ", 0), 0u);
      continue;
    }
    const DateTimeValue& d = v.GetDateTime();
    EXPECT_EQ(v.GetType(), VALUE_TYPE::DateTime);
    EXPECT_LE(d.month, 12) << text;
    EXPECT_LE(d.day, 31) << text;
    EXPECT_TRUE(d.hour <= 23 || (upper && d.hour == 25)) << text;
    EXPECT_TRUE(d.minute <= 59 || (upper && d.minute == 61)) << text;
    EXPECT_TRUE(d.second <= 59 || (upper && d.second == 61)) << text;
  }
}

TEST(MalformedInput, ErrorMessageFilesOnlyYieldWellFormedEntries) {
  Random rnd(6);
  const char16_t* pieces[] = {u"[ERROR MESSAGES]", u"[END]", u",", u",", u"\r\n", u"\n", u"\r",
                              u"0",  u"7", u"-1", u"99999999999", u"text", u" ", u"\xD800",
                              u"\U0001F600"};
  for (int round = 0; round < kRounds; ++round) {
    std::string bytes;
    if (rnd.OneIn(4)) {
      bytes = rnd.Text("\xFF\xFE,0\r\n[]", 200);
    } else {
      std::u16string text = rnd.OneIn(2) ? u"[ERROR MESSAGES]\r\n" : u"";
      for (std::size_t i = rnd.Below(60); i > 0; --i) text += pieces[rnd.Below(std::size(pieces))];
      bytes = "\xFF\xFE";
      for (char16_t c : text) {
        bytes.push_back(static_cast<char>(c & 0xFF));
        bytes.push_back(static_cast<char>(c >> 8));
      }
      if (rnd.OneIn(5)) bytes.pop_back();
    }
    for (const auto& [number, entry] : ParseErrorMessages(bytes)) {
      EXPECT_EQ(entry.number, number);
      EXPECT_NE(entry.number, 0);
      EXPECT_NE(entry.level, 0);
      EXPECT_FALSE(entry.text.empty());
      EXPECT_LE(entry.text.size(), 2047u);
      EXPECT_EQ(entry.text.find_first_of(u"\r\n"), std::u16string::npos);
    }
  }
}

}  // namespace
}  // namespace qm
