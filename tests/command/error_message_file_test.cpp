#include <gtest/gtest.h>

#include <fstream>
#include <map>
#include <string>

#include "platform/text_encoding.h"
#include "base/error_messages.h"
#include "support/test_support.h"

namespace qm::test {
namespace {

const std::string kShippedIni = std::string(QM_SOURCE_DATA_DIR) + "System/mrvconf.ini";
const std::string kShippedSource = std::string(QM_SOURCE_DATA_DIR) + "System/mrvconf.txt";

// Every numbered error the engine raises.
constexpr int32_t kRaisedNumbers[] = {10, 11, 13, 15, 16, 17, 18, 26, 29, 31, 36,
                                      40, 41, 44, 46, 47, 52, 57, 59, 60, 61};

TEST(ShippedErrorMessages, HoldEveryRaisedNumberWithAVisibleLevel) {
  ASSERT_TRUE(LoadErrorMessagesFromFile(kShippedIni));
  const auto table = ParseErrorMessages(ReadFile(kShippedIni));
  EXPECT_EQ(table.size(), std::size(kRaisedNumbers));
  for (const int32_t number : kRaisedNumbers) {
    SCOPED_TRACE(number);
    const ErrorEntry entry = LookupErrorMessage(number);
    EXPECT_EQ(entry.number, number);
    // GetFullText(100) shows only entries up to level 100.
    EXPECT_GE(entry.level, 1);
    EXPECT_LE(entry.level, 100);
    const std::string text = Utf16ToUtf8(entry.text);
    const std::string suffix = " (Module:%MODULE,Method:%METHOD)";
    ASSERT_GT(text.size(), suffix.size() + 10);
    EXPECT_EQ(text.substr(text.size() - suffix.size()), suffix);
    // No value is passed with these errors: a directive would show as it is.
    for (const char* directive : {"%s", "%S", "%i", "%d"}) {
      EXPECT_EQ(text.find(directive), std::string::npos) << directive;
    }
  }
}

TEST(ShippedErrorMessages, IniIsGeneratedFromTheReadableSource) {
  std::map<int32_t, ErrorEntry> source;
  std::ifstream in(kShippedSource);
  ASSERT_TRUE(in.is_open());
  for (std::string line; std::getline(in, line);) {
    if (line.empty() || line[0] == '#') continue;
    const auto c1 = line.find(',');
    const auto c2 = line.find(',', c1 + 1);
    ASSERT_NE(c2, std::string::npos) << line;
    const int32_t number = std::stoi(line.substr(0, c1));
    source[number] = {Utf8ToUtf16(line.substr(c2 + 1)), number,
                      std::stoi(line.substr(c1 + 1, c2 - c1 - 1))};
  }
  const auto ini = ParseErrorMessages(ReadFile(kShippedIni));
  ASSERT_EQ(ini.size(), source.size()) << "run scripts/make_mrvconf.py";
  for (const auto& [number, entry] : source) {
    SCOPED_TRACE(number);
    ASSERT_EQ(ini.count(number), 1u);
    EXPECT_EQ(ini.at(number).level, entry.level);
    EXPECT_EQ(ini.at(number).text, entry.text);
  }
}

}  // namespace
}  // namespace qm::test
