#include "config/converter_runner.h"

#include <atomic>
#include <cerrno>
#include <vector>

#include "platform/process.h"
#include "base/exception_family.h"
#include "config/retry_pause.h"
#include "base/trace.h"

namespace qm {

namespace {

constexpr int kStartAttempts = 5;
constexpr std::chrono::milliseconds kStartPause{1000};
constexpr const char* kFailureText =
    "Error converting file. Could not execute converter. CMD: %S - Error Code: %i";

std::atomic<long long> g_timeout_ms{kConverterTimeout.count()};

std::string JoinArguments(const std::vector<std::string>& argv) {
  std::string line;
  for (const auto& a : argv) {
    if (!line.empty()) line += ' ';
    line += a;
  }
  return line;
}

}  // namespace

void SetConverterTimeoutForTesting(std::chrono::milliseconds timeout) {
  g_timeout_ms = timeout.count();
}

void ConvertText(std::string_view command_line, const ArgumentFiller& fill) {
  std::vector<std::string> argv = platform::SplitCommandLine(command_line);
  if (fill) {
    for (auto& argument : argv) argument = fill(argument);
  }
  const std::string shown = argv.empty() ? std::string(command_line) : JoinArguments(argv);
  if (argv.empty() || argv[0].empty()) {
    throw CSTDFUNException::Text(kFailureText, "ConvertText", nullptr, shown, EINVAL);
  }
  const std::chrono::milliseconds timeout(g_timeout_ms.load());
  for (int attempt = 1;; ++attempt) {
    const platform::ProcessResult result = platform::RunProcess(argv, timeout);
    if (result.started) {
      if (result.timed_out || result.exit_status != 0) {
        throw CSTDFUNException::Text(kFailureText, "ConvertText", nullptr, shown,
                                     result.timed_out ? -1 : result.exit_status);
      }
      return;
    }
    if (attempt == kStartAttempts) {
      throw CSTDFUNException::Text(kFailureText, "ConvertText", nullptr, shown,
                                   result.start_error);
    }
    Trace(TraceLevel2.load(), "PILIB,GILIB,REPLIB (SHARELIB) STDFUN.OpenFileRetry",
          "Warning: Could not convert file. CMD: %s - Error Code: %i - Retrying...", shown,
          result.start_error);
    PauseBeforeRetry(kStartPause);
  }
}

}  // namespace qm
