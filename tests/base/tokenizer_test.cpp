// The narrow tokenizers, blank trims and quote removal.
#include "base/tokenizer.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support/file_test_util.h"
#include "base/exception_family.h"

namespace qm {
namespace {

using Tokens = std::vector<std::string>;

// Every token GetToken hands out, then "|" and what is left of the source.
Tokens AllTokens(std::string source, char delimiter, bool drop_hash) {
  Tokens tokens;
  std::string token;
  while (GetToken(source, token, delimiter, drop_hash)) tokens.push_back(token);
  EXPECT_EQ(token, "");  // the failing call hands out nothing
  tokens.push_back("|" + source);
  return tokens;
}

TEST(GetToken, DelimitersQuotesAndHashes) {
  struct Case {
    const char* source;
    char delimiter;
    bool drop_hash;
    Tokens expected;
  };
  const Case cases[] = {
      {"a\"\"b,", ',', false, {"a\"b", "|"}},  // a doubled quote gives one quote
      // Leading delimiters are skipped; the last token needs a delimiter after it.
      {",,x,,y,z", ',', false, {"x", "y", "|z"}},
      // Quotes protect delimiters and are kept; an unterminated one swallows the rest.
      {"\"a,b\",c,", ',', false, {"\"a,b\"", "c", "|"}},
      {"\"a,b,", ',', false, {"|\"a,b,"}},
      // "#" quotes dates and may be dropped; inside double quotes it is plain text.
      {"#1/2/03, 10:00#,x,", ',', true, {"1/2/03, 10:00", "x", "|"}},
      {"#1/2/03, 10:00#,x,", ',', false, {"#1/2/03, 10:00#", "x", "|"}},
      {"\"#\",x,", ',', true, {"\"#\"", "x", "|"}},
  };
  for (const Case& c : cases) EXPECT_EQ(AllTokens(c.source, c.delimiter, c.drop_hash), c.expected) << c.source;
}

TEST(Trim, BlanksOnOneSideUpTo1999Characters) {
  std::string left = "   a b  ", right = left, blank = "    ";
  STrimLeft(left);
  STrimRight(right);
  STrimRight(blank);
  EXPECT_EQ(left + "|" + right + "|" + blank, "a b  |   a b|");
  std::string too_long(2000, ' ');
  EXPECT_EQ(test::RaisedText<CSTDFUNException>([&] { STrimLeft(too_long); }),
            "String too long (Module:STDFUN,Method:STrimLeft)");
  EXPECT_EQ(test::RaisedText<CSTDFUNException>([&] { STrimRight(too_long); }),
            "String too long (Module:STDFUN,Method:STrimRight)");
  EXPECT_EQ(too_long.size(), 2000u);
}

TEST(QuoteRemoval, RemoveEveryQuoteOrTrimAndCollapse) {
  std::string all = "a\"b\"\"c\"";
  RemoveQuotes(all);
  EXPECT_EQ(all, "abc");
  const std::pair<std::string, std::string> trims[] = {
      {"\"a \"\"b\"\" c\"", "a \"b\" c"}, {"\"\"\"\"", ""}, {"x\"\"\"\"y", "x\"\"y"}};
  for (auto [text, expected] : trims) {
    TrimQuotes(text);
    EXPECT_EQ(text, expected);
  }
}

}  // namespace
}  // namespace qm
