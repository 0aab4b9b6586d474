#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <vector>

#include "support/file_test_util.h"
#include "base/error_messages.h"
#include "base/exception_family.h"

namespace qm {
namespace {

using test::EntryTexts;
using test::RaisedChain;
using Texts = std::vector<std::string>;

const std::string kUnknown =
    "Unknown exception. This is a critical error, please report this problem to Morvil support";

// Each class names the module its own name carries.
#define QM_EXPECT_MODULE(M) \
  EXPECT_EQ(EntryTexts(C##M##Exception::General(nullptr)), Texts{"General Error (Module:" #M ")"});

TEST(ExceptionFamily, EveryModuleNamesItselfInItsGeneralError) {
  QM_EXPECT_MODULE(Stream) QM_EXPECT_MODULE(ECComClient) QM_EXPECT_MODULE(SyncServers)
  QM_EXPECT_MODULE(PiStartPoint) QM_EXPECT_MODULE(PiCmd) QM_EXPECT_MODULE(HighStructures)
  QM_EXPECT_MODULE(PiFIndex) QM_EXPECT_MODULE(PiOrder) QM_EXPECT_MODULE(WinFile)
  QM_EXPECT_MODULE(PiDelete) QM_EXPECT_MODULE(PiSort) QM_EXPECT_MODULE(PiOrderSort)
  QM_EXPECT_MODULE(Value) QM_EXPECT_MODULE(STDFUN) QM_EXPECT_MODULE(Collection)
  QM_EXPECT_MODULE(ShareDatabase) QM_EXPECT_MODULE(StringFuncU) QM_EXPECT_MODULE(BFile)
  QM_EXPECT_MODULE(MFile) QM_EXPECT_MODULE(FreeItem) QM_EXPECT_MODULE(Block)
  QM_EXPECT_MODULE(GiStartPoint) QM_EXPECT_MODULE(GiTreeRowset) QM_EXPECT_MODULE(GiCmdTree)
  QM_EXPECT_MODULE(GiFIndex) QM_EXPECT_MODULE(GiRepository) QM_EXPECT_MODULE(GiOrder)
  QM_EXPECT_MODULE(ShareRepository) QM_EXPECT_MODULE(ShareCollector) QM_EXPECT_MODULE(ShareDefinition)
  QM_EXPECT_MODULE(Language) QM_EXPECT_MODULE(DocConverter) QM_EXPECT_MODULE(ComConverter)
  QM_EXPECT_MODULE(Connection) QM_EXPECT_MODULE(Converter) QM_EXPECT_MODULE(LockManager)
}

// Builds one unknown exception of each class and returns the trace areas expected.
template <class... U>
std::vector<std::string> MakeUnknowns() {
  std::vector<std::string> areas;
  ([&] {
    const U e = U::Unknown("Probe");
    const std::string module(U::kModule);
    EXPECT_EQ(EntryTexts(e), Texts{kUnknown + " (Module:" + module + ",Method:Probe)"});
    EXPECT_EQ(e.GetEntries().at(0).level, 100);
    areas.push_back(module == "GiTreeRowset" ? module : module + "UnknownException");
  }(), ...);
  return areas;
}

TEST(ExceptionFamily, UnknownExceptionsTraceUnderTheirTags) {
  test::ConfiguredHome home;
  const auto engine_areas =
      MakeUnknowns<CMFileUnknownException, CGiTreeRowsetUnknownException, CComConverterUnknownException>();
  const auto converter_areas = MakeUnknowns<CDocConverterUnknownException, CConverterUnknownException>();

  const std::string message = " - *** UNKNOWN EXCEPTION *** (Method:Probe)\r\n";
  for (const char* module : {"SHARELIB", "PILIB", "GILIB", "FILIB"}) {
    const std::string trace = test::TraceOf(home, module);
    for (const auto& areas : {engine_areas, converter_areas}) {
      for (const auto& area : areas) {
        EXPECT_NE(trace.find(" " + area + message), std::string::npos) << module << " " << area;
      }
    }
  }
  // Only the converter-side classes also write to the REPLIB file.
  const std::string replib = test::TraceOf(home, "REPLIB");
  for (const auto& area : converter_areas) {
    EXPECT_NE(replib.find(" " + area + message), std::string::npos) << area;
  }
  EXPECT_EQ(replib.find("ComConverter"), std::string::npos);
  EXPECT_EQ(replib.find("MFile"), std::string::npos);
}

TEST(ExceptionForms, GeneralAndTextErrors) {
  const auto e = CSTDFUNException::General(nullptr);
  EXPECT_EQ(e.GetEntries()[0].level, 200);
  EXPECT_EQ(e.GetErrorNumber(), 1);

  const auto t = CSTDFUNException::Text("Error deleting file: %S", "DropFile", nullptr,
                                        std::string("/data/a b.sdx"));
  EXPECT_EQ(EntryTexts(t), Texts{"Error deleting file: /data/a b.sdx (Module:STDFUN,Method:DropFile)"});
  EXPECT_EQ(t.GetEntries()[0].level, 100);
}

class NumberedErrors : public ::testing::Test {
 protected:
  void SetUp() override {
    test::WriteFile(dir_.Path() + "mrvconf.ini",
                    test::Utf16LeFile(u"[ERROR MESSAGES]\r\n"
                                      u"13,50,Statement error in %METHOD of %MODULE: %s %MODULE\r\n"
                                      u"40,300,Deep detail only\r\n"));
    ASSERT_TRUE(LoadErrorMessagesFromFile(dir_.Path() + "mrvconf.ini"));
  }
  void TearDown() override { LoadErrorMessages(); }

  test::ScratchDir dir_;
};

TEST_F(NumberedErrors, TakeTextAndLevelFromTheTableOrTheDefaultAtLevel200) {
  const auto e = CPiCmdException::Numbered(13, "TranslateW", nullptr, "near X");
  EXPECT_EQ(EntryTexts(e), Texts{"Statement error in TranslateW of PiCmd: near X %MODULE"});
  EXPECT_EQ(e.GetEntries()[0].level, 50);
  EXPECT_EQ(e.GetEntries()[0].number, 13);
  EXPECT_EQ(e.GetErrorNumber(), 13);

  const auto missing = CGiTreeRowsetException::Numbered(59, "SetOrder", nullptr);
  EXPECT_EQ(missing.GetEntries()[0].level, 200);
  EXPECT_EQ(missing.GetFullTextUtf8(100), "General Error (Module:GiTreeRowset, Method:SetOrder)\r\n");

  // Only entries above level 200: nothing at 100 or 200, so all of them.
  const auto inner = CPiCmdException::Numbered(40, "ExecuteW", nullptr);
  const auto outer = CPiCmdException::Numbered(40, "ExecuteW", &inner);
  EXPECT_EQ(outer.GetFullTextUtf8(100), "Deep detail only\r\nDeep detail only\r\n");
}

TEST(ExceptionChain, InnerEntriesFollowTheNewOne) {
  const auto cause = CWinFileException::Text("Error opening file: %S", "Open", nullptr, "x.fst");
  const auto middle = CBlockException::General("InsertRow", &cause);
  const auto outer = CPiFIndexException::Text("Write failed", "BuildRowFindex", &middle);
  EXPECT_EQ(EntryTexts(outer), (Texts{"Write failed (Module:PiFIndex,Method:BuildRowFindex)",
                                      "General Error (Module:Block,Method:InsertRow)",
                                      "Error opening file: x.fst (Module:WinFile,Method:Open)"}));
  EXPECT_EQ(outer.GetFullTextUtf8(100),
            "Write failed (Module:PiFIndex,Method:BuildRowFindex)\r\n"
            "Error opening file: x.fst (Module:WinFile,Method:Open)\r\n");
  // A handler that knows only std::exception still sees the whole chain.
  try {
    throw outer;
  } catch (const std::exception& e) {
    EXPECT_STREQ(e.what(),
                 "Write failed (Module:PiFIndex,Method:BuildRowFindex) <- "
                 "General Error (Module:Block,Method:InsertRow) <- "
                 "Error opening file: x.fst (Module:WinFile,Method:Open)");
  }
}

TEST(Guard, OwnExceptionsPassAndOthersAreWrapped) {
  test::ConfiguredHome home;
  using G = CPiCmdException;
  using GU = CPiCmdUnknownException;
  EXPECT_EQ((Guard<G, GU>("ExecuteW", [] { return 42; })), 42);
  EXPECT_EQ(RaisedChain<G>([] {
              Guard<G, GU>("ExecuteW", [] { throw G::Text("Own", "TranslateW", nullptr); });
            }),
            Texts{"Own (Module:PiCmd,Method:TranslateW)"});
  EXPECT_EQ(RaisedChain<G>([] {
              Guard<G, GU>("ExecuteW", [] { throw CBlockException::Text("Cause", "Read", nullptr); });
            }),
            (Texts{"General Error (Module:PiCmd,Method:ExecuteW)", "Cause (Module:Block,Method:Read)"}));
  // Anything else, an unknown exception from below included, becomes this
  // module's unknown exception with no inner entries.
  EXPECT_EQ(RaisedChain<GU>([] {
              Guard<G, GU>("ExecuteW", [] { throw std::runtime_error("boom"); });
            }),
            Texts{kUnknown + " (Module:PiCmd,Method:ExecuteW)"});
  EXPECT_EQ(RaisedChain<GU>([] {
              Guard<G, GU>("ExecuteW", [] { throw CMFileUnknownException::Unknown("Read"); });
            }),
            Texts{kUnknown + " (Module:PiCmd,Method:ExecuteW)"});
  EXPECT_NE(test::TraceOf(home, "PILIB").find(
                " PiCmdUnknownException - *** UNKNOWN EXCEPTION *** (Method:ExecuteW)\r\n"),
            std::string::npos);
  // A module without an unknown-exception class passes foreign exceptions on unchanged.
  EXPECT_THROW((Guard<CBlockException>("Read", [] { throw std::runtime_error("x"); })),
               std::runtime_error);
}

TEST(Guard, AnErrorCollectsOneGeneralEntryPerBoundary) {
  const auto texts = RaisedChain<CPiStartPointException>([] {
    Guard<CPiStartPointException, CPiStartPointUnknownException>("ExecuteW", [] {
      Guard<CPiFIndexException, CPiFIndexUnknownException>("BuildRowFindex", [] {
        Guard<CBlockException>("InsertRow", [] {
          throw CWinFileException::Text("Error writing file: %S", "Write", nullptr, "a.fst");
        });
      });
    });
  });
  EXPECT_EQ(texts, (Texts{"General Error (Module:PiStartPoint,Method:ExecuteW)",
                          "General Error (Module:PiFIndex,Method:BuildRowFindex)",
                          "General Error (Module:Block,Method:InsertRow)",
                          "Error writing file: a.fst (Module:WinFile,Method:Write)"}));
}

}  // namespace
}  // namespace qm
