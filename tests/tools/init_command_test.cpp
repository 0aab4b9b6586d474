// quillmere init, run as a user runs it.
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

#include "support/test_support.h"

namespace qm {
namespace {

namespace fs = std::filesystem;

// Runs the host with stdout and stderr together in out.
int Quillmere(const std::vector<std::string>& args, std::string& out) {
  std::vector<std::string> argv{"/bin/sh", "-c", "exec \"$@\" 2>&1", "sh", QM_CLI_PATH};
  argv.insert(argv.end(), args.begin(), args.end());
  out.clear();
  return test::RunProgram(argv, &out);
}

const char* const kGroupFolders[] = {"Indexes",     "Orders",  "Config",   "Repositories",
                                     "Definitions", "Queries", "WorkData", "DataStore"};

TEST(InitCommand, LaysOutEveryDataFolderOfOneGroupAndCanRunAgain) {
  test::ScratchDir dir("init");
  const std::string data = dir.Path() + "data";
  std::string out;
  ASSERT_EQ(Quillmere({"--data", data, "init", "--group", "sales"}, out), 0) << out;
  for (const char* top : {"Language", "Converters"}) EXPECT_TRUE(fs::is_directory(data + "/" + top));
  for (const char* sub : kGroupFolders) {
    EXPECT_TRUE(fs::is_directory(data + "/Groups/SALES/" + sub)) << sub;
    EXPECT_NE(out.find(data + "/Groups/SALES/" + sub + "/\n"), std::string::npos) << out;
  }
  const std::string first = out;
  ASSERT_EQ(Quillmere({"--data", data, "--group", "sales", "init"}, out), 0);
  EXPECT_EQ(out, first);
}

// Every file below the shipped Language folder, relative to it.
std::vector<std::string> ShippedLanguageFiles() {
  std::vector<std::string> files;
  const std::string root = std::string(QM_SOURCE_DATA_DIR) + "Language/";
  for (const auto& entry : fs::recursive_directory_iterator(root)) {
    if (entry.is_regular_file()) files.push_back(entry.path().lexically_relative(root).string());
  }
  return files;
}

TEST(InitCommand, CopiesTheLanguageDataAndKeepsFilesThatExist) {
  test::ScratchDir dir("init-language");
  const std::string data = dir.Path() + "data/";
  const std::string shipped = std::string(QM_SOURCE_DATA_DIR) + "Language/";
  const std::string language = data + "Language/";
  std::string out;
  ASSERT_EQ(Quillmere({"--data", data, "init"}, out), 0) << out;
  const auto files = ShippedLanguageFiles();
  ASSERT_GT(files.size(), 40u);
  for (const auto& file : files) {
    EXPECT_EQ(test::ReadFile(language + file), test::ReadFile(shipped + file)) << file;
  }

  // A changed file stays and is named; a deleted one comes back; an unchanged
  // one is not mentioned.
  test::WriteFile(language + "English/stop.txt", test::Utf16LeFile(u"mine"));
  fs::remove(language + "German/1.dat");
  ASSERT_EQ(Quillmere({"--data", data, "init"}, out), 0) << out;
  EXPECT_EQ(test::ReadFile(language + "English/stop.txt"), test::Utf16LeFile(u"mine"));
  EXPECT_EQ(test::ReadFile(language + "German/1.dat"), test::ReadFile(shipped + "German/1.dat"));
  EXPECT_NE(out.find("quillmere init: kept " + language +
                     "English/stop.txt (it differs from the shipped file)\n"),
            std::string::npos)
      << out;

  fs::remove_all(language + "French");
  test::WriteFile(language + "French", "a file in the way");
  EXPECT_EQ(Quillmere({"--data", data, "init"}, out), 1);
  EXPECT_NE(out.find("quillmere init: cannot create folder " + language + "French/: "),
            std::string::npos)
      << out;
}

TEST(InitCommand, UsesTheConfiguredPathAndPublicByDefaultAndReportsWhatStopsIt) {
  test::ConfiguredHome home;
  std::string out;
  ASSERT_EQ(Quillmere({"init"}, out), 0) << out;
  EXPECT_TRUE(fs::is_directory(home.Data() + "Groups/PUBLIC/WorkData"));
  unsetenv("MORVIL_PATH");
  EXPECT_EQ(Quillmere({"init"}, out), 1);
  EXPECT_EQ(out, "quillmere init: Data path is not set (Module:STDFUN,Method:GetFullDataPath)\n");
  EXPECT_EQ(Quillmere({"--data", home.Data(), "init", "--group", "../escape"}, out), 1);
  EXPECT_EQ(out,
            "quillmere init: Invalid group name: ../escape (Module:STDFUN,Method:GetFullDataPath)\n");
  EXPECT_EQ(Quillmere({"init", "--bogus"}, out), 2);
  EXPECT_EQ(Quillmere({"init", "--help"}, out), 0);
  EXPECT_EQ(out.rfind("usage: quillmere init [--data DIR] [--group NAME]\n", 0), 0u) << out;
}

}  // namespace
}  // namespace qm
