#include "shared/tokenizer.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "shared/core_test_support.h"
#include "shared/exception_family.h"

namespace qm {
namespace {

// Every token GetToken hands out, and what is left of the source.
std::vector<std::string> AllTokens(std::string source, char delimiter, bool drop_hash,
                                   std::string* rest = nullptr) {
  std::vector<std::string> tokens;
  std::string token;
  while (GetToken(source, token, delimiter, drop_hash)) tokens.push_back(token);
  EXPECT_EQ(token, "");  // the failing call hands out nothing
  if (rest != nullptr) *rest = source;
  return tokens;
}

using Tokens = std::vector<std::string>;

TEST(GetToken, DoubledQuoteGivesOneQuote) {
  std::string rest;
  EXPECT_EQ(AllTokens("a\"\"b,", ',', false, &rest), Tokens{"a\"b"});
  EXPECT_EQ(rest, "");
}

TEST(GetToken, LeadingDelimitersAreSkippedAndTheLastTokenNeedsADelimiter) {
  std::string rest;
  EXPECT_EQ(AllTokens(",,x,,y,z", ',', false, &rest), (Tokens{"x", "y"}));
  EXPECT_EQ(rest, "z");  // no delimiter after it: no token, source left as it was
}

TEST(GetToken, QuotesProtectDelimitersAndAreKept) {
  EXPECT_EQ(AllTokens("\"a,b\",c,", ',', false), (Tokens{"\"a,b\"", "c"}));
  EXPECT_EQ(AllTokens("\"a b\" \"c\"\"d\" ", ' ', false), (Tokens{"\"a b\"", "\"c\"d\""}));
  // An unterminated quote swallows the final delimiter.
  EXPECT_EQ(AllTokens("\"a,b,", ',', false), Tokens{});
}

TEST(GetToken, HashQuotesDatesAndMayBeDropped) {
  EXPECT_EQ(AllTokens("#1/2/03, 10:00#,x,", ',', true), (Tokens{"1/2/03, 10:00", "x"}));
  EXPECT_EQ(AllTokens("#1/2/03, 10:00#,x,", ',', false), (Tokens{"#1/2/03, 10:00#", "x"}));
  // Inside double quotes "#" is plain text.
  EXPECT_EQ(AllTokens("\"#\",x,", ',', true), (Tokens{"\"#\"", "x"}));
}

TEST(GetToken, BytesAboveAsciiPassThrough) {
  EXPECT_EQ(AllTokens("\xC3\xA9t\xC3\xA9,\xFF,", ',', false), (Tokens{"\xC3\xA9t\xC3\xA9", "\xFF"}));
}

TEST(GetTokenBySet, ReturnsEachDelimiterAndMinusOneAtTheEnd) {
  std::string source = " ,a b,c";
  std::string token;
  EXPECT_EQ(GetTokenBySet(source, token, " ,"), ' ');
  EXPECT_EQ(token, "a");
  EXPECT_EQ(source, "b,c");
  EXPECT_EQ(GetTokenBySet(source, token, " ,"), ',');
  EXPECT_EQ(token, "b");
  EXPECT_EQ(GetTokenBySet(source, token, " ,"), -1);
  EXPECT_EQ(token, "c");
  EXPECT_EQ(source, "");

  source = ",,,";
  EXPECT_EQ(GetTokenBySet(source, token, ","), -1);
  EXPECT_EQ(token, "");
  EXPECT_EQ(source, "");
}

TEST(GetTokenBySet, ByteDelimitersAreUnsigned) {
  std::string source = "a\xA7" "b";
  std::string token;
  EXPECT_EQ(GetTokenBySet(source, token, "\xA7"), 0xA7);
  EXPECT_EQ(token, "a");
}

TEST(Trim, BlanksOnOneSide) {
  std::string left = "   a b  ";
  STrimLeft(left);
  EXPECT_EQ(left, "a b  ");
  std::string right = "   a b  ";
  STrimRight(right);
  EXPECT_EQ(right, "   a b");
  std::string blank = "    ";
  STrimRight(blank);
  EXPECT_EQ(blank, "");
}

TEST(Trim, MoreThan1999CharactersIsTooLong) {
  std::string ok = " " + std::string(1998, 'x');
  STrimLeft(ok);
  EXPECT_EQ(ok.size(), 1998u);
  std::string too_long(2000, ' ');
  EXPECT_EQ(test::ThrownTexts<CSTDFUNException>([&] { STrimLeft(too_long); }),
            std::vector<std::string>{"String too long (Module:STDFUN,Method:STrimLeft)"});
  EXPECT_EQ(test::ThrownTexts<CSTDFUNException>([&] { STrimRight(too_long); }),
            std::vector<std::string>{"String too long (Module:STDFUN,Method:STrimRight)"});
  EXPECT_EQ(too_long.size(), 2000u);
}

TEST(QuoteRemoval, RemoveEveryQuoteOrTrimAndCollapse) {
  std::string all = "a\"b\"\"c\"";
  RemoveQuotes(all);
  EXPECT_EQ(all, "abc");

  std::string dsn = "\"a \"\"b\"\" c\"";
  TrimQuotes(dsn);
  EXPECT_EQ(dsn, "a \"b\" c");
  std::string only = "\"\"\"\"";
  TrimQuotes(only);
  EXPECT_EQ(only, "");
  std::string inner = "x\"\"\"\"y";  // two pairs collapse to two quotes
  TrimQuotes(inner);
  EXPECT_EQ(inner, "x\"\"y");
}

}  // namespace
}  // namespace qm
