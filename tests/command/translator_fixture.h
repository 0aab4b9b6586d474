// A translator wired to its own definitions, with the shipped error messages.
#pragma once

#include <gtest/gtest.h>

#include <string>
#include <string_view>

#include "command/command_translator.h"
#include "platform/text_encoding.h"
#include "base/error_messages.h"
#include "base/exception_family.h"

namespace qm::test {

struct Refusal {
  int32_t number = -1;  // 1 for a text error
  std::string text;     // what a host sees: GetFullText(100)
};

class TranslatorTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(LoadErrorMessagesFromFile(std::string(QM_SOURCE_DATA_DIR) + "System/mrvconf.ini"));
  }

  void Translate(std::string_view statement) { cmd.TranslateW(Utf8ToUtf16(statement)); }

  Refusal Refuse(std::string_view statement) {
    try {
      Translate(statement);
    } catch (CPiCmdException& e) {
      return {e.GetErrorNumber(), e.GetFullTextUtf8(100)};
    }
    ADD_FAILURE() << "statement was accepted: " << statement;
    return {};
  }

  // The text a numbered error of the translator reads as, from the shipped table.
  static std::string NumberedText(int32_t number) {
    std::string text = Utf16ToUtf8(LookupErrorMessage(number).text);
    text.replace(text.find("%MODULE"), 7, "PiCmd");
    text.replace(text.find("%METHOD"), 7, "TranslateW");
    return text + "\r\n";
  }

  CIndexHeader findex;
  COrderInfo order;
  ConnectionSettings connection;
  IndexOptions index_options;
  OrderOptions order_options;
  PiCmd cmd{findex, order, connection, index_options, order_options};
};

}  // namespace qm::test
