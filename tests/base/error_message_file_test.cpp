#include <gtest/gtest.h>

#include <map>
#include <memory>
#include <string>

#include "support/file_test_util.h"
#include "base/error_messages.h"

namespace qm {
namespace {

// number -> "level:text" for compact comparisons.
std::map<int32_t, std::string> Parsed(const std::u16string& file_text) {
  std::map<int32_t, std::string> out;
  for (const auto& [number, entry] : ParseErrorMessages(test::Utf16LeFile(file_text))) {
    EXPECT_EQ(entry.number, number);
    out[number] = std::to_string(entry.level) + ":" + Utf16ToUtf8(entry.text);
  }
  return out;
}

using Table = std::map<int32_t, std::string>;

TEST(ErrorMessageFile, SectionLinesAreNumberLevelText) {
  EXPECT_EQ(Parsed(u"; comment\r\n"
                   u"1,100,before the section: ignored\r\n"
                   u"[ERROR MESSAGES]\r\n"
                   u"10,100,Text, with commas, kept\r\n"
                   u"[END]\r\n"
                   u"11,50,Out of memory in %METHOD\r\n"
                   u"10,100,second 10 is ignored\r\n"
                   u"-3,7,negative numbers are numbers\n"
                   u"12,100,last line without end"),
            (Table{{-3, "7:negative numbers are numbers"},
                   {10, "100:Text, with commas, kept"},
                   {11, "50:Out of memory in %METHOD"},
                   {12, "100:last line without end"}}));
}

TEST(ErrorMessageFile, AMalformedLineEndsLoading) {
  const std::u16string head = u"[ERROR MESSAGES]\r\n10,100,kept\r\n";
  const std::u16string tail = u"\r\n20,100,never read\r\n";
  for (const std::u16string bad : {u"", u"30,100", u"0,100,zero number", u"30,0,zero level",
                                   u"x,100,not a number", u"30,100,", u"99999999999,1,too big"}) {
    EXPECT_EQ(Parsed(head + bad + tail), (Table{{10, "100:kept"}})) << Utf16ToUtf8(bad);
  }
}

TEST(ErrorMessageFile, LongTextsAreCutAndOddInputSurvives) {
  // A line is read up to 2,048 units; here a surrogate pair straddles that
  // limit and is dropped whole with the rest of the line.
  const std::u16string text = std::u16string(2043, u'x') + u"\U0001F600" + u"tail";
  const auto table = ParseErrorMessages(test::Utf16LeFile(u"[ERROR MESSAGES]\n5,1," + text));
  ASSERT_EQ(table.count(5), 1u);
  EXPECT_EQ(table.at(5).text, std::u16string(2043, u'x'));

  // No byte-order mark: the first line is still read whole.
  std::string bytes = test::Utf16LeFile(u"[ERROR MESSAGES]\n5,1,no mark").substr(2);
  EXPECT_EQ(ParseErrorMessages(bytes).at(5).text, u"no mark");
}

TEST(ErrorMessageLoading, ReadsTheSystemFolderFileAndAMissingFileLeavesTheTableEmpty) {
  auto home = std::make_unique<test::ConfiguredHome>();  // restores MORVIL_SYSTEM when it goes
  test::WriteFile(home->Home() + "System/mrvconf.ini",
                  test::Utf16LeFile(u"[ERROR MESSAGES]\r\n44,60,Findex %s is in use\r\n"));
  // The configured folder may lack its final "/".
  setenv("MORVIL_SYSTEM", (home->Home() + "System").c_str(), 1);
  EXPECT_EQ(ErrorMessageFolder(), home->Home() + "System/");
  LoadErrorMessages();
  ErrorEntry e = LookupErrorMessage(44);
  EXPECT_EQ(e.text, u"Findex %s is in use");
  EXPECT_EQ(e.level, 60);

  EXPECT_FALSE(LoadErrorMessagesFromFile(home->Home() + "absent.ini"));
  e = LookupErrorMessage(44);
  EXPECT_EQ(e.text, u"General Error (Module:%MODULE, Method:%METHOD)");
  EXPECT_EQ(e.level, 200);
  EXPECT_EQ(e.number, 44);
  home.reset();
  LoadErrorMessages();
}

}  // namespace
}  // namespace qm
