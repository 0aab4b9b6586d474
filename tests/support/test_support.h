// Shared helpers for the test programs: scratch folders, a configured home and
// data root, and child processes.
#pragma once

#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace qm::test {

// Gives the test process a private scratch root (QM_TEST_SCRATCH) and lock
// folder (MORVIL_LOCKDIR), below the scratch root it was started with; the
// child processes a test starts inherit both. Removed when the object dies.
class ProcessIsolation {
 public:
  ProcessIsolation();
  ~ProcessIsolation();
  ProcessIsolation(const ProcessIsolation&) = delete;
  ProcessIsolation& operator=(const ProcessIsolation&) = delete;

 private:
  std::string root_;
};

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
