// The built-in HTML converter: fields, scripts, META pairs, normalisation, and
// robustness against malformed and random markup.
#include <gtest/gtest.h>

#include <random>
#include <string>

#include "base/exception_family.h"
#include "sources/html_converter.h"

namespace qm {
namespace {

FieldMap Convert(std::string_view html) {
  FieldMap fields;
  Converter().Convert(html, fields);
  return fields;
}

TEST(HtmlConverter, ClosingTagsBecomeFieldsAndTitleIsAlsoDefaultTitle) {
  const FieldMap f = Convert(
      "<html><head><title>River \n Guide</title></head>"
      "<body><p>Salmon\tswim&NbSp;upstream.</p><B>bold</b></body></html>");
  EXPECT_EQ(f.at("TITLE"), "River Guide");
  EXPECT_EQ(f.at("DEFAULT_TITLE"), "River Guide");
  EXPECT_EQ(f.at("P"), "Salmon swim upstream.");
  EXPECT_EQ(f.at("B"), "bold");
  EXPECT_EQ(f.at("DEFAULT_PLAIN_TEXT"), "River Guide Salmon swim upstream. bold");
  EXPECT_EQ(f.count("DEFAULT_SUMMARY"), 0u);
  // A closing tag right after another stores the (empty) text before it.
  EXPECT_EQ(f.at("BODY"), "");
}

TEST(HtmlConverter, ScriptsNeverReachTheText) {
  const FieldMap f = Convert(
      "<p>before</p><SCRIPT type=\"text/javascript\">var s = \"<b>secret</b>\";</ScRiPt>middle"
      "<script>x = 1;</script >after<script\nsrc=\"a.js\"></SCRIPT\n>end");
  EXPECT_EQ(f.at("DEFAULT_PLAIN_TEXT"), "before middle after end");
  EXPECT_EQ(f.count("B"), 0u);

  // An unclosed script hides the rest of the document; the text before stays.
  EXPECT_EQ(Convert("kept <script>lost </p> lost").at("DEFAULT_PLAIN_TEXT"), "kept");
  // "</scripts>" does not end a script.
  EXPECT_EQ(Convert("<script>a</scripts>b</script>c").at("DEFAULT_PLAIN_TEXT"), "c");
}

TEST(HtmlConverter, MetaNameAndContentPairs) {
  const FieldMap f = Convert(
      "<head><meta name=\"Description\" content=\"A book about rivers\">"
      "<META CONTENT = \"fish, water\" NAME=keywords>"
      "<meta\n  name=\"author\"\n  content=\"Ann Lee\">"
      "<meta charset=\"utf-8\"><meta name=\"empty\"></head>");
  EXPECT_EQ(f.at("DESCRIPTION"), "A book about rivers");
  EXPECT_EQ(f.at("DEFAULT_SUMMARY"), "A book about rivers");
  EXPECT_EQ(f.at("KEYWORDS"), "fish, water");
  EXPECT_EQ(f.at("AUTHOR"), "Ann Lee");
  EXPECT_EQ(f.at("EMPTY"), "");
  // Only pairs with a NAME are stored.
  EXPECT_EQ(f.size(), 7u);  // + HEAD and DEFAULT_PLAIN_TEXT
}

TEST(HtmlConverter, TextOutsideCompleteTagsIsKept) {
  EXPECT_EQ(Convert("a <i>b</i> tail").at("DEFAULT_PLAIN_TEXT"), "a b tail");
  // A "<" that never closes is text, not a tag.
  EXPECT_EQ(Convert("x</b> 3 < 4 and more").at("DEFAULT_PLAIN_TEXT"), "x 3 < 4 and more");
  EXPECT_EQ(Convert("").at("DEFAULT_PLAIN_TEXT"), "");
  EXPECT_EQ(Convert("<><//></ >").at("DEFAULT_PLAIN_TEXT"), "");
}

TEST(HtmlConverter, OverLongTagIsSkippedAndLongTextKept) {
  const std::string long_name(5000, 'x');
  const std::string long_text(300000, 'w');
  const FieldMap f = Convert("<" + long_name + " a=b>first</p><i>" + long_text +
                             "</i><meta name=d content=\"" + std::string(3000, 'c') + "\">");
  EXPECT_EQ(f.at("P"), "first");
  EXPECT_EQ(f.at("I"), long_text);
  EXPECT_EQ(f.at("D"), std::string(3000, 'c'));
  EXPECT_EQ(f.at("DEFAULT_PLAIN_TEXT"), "first " + long_text);
  // A name of exactly the limit is still a tag.
  const FieldMap g = Convert("a</" + std::string(Converter::kMaxTagName - 1, 'q') + ">");
  EXPECT_EQ(g.count(std::string(Converter::kMaxTagName - 1, 'Q')), 1u);
  const FieldMap h = Convert("b</" + std::string(Converter::kMaxTagName, 'q') + ">");
  EXPECT_EQ(h.count(std::string(Converter::kMaxTagName, 'Q')), 0u);
  EXPECT_EQ(h.at("DEFAULT_PLAIN_TEXT"), "b");
}

TEST(HtmlConverter, Normalisation) {
  EXPECT_EQ(NormalizeHtmlText("\t\r\n  a&nbsp;&NBSP;b \x01 c  "), "a b c");
  EXPECT_EQ(NormalizeHtmlText("&amp;&nbsp"), "&amp;&nbsp");
  EXPECT_EQ(NormalizeHtmlText("Дом  и\nсад"), "Дом и сад");
}

// Random markup: fragments that exercise every rule, glued together at
// random, plus raw random bytes. Conversion must finish without failing and
// the plain text must come out normalised.
std::string RandomDocument(std::mt19937& rng) {
  static const char* const kPieces[] = {
      "<", ">", "/", "</", "<script>", "</script>", "</SCRIPT", "<meta ", "name=", "content=",
      "\"", "=", " ", "\n", "\t", "&nbsp;", "&nbsp", "&", "title", "</title>", "<p>", "</p>",
      "text", "Дом", "\xC3", "\xFF", "\0", "<!-- c -->", "<a href=\"x\">", "NAME", "CONTENT"};
  std::uniform_int_distribution<int> piece(0, std::size(kPieces) - 1);
  std::uniform_int_distribution<int> length(0, 80);
  std::uniform_int_distribution<int> byte(0, 255);
  std::string doc;
  const int n = length(rng);
  for (int i = 0; i < n; ++i) {
    if (byte(rng) < 40) {
      doc.push_back(static_cast<char>(byte(rng)));
    } else {
      const char* p = kPieces[piece(rng)];
      doc.append(p, *p == '\0' ? 1 : std::char_traits<char>::length(p));
    }
  }
  return doc;
}

TEST(HtmlConverter, RandomAndMalformedInputConvertsCleanly) {
  std::mt19937 rng(20240611);
  for (int round = 0; round < 20000; ++round) {
    const std::string doc = RandomDocument(rng);
    FieldMap f;
    ASSERT_NO_THROW(Converter().Convert(doc, f)) << "document: " << doc;
    const std::string& plain = f.at("DEFAULT_PLAIN_TEXT");
    ASSERT_EQ(NormalizeHtmlText(plain), plain) << "document: " << doc;
    ASSERT_LE(plain.size(), doc.size() + doc.size() / 2 + 1);
    for (const auto& [name, value] : f) ASSERT_FALSE(name.empty());
  }
}

}  // namespace
}  // namespace qm
