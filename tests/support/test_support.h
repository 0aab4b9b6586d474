// Shared helpers for the test programs: scratch folders, a configured home and
// data root, and child processes.
#pragma once

#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace qm::test {

// A fresh folder below the test scratch root, removed when the object dies.
class ScratchDir {
 public:
  explicit ScratchDir(const std::string& name = "scratch");
  ~ScratchDir();
  ScratchDir(const ScratchDir&) = delete;
  ScratchDir& operator=(const ScratchDir&) = delete;
  // The folder path, ending in "/".
  const std::string& Path() const { return path_; }

 private:
  std::string path_;
};

// Points MORVIL_HOME (and MORVIL_PATH) at folders below a scratch folder and
// creates the home's Log, Config and System folders. Restores the environment
// when destroyed.
class ConfiguredHome {
 public:
  ConfiguredHome();
  ~ConfiguredHome();
  const std::string& Home() const { return home_; }
  const std::string& Data() const { return data_; }

 private:
  ScratchDir dir_;
  std::string home_;
  std::string data_;
  std::vector<std::pair<std::string, std::optional<std::string>>> saved_;
};

std::string ReadFile(const std::string& path);
void WriteFile(const std::string& path, const std::string& bytes);
// UTF-16LE bytes with a byte-order mark.
std::string Utf16LeFile(const std::u16string& text);

// Runs a program with arguments, waits and returns its exit status (or
// 128 + signal); stdout is captured into out when given.
int RunProgram(const std::vector<std::string>& argv, std::string* out = nullptr);

// The path of a helper program built beside the tests.
std::string HelperPath(const std::string& name);

}  // namespace qm::test
