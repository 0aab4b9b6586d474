#include "base/trace.h"

#include <fcntl.h>

#include <ctime>

#include "platform/config_store.h"
#include "platform/file_io.h"

namespace qm {

std::atomic<bool> TraceLevel1{false};
std::atomic<bool> TraceLevel2{false};
std::atomic<bool> TraceLevel3{false};

namespace {

std::atomic<long long> g_file_limit{100'000'000};

// The home folder with a trailing "/", or empty when none is configured.
std::string HomeFolder() {
  std::string home;
  if (platform::ReadConfigValue("home", home) != platform::ConfigStatus::Ok || home.empty()) {
    return {};
  }
  if (home.back() != '/') home += '/';
  return home;
}

std::string SafeFileComponent(std::string_view s) {
  std::string out(s);
  for (auto& c : out) {
    if (c == '/' || c == '\0') c = '_';
  }
  return out;
}

void WriteLineToModuleFile(const std::string& base, const std::string& line) {
  const long long limit = g_file_limit.load();
  std::string path = base + ".log";
  for (int n = 1;; ++n) {
    // O_NONBLOCK: a FIFO planted under a trace name fails the open instead of
    // hanging the tracer; regular files ignore the flag.
    platform::FileHandle file =
        platform::OpenFile(path, O_WRONLY | O_CREAT | O_APPEND | O_NONBLOCK, 0666);
    if (!file.IsOpen()) return;
    if (platform::FileSize(file.Get()) <= limit || n > 100000) {
      // One write() on an O_APPEND file: concurrent tracers never interleave.
      platform::WriteAll(file.Get(), line.data(), line.size());
      return;
    }
    path = base + "_" + std::to_string(n) + ".log";
  }
}

}  // namespace

void SetTraceFileLimitForTesting(long long bytes) { g_file_limit = bytes; }

std::string TraceDate(const std::tm& t) {
  return std::to_string(t.tm_year + 1900) + "-" + std::to_string(t.tm_mon + 1) + "-" +
         std::to_string(t.tm_mday);
}

std::string TraceLine(const std::tm& t, std::string_view area, std::string_view message) {
  std::string line = TraceDate(t) + " " + std::to_string(t.tm_hour) + ":" +
                     std::to_string(t.tm_min) + ":" + std::to_string(t.tm_sec) + " ";
  line.append(area);
  line += " - ";
  line.append(message);
  line += "\r\n";
  return line;
}

void TraceMessage(std::string_view tag, std::string_view message) noexcept {
  try {
    const std::string home = HomeFolder();
    if (home.empty()) return;

    const auto dot = tag.find('.');
    const std::string_view modules = tag.substr(0, dot);
    const std::string_view area = dot == std::string_view::npos ? "" : tag.substr(dot + 1);

    const std::time_t now = std::time(nullptr);
    std::tm t{};
    localtime_r(&now, &t);
    const std::string date = TraceDate(t);
    const std::string line = TraceLine(t, area, message);

    std::size_t start = 0;
    while (start <= modules.size()) {
      auto comma = modules.find(',', start);
      if (comma == std::string_view::npos) comma = modules.size();
      const std::string_view module = modules.substr(start, comma - start);
      WriteLineToModuleFile(home + "Log/trace_" + SafeFileComponent(module) + "_" + date, line);
      start = comma + 1;
    }
  } catch (...) {
    // Dropped: a trace line is never worth a failure.
  }
}

TraceLevels InitTraceLevels() {
  TraceLevels levels;
  const std::string home = HomeFolder();
  std::string content;
  if (!home.empty() && platform::ReadWholeFile(home + "Log/traceStat.log", content)) {
    std::string first = content.substr(0, content.find_first_of("\r\n"));
    first.resize(std::min<std::size_t>(first.size(), 199));
    for (auto& c : first) {
      if (c >= 'a' && c <= 'z') c = static_cast<char>(c - 32);
    }
    if (first.find("TRACE LEVEL 1") != std::string::npos) {
      levels.level1 = true;
    } else if (first.find("TRACE LEVEL 2") != std::string::npos) {
      levels.level1 = levels.level2 = true;
    } else if (first.find("TRACE LEVEL 3") != std::string::npos) {
      levels.level1 = levels.level2 = levels.level3 = true;
    }
  }
  TraceLevel1 = levels.level1;
  TraceLevel2 = levels.level2;
  TraceLevel3 = levels.level3;
  return levels;
}

}  // namespace qm
