// The current options, their text, and the five option files that keep a
// group's defaults: layout, round trips, and damaged files.
#include <gtest/gtest.h>

#include <filesystem>
#include <string>

#include "api/command_fixture.h"

namespace qm {
namespace {

namespace fs = std::filesystem;
using test::CommandFixture;

std::string Int32(int32_t v) {
  std::string s(4, '\0');
  for (int i = 0; i < 4; ++i)
    s[i] = static_cast<char>((static_cast<uint32_t>(v) >> (8 * i)) & 0xFF);
  return s;
}

std::string WideString(std::u16string_view text) {
  std::string s;
  s += static_cast<char>(text.size() & 0xFF);
  s += static_cast<char>(text.size() >> 8);
  for (char16_t c : text) {
    s += static_cast<char>(c & 0xFF);
    s += static_cast<char>(c >> 8);
  }
  return s;
}

class OptionTest : public CommandFixture {
 protected:
  using Getter = HRESULT (APICommand::*)(int32_t, VARIANT_BOOL, BSTR*);

  std::string Get(Getter getter, int32_t option, APICommand* command = nullptr) {
    BSTR text = u"untouched";
    EXPECT_EQ(((command ? command : command_.get())->*getter)(option, VARIANT_TRUE, &text), S_OK)
        << LastError();
    return Utf16ToUtf8(text);
  }

  // Every option of the five sets, as "name=value" lines.
  std::string All(APICommand* command = nullptr) {
    std::string out;
    auto add = [&](const char* name, Getter getter, int32_t option) {
      out += std::string(name) + "=" + Get(getter, option, command) + "\n";
    };
    for (int32_t o : {-1, 1, 2, 4, 8, 16}) add("ilo", &APICommand::GetIndexLanguageOption, o);
    for (int32_t o : {-1, -2, -3, 1, 2, 4, 8, 16, 32}) {
      add("igo", &APICommand::GetIndexGeneralOption, o);
    }
    for (int32_t o : {-1, 1, 2}) add("iuo", &APICommand::GetIndexUpdateOption, o);
    for (int32_t o : {-1, 1, 2}) add("ogo", &APICommand::GetOrderGeneralOption, o);
    for (int32_t o : {-1, 1, 2}) add("ouo", &APICommand::GetOrderUpdateOption, o);
    return out;
  }

  void SetEverything() {
    ASSERT_EQ(command_->SetIndexLanguageOptions(lngFrench, -1, -1, 0, 0, -1), S_OK);
    ASSERT_EQ(command_->SetIndexGeneralOptionsEx(-1, 0, -1, T(u" \t\r\n;\u00e9"), 0, -1, 3, 250),
              S_OK);
    ASSERT_EQ(command_->SetIndexUpdateOptions(9, -1, -1), S_OK);
    ASSERT_EQ(command_->SetOrderGeneralOptions(-1, -1, T(u"-_\u00df")), S_OK);
    ASSERT_EQ(command_->SetOrderUpdateOptions(4, 0, -1), S_OK);
  }
};

TEST_F(OptionTest, NewObjectStartsWithTheDocumentedDefaults) {
  EXPECT_EQ(All(),
            "ilo=2\nilo=0\nilo=0\nilo=1\nilo=0\nilo=1\n"
            "igo=0\nigo=0\nigo=\nigo=0\nigo=1\nigo=1\nigo=1\nigo=0\nigo=0\n"
            "iuo=0\niuo=0\niuo=0\n"
            "ogo=\nogo=0\nogo=0\n"
            "ouo=0\nouo=0\nouo=0\n");
}

TEST_F(OptionTest, SavedDefaultsComeBackInANewObjectWithTheirFileLayout) {
  SetEverything();
  ASSERT_EQ(command_->SaveDefaultIndexOptions(), S_OK) << LastError();
  ASSERT_EQ(command_->SaveDefaultOrderOptions(), S_OK) << LastError();
  const std::string saved = All();
  EXPECT_EQ(saved,
            "ilo=3\nilo=1\nilo=1\nilo=0\nilo=1\nilo=0\n"
            "igo=3\nigo=250\nigo=<SPACE><TAB><LINE_FEED><NEW_LINE>;\xC3\xA9\n"
            "igo=1\nigo=0\nigo=0\nigo=1\nigo=1\nigo=0\n"
            "iuo=9\niuo=1\niuo=1\n"
            "ogo=-_\xC3\x9F\nogo=1\nogo=1\n"
            "ouo=4\nouo=0\nouo=1\n");

  const std::string config = ConfigFolder();
  EXPECT_EQ(test::ReadFile(config + "ilo.dat"), Int32(1 | 2 | 8) + Int32(3));
  EXPECT_EQ(test::ReadFile(config + "igo.dat"),
            Int32(1 | 16 | 8) + Int32(3) + Int32(250) + WideString(u" \t\r\n;\u00e9"));
  EXPECT_EQ(test::ReadFile(config + "iuo.dat"), Int32(3) + Int32(9));
  EXPECT_EQ(test::ReadFile(config + "ogo.dat"), Int32(2 | 1) + WideString(u"-_\u00df"));
  EXPECT_EQ(test::ReadFile(config + "ouo.dat"), Int32(2) + Int32(4));
  // Written under temporary names and renamed: nothing else is left.
  for (const auto& entry : fs::directory_iterator(config)) {
    const std::string name = entry.path().filename().string();
    EXPECT_TRUE(name.size() == 7 || name == "generator.dat") << name;
  }

  APICommand other;
  ASSERT_EQ(other.SetDataPath(T(home_.Data())), S_OK);
  EXPECT_NE(All(&other), saved) << "a new object starts from the defaults";
  ASSERT_EQ(other.LoadDefaultIndexOptions(), S_OK);
  ASSERT_EQ(other.LoadDefaultOrderOptions(), S_OK);
  EXPECT_EQ(All(&other), saved);
}

TEST_F(OptionTest, LoadingStartsFromTheDefaultsAndSkipsDamagedFiles) {
  SetEverything();
  // No files: loading brings back the defaults, not the current values.
  ASSERT_EQ(command_->LoadDefaultIndexOptions(), S_OK);
  ASSERT_EQ(command_->LoadDefaultOrderOptions(), S_OK);
  APICommand fresh;
  EXPECT_EQ(All(), All(&fresh));

  const std::string config = ConfigFolder();
  test::WriteFile(config + "ilo.dat", Int32(1) + Int32(lngGerman));
  // A general file cut inside its string, an update file with a byte too
  // many: neither is applied in part.
  test::WriteFile(config + "igo.dat",
                  Int32(1) + Int32(5) + Int32(6) + WideString(u"abc").substr(0, 5));
  test::WriteFile(config + "iuo.dat", Int32(3) + Int32(9) + "x");
  test::WriteFile(config + "ogo.dat", Int32(1));
  test::WriteFile(config + "ouo.dat", Int32(1) + Int32(2));
  ASSERT_EQ(command_->LoadDefaultIndexOptions(), S_OK);
  ASSERT_EQ(command_->LoadDefaultOrderOptions(), S_OK);
  EXPECT_EQ(Get(&APICommand::GetIndexLanguageOption, iloLanguage), "7");
  EXPECT_EQ(Get(&APICommand::GetIndexGeneralOption, igoIndexMaxSize), "0");
  EXPECT_EQ(Get(&APICommand::GetIndexUpdateOption, iuoUpdateSupport), "0");
  EXPECT_EQ(Get(&APICommand::GetOrderUpdateOption, ouoUpdateSupport), "2");

  // igoUseUnicode is never set by a setter but is reported from the file.
  test::WriteFile(config + "igo.dat", Int32(32 | 2) + Int32(0) + Int32(0) + WideString(u""));
  ASSERT_EQ(command_->LoadDefaultIndexOptions(), S_OK);
  EXPECT_EQ(Get(&APICommand::GetIndexGeneralOption, igoUseUnicode), "1");
}

}  // namespace
}  // namespace qm
