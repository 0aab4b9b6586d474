#include "support/test_support.h"

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>

namespace qm::test {

namespace fs = std::filesystem;

namespace {

std::string ScratchRoot() {
  const char* root = std::getenv("QM_TEST_SCRATCH");
  std::string base = root != nullptr && *root != '\0' ? root : fs::temp_directory_path().string();
  return base;
}

void SetOrUnset(const std::string& name, const std::string& value, bool set) {
  if (set) {
    setenv(name.c_str(), value.c_str(), 1);
  } else {
    unsetenv(name.c_str());
  }
}

}  // namespace

ProcessIsolation::ProcessIsolation() {
  std::string pattern = ScratchRoot() + "/qm-test-XXXXXX";
  std::vector<char> buffer(pattern.begin(), pattern.end());
  buffer.push_back('\0');
  if (mkdtemp(buffer.data()) == nullptr) throw std::runtime_error("mkdtemp failed: " + pattern);
  root_ = buffer.data();
  setenv("QM_TEST_SCRATCH", root_.c_str(), 1);
  setenv("MORVIL_LOCKDIR", (root_ + "/locks/").c_str(), 1);
}

ProcessIsolation::~ProcessIsolation() {
  std::error_code ec;
  fs::remove_all(root_, ec);
}

ScratchDir::ScratchDir(const std::string& name) {
  std::string pattern = ScratchRoot() + "/qm-" + name + "-XXXXXX";
  std::vector<char> buffer(pattern.begin(), pattern.end());
  buffer.push_back('\0');
  if (mkdtemp(buffer.data()) == nullptr) throw std::runtime_error("mkdtemp failed: " + pattern);
  path_ = std::string(buffer.data()) + "/";
}

ScratchDir::~ScratchDir() {
  std::error_code ec;
  fs::remove_all(path_, ec);
}

ConfiguredHome::ConfiguredHome() : dir_("home") {
  home_ = dir_.Path() + "home/";
  data_ = dir_.Path() + "data/";
  for (const char* sub : {"Log", "Config", "System", "Tasks"}) fs::create_directories(home_ + sub);
  fs::create_directories(data_);
  for (const char* name : {"MORVIL_HOME", "MORVIL_PATH", "MORVIL_REGISTRY", "MORVIL_SYSTEM"}) {
    const char* old = std::getenv(name);
    saved_.emplace_back(name, old ? std::optional<std::string>(old) : std::nullopt);
  }
  setenv("MORVIL_HOME", home_.c_str(), 1);
  setenv("MORVIL_PATH", data_.c_str(), 1);
  setenv("MORVIL_REGISTRY", (dir_.Path() + "no-registry.conf").c_str(), 1);
}

ConfiguredHome::~ConfiguredHome() {
  for (const auto& [name, value] : saved_) SetOrUnset(name, value.value_or(""), value.has_value());
}

std::string ReadFile(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  std::ostringstream s;
  s << in.rdbuf();
  return s.str();
}

void WriteFile(const std::string& path, const std::string& bytes) {
  fs::create_directories(fs::path(path).parent_path());
  std::ofstream out(path, std::ios::binary | std::ios::trunc);
  out << bytes;
}

std::string Utf16LeFile(const std::u16string& text) {
  std::string bytes = "\xFF\xFE";
  for (char16_t c : text) {
    bytes.push_back(static_cast<char>(c & 0xFF));
    bytes.push_back(static_cast<char>(c >> 8));
  }
  return bytes;
}

int RunProgram(const std::vector<std::string>& argv, std::string* out) {
  int pipefd[2] = {-1, -1};
  // Close-on-exec: a child started at the same time by another thread must not
  // keep this pipe open, or this read would wait for that child to end.
  if (out != nullptr && pipe2(pipefd, O_CLOEXEC) != 0) return -1;
  // Built before the fork: tests start children from several threads, and a
  // child that allocates may find the allocator locked by a thread it lacks.
  std::vector<char*> args;
  for (const auto& a : argv) args.push_back(const_cast<char*>(a.c_str()));
  args.push_back(nullptr);
  const pid_t pid = fork();
  if (pid == 0) {
    if (out != nullptr) {
      dup2(pipefd[1], 1);
      close(pipefd[0]);
      close(pipefd[1]);
    }
    execv(args[0], args.data());
    _exit(127);
  }
  if (out != nullptr) {
    close(pipefd[1]);
    char buffer[4096];
    ssize_t n;
    while ((n = read(pipefd[0], buffer, sizeof buffer)) > 0) out->append(buffer, n);
    close(pipefd[0]);
  }
  int status = 0;
  waitpid(pid, &status, 0);
  if (WIFEXITED(status)) return WEXITSTATUS(status);
  return 128 + WTERMSIG(status);
}

std::string HelperPath(const std::string& name) { return std::string(QM_TEST_BINARY_DIR) + name; }

}  // namespace qm::test
