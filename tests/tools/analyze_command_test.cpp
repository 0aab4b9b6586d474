// quillmere analyze, run as a user runs it: text on standard input, one line a word.
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

#include "support/test_support.h"

namespace qm {
namespace {

// Runs quillmere [--data data] analyze options < input; standard error goes to err.
int Analyze(const std::string& input, const std::vector<std::string>& options, std::string& out,
            const std::string& data = {}, std::string* err = nullptr) {
  test::ScratchDir dir("analyze");
  const std::string file = dir.Path() + "input.txt";
  const std::string err_file = dir.Path() + "stderr.txt";
  test::WriteFile(file, input);
  std::vector<std::string> argv{"/bin/sh", "-c", "f=$1; e=$2; shift 2; exec \"$@\" < \"$f\" 2> \"$e\"",
                                "sh", file, err_file, QM_CLI_PATH};
  if (!data.empty()) argv.insert(argv.end(), {"--data", data});
  argv.push_back("analyze");
  argv.insert(argv.end(), options.begin(), options.end());
  out.clear();
  const int status = test::RunProgram(argv, &out);
  if (err != nullptr) *err = test::ReadFile(err_file);
  return status;
}

// A data directory laid out by quillmere init.
class InitialisedData {
 public:
  InitialisedData() : dir_("analyze-data"), data_(dir_.Path() + "data/") {
    std::string out;
    if (test::RunProgram({QM_CLI_PATH, "--data", data_, "init"}, &out) != 0) {
      ADD_FAILURE() << "init failed: " << out;
    }
  }
  const std::string& Path() const { return data_; }

 private:
  test::ScratchDir dir_;
  std::string data_;
};

const char* const kText = "The rivers were running. It is. Quickly, Thompson! \xC3\x89lan M\xC3\xA4rchen und";

TEST(AnalyzeCommand, PrintsPositionWordAndFormWithSentenceGaps) {
  std::string out;
  ASSERT_EQ(Analyze("One two. three<b>x</b>\n\xC3\xA9t\xC3\xA9", {"--html"}, out), 0);
  EXPECT_EQ(out,
            "1\tONE\tONE\n"
            "2\tTWO\tTWO\n"
            "4\tTHREEX\tTHREEX\n"
            "5\t\xC3\x89T\xC3\x89\t\xC3\x89T\xC3\x89\n");
}

TEST(AnalyzeCommand, LanguageStepsUseTheDataDirectoryMadeByInit) {
  InitialisedData data;
  std::string out;
  std::string err;
  // A stop word that ends a sentence still leaves the gap (QUICKLY at 5, not 4).
  ASSERT_EQ(Analyze(kText, {"--stopwords", "--stemming"}, out, data.Path(), &err), 0) << err;
  EXPECT_EQ(out,
            "0\tTHE\t\n1\tRIVERS\tRIVER\n1\tWERE\t\n2\tRUNNING\tRUN\n3\tIT\t\n3\tIS\t\n"
            "5\tQUICKLY\tQUICK\n6\tTHOMPSON\tTHOMPSON\n7\t\xC3\x89LAN\t\xC3\x89LAN\n"
            "8\tM\xC3\x84RCHEN\tM\xC3\x84RCHEN\n9\tUND\tUND\n");
  EXPECT_EQ(err, "");

  // The data directory's files, not the shipped ones, decide.
  test::WriteFile(data.Path() + "Language/German/lang.txt", test::Utf16LeFile(u"\u00C4 - A\n"));
  ASSERT_EQ(Analyze("M\xC3\xA4rchen", {"--language", "7", "--translation"}, out, data.Path()), 0);
  EXPECT_EQ(out, "1\tM\xC3\x84RCHEN\tMARCHEN\n");
}

TEST(AnalyzeCommand, WithoutLanguageDataTheShippedDataIsUsedAndNamed) {
  test::ScratchDir empty("analyze-empty");
  std::string out;
  std::string err;
  ASSERT_EQ(Analyze("the rivers", {"--stopwords"}, out, empty.Path(), &err), 0) << err;
  EXPECT_EQ(out, "0\tTHE\t\n1\tRIVERS\tRIVERS\n");
  EXPECT_EQ(err, "quillmere analyze: " + empty.Path() +
                     "Language/ has no English/info.txt; using the shipped language data in " +
                     QM_SOURCE_DATA_DIR + "Language/\n");

  // Without a language step no language data is needed, and nothing is said.
  test::ConfiguredHome home;
  unsetenv("MORVIL_PATH");
  ASSERT_EQ(Analyze("the rivers", {}, out, {}, &err), 0);
  EXPECT_EQ(err, "");
}

TEST(AnalyzeCommand, LanguageFailuresEndWithTheEngineMessage) {
  InitialisedData data;
  std::string out;
  std::string err;
  std::filesystem::remove(data.Path() + "Language/English/stop.txt");
  EXPECT_EQ(Analyze("x", {"--stopwords"}, out, data.Path(), &err), 1);
  EXPECT_NE(err.find("Error opening file: " + data.Path() +
                     "Language/English/stop.txt (Module:WinFile,Method:OpenWinFile)\n"),
            std::string::npos)
      << err;
  EXPECT_EQ(out, "");
}

TEST(AnalyzeCommand, RejectsBadOptions) {
  std::string out;
  EXPECT_EQ(Analyze("x", {"--language", "13"}, out), 2);
  EXPECT_EQ(Analyze("x", {"--bogus"}, out), 2);
  EXPECT_EQ(out, "");
}

}  // namespace
}  // namespace qm
