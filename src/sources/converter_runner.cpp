#include "sources/converter_runner.h"

#include <atomic>
#include <cerrno>
#include <thread>

#include "platform/process.h"
#include "shared/exception_family.h"
#include "shared/trace.h"

namespace qm {

namespace {

constexpr int kStartAttempts = 5;
constexpr std::string_view kFailure =
    "Error converting file. Could not execute converter. CMD: %S - Error Code: %i";

std::atomic<long long> g_timeout_ms{50000};
std::atomic<long long> g_retry_pause_ms{1000};

std::string Replace12(std::string_view argument, std::string_view first, std::string_view second) {
  std::string out;
  out.reserve(argument.size());
  for (std::size_t i = 0; i < argument.size(); ++i) {
    if (argument[i] == '%' && i + 1 < argument.size() &&
        (argument[i + 1] == '1' || argument[i + 1] == '2')) {
      out.append(argument[i + 1] == '1' ? first : second);
      ++i;
    } else {
      out.push_back(argument[i]);
    }
  }
  return out;
}

std::string CommandText(const std::vector<std::string>& arguments) {
  std::string text;
  for (const auto& a : arguments) {
    if (!text.empty()) text.push_back(' ');
    text.append(a);
  }
  return text;
}

}  // namespace

std::vector<std::string> BuildConverterArguments(
    std::string_view command_line, const std::function<std::string(std::string_view)>& expand,
    std::string_view document_path, std::string_view output_path) {
  std::vector<std::string> arguments = platform::SplitCommandLine(command_line);
  for (auto& argument : arguments) {
    argument = Replace12(expand(argument), document_path, output_path);
  }
  return arguments;
}

void RunConverter(const std::vector<std::string>& arguments) {
  const std::string command = CommandText(arguments);
  if (arguments.empty() || arguments[0].empty()) {
    throw CSTDFUNException::Text(kFailure, "ConvertText", nullptr, command, ENOENT);
  }
  const std::chrono::milliseconds timeout(g_timeout_ms.load());
  int error = 0;
  for (int attempt = 1; attempt <= kStartAttempts; ++attempt) {
    const platform::ProcessResult run = platform::RunProcess(arguments, timeout);
    if (run.started) {
      if (run.timed_out) throw CSTDFUNException::Text(kFailure, "ConvertText", nullptr, command, -1);
      if (run.exit_status != 0) {
        throw CSTDFUNException::Text(kFailure, "ConvertText", nullptr, command, run.exit_status);
      }
      return;
    }
    error = run.start_error;
    Trace(TraceLevel2, "PILIB,GILIB,REPLIB (SHARELIB) STDFUN.OpenFileRetry",
          "Warning: Could not convert file. CMD: %s - Error Code: %i - Retrying...", command, error);
    if (attempt < kStartAttempts) {
      std::this_thread::sleep_for(std::chrono::milliseconds(g_retry_pause_ms.load()));
    }
  }
  throw CSTDFUNException::Text(kFailure, "ConvertText", nullptr, command, error);
}

void SetConverterTimingForTesting(std::chrono::milliseconds timeout,
                                  std::chrono::milliseconds retry_pause) {
  g_timeout_ms = timeout.count();
  g_retry_pause_ms = retry_pause.count();
}

}  // namespace qm
