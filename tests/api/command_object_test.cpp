// The command object's error model and argument rules: result codes, the
// thread's error information, VARIANT_BOOL readings, null texts, and the
// calls that need a remote server.
#include <gtest/gtest.h>

#include <chrono>
#include <thread>

#include "api/command_fixture.h"
#include "base/exception_family.h"

namespace qm {
namespace {

using test::CommandFixture;

class CommandObjectTest : public CommandFixture {
 protected:
  // Polls until no background job runs (GetProgress 100).
  void WaitForJob() {
    for (int i = 0; i < 60000 && Progress() != 100; ++i) {
      std::this_thread::sleep_for(std::chrono::milliseconds(2));
    }
    ASSERT_EQ(Progress(), 100) << "the background job did not end";
  }

  std::string GeneralOption(int32_t option) {
    BSTR text = u"untouched";
    EXPECT_EQ(command_->GetIndexGeneralOption(option, VARIANT_TRUE, &text), S_OK) << LastError();
    return Utf16ToUtf8(text);
  }
};

TEST_F(CommandObjectTest, FailureLeavesTextAndSourceInTheThreadsErrorInfoAndTrace) {
  ASSERT_EQ(command_->ExecuteEx(T("DROP THING x"), VARIANT_TRUE), DISP_E_EXCEPTION);
  ErrorInfo info;
  ASSERT_TRUE(GetErrorInfo(info));
  EXPECT_EQ(Utf16ToUtf8(info.Description),
            "Command not recognised (Module:PiStartPoint,Method:ExecuteW)\r\n");
  EXPECT_EQ(info.Source, u"QuillmereAPI.APICommand.1");
  EXPECT_FALSE(GetErrorInfo(info)) << "reading the error information takes it";

  // Written whatever the trace level, in the APICommand trace file.
  std::string trace;
  for (const auto& entry : std::filesystem::directory_iterator(home_.Home() + "Log/")) {
    if (entry.path().filename().string().starts_with("trace_APICommand_")) trace += test::ReadFile(entry.path());
  }
  EXPECT_NE(trace.find(" - Command not recognised"), std::string::npos) << TraceText();

  // The error information belongs to the thread that failed.
  ASSERT_EQ(command_->ExecuteEx(T("DROP THING x"), VARIANT_TRUE), DISP_E_EXCEPTION);
  std::thread([] {
    ErrorInfo other;
    EXPECT_FALSE(GetErrorInfo(other));
  }).join();
  EXPECT_FALSE(LastError().empty());
}

TEST_F(CommandObjectTest, ReportErrorJoinsTheMessagesUpToLevel100) {
  const auto cause = CPiCmdException::Numbered(13, "TranslateW", nullptr);
  const auto wrapper = CPiStartPointException::General("ExecuteW", &cause);
  EXPECT_EQ(command_->ReportError(wrapper), DISP_E_EXCEPTION);
  // The general wrapper (level 200) is left out, the numbered cause is shown.
  const std::string text = LastError();
  EXPECT_EQ(text.rfind("Syntax error in the command statement", 0), 0u) << text;
  EXPECT_EQ(text.find("General Error"), std::string::npos) << text;

  // A chain with nothing at level 100 or below still says something.
  EXPECT_EQ(command_->ReportError(CPiStartPointException::General("ExecuteW")), DISP_E_EXCEPTION);
  EXPECT_EQ(LastError(), "General Error (Module:PiStartPoint,Method:ExecuteW)\r\n");

}

TEST_F(CommandObjectTest, OnlyMinusOneMakesExecuteBlock) {
  const char* failing = "UPDATE FINDEX Missing";
  EXPECT_EQ(command_->ExecuteEx(T(failing), VARIANT_TRUE), DISP_E_EXCEPTION);
  EXPECT_FALSE(LastError().empty());

  for (const VARIANT_BOOL blocking : {VARIANT_BOOL{1}, VARIANT_BOOL{-2}}) {
    EXPECT_EQ(command_->ExecuteEx(T(failing), blocking), S_OK) << blocking;
    EXPECT_EQ(LastError(), "");
    WaitForJob();
    EXPECT_EQ(ErrorNumber(), 1);
    EXPECT_FALSE(ErrorMsg().empty());
  }
}

TEST_F(CommandObjectTest, OtherMethodsTakeAnyNonZeroAsTrue) {
  ASSERT_EQ(command_->SetIndexGeneralOptions(2, 0, 0, nullptr, 0, 0), S_OK);
  EXPECT_EQ(GeneralOption(igoSupportScore), "1");
  EXPECT_EQ(GeneralOption(igoSupportPhrases), "0");
  ASSERT_EQ(command_->SetIndexGeneralOptions(0, 1, 0, nullptr, 0, -3), S_OK);
  EXPECT_EQ(GeneralOption(igoSupportScore), "0");
  EXPECT_EQ(GeneralOption(igoSupportPhrases), "1");
  EXPECT_EQ(GeneralOption(igoSaveDatabaseConnection), "1");

  // GetDefaultValue 7 reads the current options; 0 the stored ones, which
  // need a findex named by the current object name.
  BSTR text;
  EXPECT_EQ(command_->GetIndexGeneralOption(igoSupportPhrases, 7, &text), S_OK);
  EXPECT_EQ(text, u"1");
  EXPECT_EQ(command_->GetIndexGeneralOption(igoSupportPhrases, 0, &text), DISP_E_EXCEPTION);
  EXPECT_NE(LastError().find("Invalid object name \"\""), std::string::npos);

}

TEST_F(CommandObjectTest, NullTextsAndNullResults) {
  // A null separators text leaves the separators; an empty one clears them.
  ASSERT_EQ(command_->SetIndexGeneralOptions(0, -1, 0, T(u"; "), -1, -1), S_OK);
  ASSERT_EQ(command_->SetIndexGeneralOptions(0, -1, 0, nullptr, -1, -1), S_OK);
  EXPECT_EQ(GeneralOption(igoSeparators), ";<SPACE>");
  ASSERT_EQ(command_->SetIndexGeneralOptions(0, -1, 0, T(u""), -1, -1), S_OK);
  EXPECT_EQ(GeneralOption(igoSeparators), "");

  // A null group is an empty name, which is refused.
  EXPECT_EQ(command_->SetGroup(nullptr), DISP_E_EXCEPTION);
  EXPECT_NE(LastError().find("Invalid group name \"\": a name must not be empty"),
            std::string::npos);

  EXPECT_EQ(command_->GetProgress(nullptr), DISP_E_EXCEPTION);
  EXPECT_EQ(LastError(),
            "The result argument of GetProgress is a null pointer "
            "(Module:PiCom,Method:GetProgress)\r\n");
}

TEST_F(CommandObjectTest, RemoteCallsFailClearlyAndTheObjectStaysLocal) {
  EXPECT_EQ(command_->ConnectToServer(T("search.example")), DISP_E_EXCEPTION);
  EXPECT_EQ(LastError(),
            "Remote Quillmere Search servers are not available in this build: cannot connect "
            "to search.example (Module:PiCom,Method:ConnectToServer)\r\n");

  // Local calls go on working.
  EXPECT_EQ(Run("DROP THING x").rfind("Command not recognised", 0), 0u);
}

}  // namespace
}  // namespace qm
