// Document conversion by Converters.txt: table rules, plain text, external
// programs (real processes), the converter component, and failure texts.
#include <gtest/gtest.h>
#include <signal.h>

#include <cerrno>
#include <filesystem>
#include <fstream>

#include "config/converter_runner.h"
#include "base/exception_family.h"
#include "config/retry_pause.h"
#include "sources/converter_table.h"
#include "sources/doc_converter.h"
#include "sources/document_text.h"
#include "sources/converter_home.h"

namespace qm {
namespace {

namespace fs = std::filesystem;
using test::ConverterHome;
using test::FailureText;
using test::ReadFile;
using test::WriteFile;

std::string Quoted(const std::string& path) { return "\"" + path + "\""; }

TEST(ConverterTable, KeysEntriesAndKinds) {
  const ConverterTable table = ConverterTable::Parse(
      ".htm=[QUILLMERE_HTML_CONVERTER]\r\n"
      "no equals sign here\n"
      ".txt=first\n"
      ".Txt=[plain_text]\r\n"
      ".pdf=PDF, pdftotext  \"%1\" %2 \n"
      ".doc=[COM_CONVERTER],  Office.Reader\n"
      ".bad=[PLAIN_TEXT] , x");
  EXPECT_EQ(table.Find(".HTM"), "[QUILLMERE_HTML_CONVERTER]");
  EXPECT_EQ(table.Find(".txt"), "[plain_text]");  // the later line wins, CR dropped
  EXPECT_EQ(table.Find(".xyz"), std::nullopt);

  const ConverterEntry pdf = ConverterTable::SplitEntry(*table.Find(".pdf"));
  EXPECT_EQ(pdf.kind, ConverterKind::Program);
  EXPECT_EQ(pdf.argument, "pdftotext  \"%1\" %2");
  const ConverterEntry doc = ConverterTable::SplitEntry(*table.Find(".doc"));
  EXPECT_EQ(doc.kind, ConverterKind::Component);
  EXPECT_EQ(doc.argument, "Office.Reader");
  // The marker must match exactly: a blank before the comma makes a program label.
  EXPECT_EQ(ConverterTable::SplitEntry(*table.Find(".bad")).kind, ConverterKind::Program);
}

class DocConverterTest : public ::testing::Test {
 protected:
  void SetUp() override {
    SetRetryPauseHookForTesting([this](std::chrono::milliseconds) { ++retry_pauses_; });
  }
  void TearDown() override {
    SetRetryPauseHookForTesting({});
    SetConverterTimeoutForTesting(kConverterTimeout);
  }

  std::string Document(const std::string& name, const std::string& bytes) {
    const std::string path = docs_.Path() + name;
    WriteFile(path, bytes);
    return path;
  }

  ConverterHome home_;
  test::ScratchDir docs_{"docs"};
  int retry_pauses_ = 0;
};

TEST_F(DocConverterTest, ChoosesByExtensionOrTypeOrAll) {
  home_.WriteConverters(".htm=[QUILLMERE_HTML_CONVERTER]\n.txt=[PLAIN_TEXT]\n");
  DocConverter converter(home_.Defs());
  const std::string page = Document("PAGE.HTM", "<title>T</title><p>Body</p>");
  EXPECT_EQ(converter.ConvertForIndexing(page), "T Body");
  // A document type replaces the extension.
  EXPECT_EQ(converter.ConvertForIndexing(page, ".TXT"), "<title>T</title><p>Body</p>");

  // Nothing applies: result 1 and the fields untouched.
  const std::string other = Document("notes.md", "# notes");
  FieldMap fields{{"DEFAULT_PLAIN_TEXT", "as before"}};
  EXPECT_EQ(converter.ConvertText(other, fields), 1);
  EXPECT_EQ(fields, (FieldMap{{"DEFAULT_PLAIN_TEXT", "as before"}}));
  EXPECT_EQ(converter.ConvertForIndexing(Document("noext", "x")), "");

  home_.WriteConverters("ALL=[PLAIN_TEXT]\n");
  DocConverter fallback(home_.Defs());
  EXPECT_EQ(fallback.ConvertForIndexing(other), "# notes");
  EXPECT_EQ(home_.WorkFileCount(), 0);
}

TEST_F(DocConverterTest, PlainTextSummaryAndEncodings) {
  home_.WriteConverters(".txt=[PLAIN_TEXT]\n");
  DocConverter converter(home_.Defs());
  FieldMap fields;
  // 150 characters, not bytes, and never half a character.
  std::string cyrillic;
  for (int i = 0; i < 200; ++i) cyrillic += "ж";
  ASSERT_EQ(converter.ConvertText(Document("c.txt", cyrillic), fields), 0);
  EXPECT_EQ(fields.at("DEFAULT_PLAIN_TEXT"), cyrillic);
  EXPECT_EQ(fields.at("DEFAULT_SUMMARY"), cyrillic.substr(0, 300));

  // UTF-16 with a byte-order mark is read as text; bytes that are not UTF-8
  // become replacement characters.
  EXPECT_EQ(converter.ConvertForIndexing(Document("u.txt", test::Utf16LeFile(u"Straße"))),
            "Straße");
  EXPECT_EQ(converter.ConvertForIndexing(Document("l.txt", "caf\xE9!")), "caf\xEF\xBF\xBD!");
  EXPECT_EQ(converter.ConvertForIndexing(Document("b.txt", "\xEF\xBB\xBFhi")), "hi");
}

TEST_F(DocConverterTest, ExternalProgramWithPlaceholderInAFolderWithBlanks) {
  fs::create_symlink(test::HelperPath("sample_converter"), home_.Converters() + "sample_converter");
  home_.WriteConverters(".cnv=MyConverter, [QUILLMERE_DATA_CONVERTERS]\\sample_converter copy %1 %2\n");
  DocConverter converter(home_.Defs());
  FieldMap fields;
  ASSERT_EQ(converter.ConvertText(Document("x.cnv", std::string(160, 'z')), fields), 0);
  EXPECT_EQ(fields.at("DEFAULT_PLAIN_TEXT"), "converted: " + std::string(160, 'z'));
  EXPECT_EQ(fields.at("DEFAULT_SUMMARY"), "converted: " + std::string(139, 'z'));
  EXPECT_EQ(home_.WorkFileCount(), 0);  // the output file is deleted
}

TEST_F(DocConverterTest, DocumentPathIsOneArgumentAndNeverACommand) {
  home_.WriteConverters(".arg=ARGS, " + Quoted(test::HelperPath("sample_converter")) +
                        " args %2 %1 \"two words\" lit\\\"quote\n");
  DocConverter converter(home_.Defs());
  // Blanks, both quotes and "%2" inside the path; and a path that a shell
  // would run as commands creating the marker files.
  const std::string marker = docs_.Path() + "pwned";
  for (const std::string& dir :
       {docs_.Path() + "it's \"odd\" 'x' %2 %1 a\\\"b",
        docs_.Path() + "a; touch " + marker + "; b $(touch " + marker + "1) `touch " + marker +
            "2` c"}) {
    fs::create_directories(dir);
    const std::string path = dir + "/doc.arg";
    WriteFile(path, "content");
    EXPECT_EQ(converter.ConvertForIndexing(path), "3\n" + path + "\ntwo words\nlit\"quote\n");
  }
  EXPECT_FALSE(fs::exists(marker));
  EXPECT_FALSE(fs::exists(marker + "1"));
  EXPECT_FALSE(fs::exists(marker + "2"));
}

TEST_F(DocConverterTest, FailingProgramsFailTheConversion) {
  const std::string helper = Quoted(test::HelperPath("sample_converter"));
  const std::string pid_file = docs_.Path() + "hang.pid";
  home_.WriteConverters(".fail=F, " + helper + " fail %1 %2\n" +
                        ".hang=H, " + helper + " hang " + pid_file + "\n" +
                        ".gone=G, /no/such/program %1 %2\n" +
                        ".none=LABEL-WITHOUT-COMMA\n");
  DocConverter converter(home_.Defs());

  // The command is shown with the paths filled in (the output path is a work file).
  const std::string fail = FailureText([&] { converter.ConvertForIndexing(Document("a.fail", "x")); });
  EXPECT_EQ(fail.rfind("Error converting file. Could not execute converter. CMD: " +
                           test::HelperPath("sample_converter") + " fail " + docs_.Path() +
                           "a.fail " + home_.WorkData() + "tmpxxxx_",
                       0),
            0u)
      << fail;
  EXPECT_NE(fail.find(".tmp - Error Code: 3 (Module:STDFUN,Method:ConvertText)\r\n"),
            std::string::npos)
      << fail;

  // Long enough for the helper to start and write its process id on a busy
  // machine (a sanitizer build starts slowly); the kill is what is checked.
  SetConverterTimeoutForTesting(std::chrono::milliseconds(2000));
  const std::string hang_text = FailureText([&] { converter.ConvertForIndexing(Document("b.hang", "x")); });
  EXPECT_NE(hang_text.find("- Error Code: -1 (Module:STDFUN,Method:ConvertText)"), std::string::npos)
      << hang_text;
  // The program was killed and reaped: its process id no longer exists.
  const pid_t pid = std::stoi(ReadFile(pid_file));
  EXPECT_EQ(kill(pid, 0), -1);
  EXPECT_EQ(errno, ESRCH);

  const std::string gone = FailureText([&] { converter.ConvertForIndexing(Document("c.gone", "x")); });
  EXPECT_NE(gone.find("CMD: /no/such/program " + docs_.Path() + "c.gone "), std::string::npos) << gone;
  EXPECT_NE(gone.find(" - Error Code: 2 (Module:STDFUN,Method:ConvertText)"), std::string::npos) << gone;
  EXPECT_EQ(retry_pauses_, 4) << "a program that cannot start is tried 5 times";

  EXPECT_EQ(FailureText([&] { converter.ConvertForIndexing(Document("d.none", "x")); }),
            "Error converting file. Could not execute converter. CMD:  - Error Code: 22 "
            "(Module:STDFUN,Method:ConvertText)\r\n");
  EXPECT_EQ(home_.WorkFileCount(), 0);
}

TEST_F(DocConverterTest, UnreadableDocumentIsADocConverterError) {
  home_.WriteConverters(".txt=[PLAIN_TEXT]\n.htm=[QUILLMERE_HTML_CONVERTER]\n");
  DocConverter converter(home_.Defs());
  for (const char* name : {"missing.txt", "missing.htm"}) {
    EXPECT_EQ(FailureText([&] { converter.ConvertForIndexing(docs_.Path() + name); }),
              "Unknown error reading file (Module:DocConverter,Method:ConvertText)\r\n");
  }
}

TEST_F(DocConverterTest, DocumentColumnValuesAndTracedFailures) {
  home_.WriteConverters(".htm=[QUILLMERE_HTML_CONVERTER]\n.fail=F, " +
                        Quoted(test::HelperPath("sample_converter")) + " fail\n");
  DocConverter converter(home_.Defs());
  Document("page.htm", "<p>from a file</p>");
  // A failing conversion is traced and indexes nothing; the next value converts.
  const std::string bad = Document("x.fail", "x");
  EXPECT_EQ(ConvertedDocumentText(converter, bad), "");
  EXPECT_EQ(FileDocumentText(converter, docs_.Path(), "page.htm"), "from a file");
  const std::string trace = home_.TraceText();
  EXPECT_NE(trace.find("RepDB.StartCollector - Could not convert document " + bad +
                       " because of the following error: Error converting file."),
            std::string::npos)
      << trace;
  EXPECT_EQ(home_.WorkFileCount(), 0);
}

#ifdef QM_EXAMPLE_CONVERTER
class ComponentTest : public DocConverterTest {
 protected:
  void SetUp() override {
    DocConverterTest::SetUp();
    home_.WriteConverters(".msg=[COM_CONVERTER], Example.MailConverter\n"
                          ".nope=[COM_CONVERTER], Example.Unregistered\n"
                          ".junk=[COM_CONVERTER], Example.NotALibrary\n");
    WriteFile(home_.Converters() + "Components.txt",
              "example.mailconverter = " + std::string(QM_EXAMPLE_CONVERTER) + "\n"
              "Example.NotALibrary=not-a-library.so\n");
    WriteFile(home_.Converters() + "not-a-library.so", "plain text");
  }
};

TEST_F(ComponentTest, ExampleComponentAnswersTheFieldsAskedFor) {
  DocConverter converter(home_.Defs());
  const std::string mail =
      Document("m.msg", "Subject: Rivers of Europe\nFrom: ann@example.org\n\nSalmon swim upstream.\n");
  EXPECT_EQ(converter.ConvertForIndexing(mail), "Salmon swim upstream.\n");

  FieldMap fields{{"DEFAULT_TITLE", ""}, {"FROM", ""}, {"CC", "kept"}};
  ASSERT_EQ(converter.ConvertText(mail, fields), 0);
  EXPECT_EQ(fields, (FieldMap{{"DEFAULT_TITLE", "Rivers of Europe"},
                              {"FROM", "ann@example.org"},
                              {"CC", "kept"}}));  // an empty answer leaves the field
}

TEST_F(ComponentTest, ComponentFailures) {
  DocConverter converter(home_.Defs());
  EXPECT_EQ(FailureText([&] { converter.ConvertForIndexing(Document("bad.msg", "Subject: x\nno colon\n")); }),
            "Malformed header line 2 (Module:ComConverter,Method:CheckError)\r\n");
  EXPECT_EQ(FailureText([&] { converter.ConvertForIndexing(docs_.Path() + "absent.msg"); }),
            "Error opening document (Module:ComConverter,Method:OpenDocument)\r\n");
  EXPECT_EQ(FailureText([&] { converter.ConvertForIndexing(Document("a.nope", "x")); }),
            "Error Instantiating ComCustom: Error instantiating object: Error: Class not registered "
            "(Module:ComConverter,Method:ComCustom) (Module:ComConverter,Method:Tranformation)\r\n");
  EXPECT_EQ(FailureText([&] { converter.ConvertForIndexing(Document("a.junk", "x")); }),
            "Error Instantiating ComCustom: Error instantiating object: Error: Unknown "
            "(Module:ComConverter,Method:ComCustom) (Module:ComConverter,Method:Tranformation)\r\n");
  // A failed document leaves the component usable.
  EXPECT_EQ(converter.ConvertForIndexing(Document("ok.msg", "Subject: s\n\nbody")), "body");
}
#endif

}  // namespace
}  // namespace qm
