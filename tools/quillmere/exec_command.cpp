// quillmere exec: runs one command statement through the command object,
// blocking, or as a background job whose progress the host shows.
#include <chrono>
#include <cstdio>
#include <string>
#include <thread>
#include <vector>

#include "command_registry.h"
#include "host_session.h"
#include "index/word_sort.h"
#include "platform/terminal.h"
#include "platform/text_encoding.h"

namespace qm::cli {
namespace {

constexpr const char* kUsage = "exec [--background] STATEMENT";
constexpr int kBarWidth = 40;

void PrintHelp() {
  std::printf(
      "usage: quillmere [GLOBAL OPTIONS] %s\n\n"
      "Runs a command statement (CREATE FINDEX, UPDATE FINDEX, DELETE FROM FINDEX,\n"
      "DROP FINDEX, CREATE ORDER, UPDATE ORDER, DROP ORDER, CONNECT, SET GROUP,\n"
      "SET CONNECTIONSTRING, CREATE INDEX ...) and waits for it. Several arguments\n"
      "are joined with blanks into one statement.\n\n"
      "UPDATE FINDEX NAME indexes the rows added since the last build (keys above the\n"
      "highest one indexed); DELETE FROM FINDEX NAME KEY hides a row's key from\n"
      "searches until the next rebuild. Both need keys of 1 and above.\n\n"
      "With --background the statement runs as a background job; the host polls its\n"
      "progress, drawing a bar on a terminal and printing a line per percentage\n"
      "otherwise, then reports the job's error, if any.\n\n"
      "Exit status: 0 done, 1 the statement failed (message on standard error),\n"
      "2 usage error.\n",
      kUsage);
}

void DrawProgress(int32_t percent, bool terminal) {
  if (terminal) {
    const int filled = percent * kBarWidth / 100;
    std::printf("\r[%s%s] %3d%%", std::string(static_cast<std::size_t>(filled), '#').c_str(),
                std::string(static_cast<std::size_t>(kBarWidth - filled), ' ').c_str(), percent);
    if (percent == 100) std::printf("\n");
  } else {
    std::printf("%d%%\n", percent);
  }
  std::fflush(stdout);
}

int RunBackground(HostSession& session, const BSTR* statement) {
  APICommand& command = session.Command();
  if (command.ExecuteEx(statement, VARIANT_FALSE) != S_OK) return session.Fail();
  const bool terminal = platform::IsTerminal(stdout);
  int32_t shown = -1;
  for (;;) {
    int32_t progress = 0;
    if (command.GetProgress(&progress) != S_OK) return session.Fail();
    if (progress != shown) {
      DrawProgress(progress, terminal);
      shown = progress;
    }
    if (progress >= 100) break;
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
  }
  int32_t failed = 0;
  BSTR message;
  if (command.GetErrorNumber(&failed) != S_OK || command.GetErrorMsg(&message) != S_OK) {
    return session.Fail();
  }
  if (failed == 0) return kExitOk;
  return session.Fail(Utf16ToUtf8(message));
}

// The build summary's count of text values cut at max_column_text_mb; the
// trace names each one (findex, key, column).
void ReportCutValues(int64_t before) {
  const int64_t cut = CPiSort::CutValuesInProcess() - before;
  if (cut > 0) {
    std::printf("%lld text value(s) longer than max_column_text_mb were cut there (see the trace)\n",
                static_cast<long long>(cut));
  }
}

int RunExec(const GlobalOptions& global, const std::vector<std::string>& args) {
  HostSession session("exec");
  bool background = false;
  std::string statement;
  for (const std::string& a : args) {
    if (statement.empty() && IsHelpFlag(a)) {
      PrintHelp();
      return kExitOk;
    }
    if (statement.empty() && a == "--background") {
      background = true;
    } else if (statement.empty() && a.rfind("--", 0) == 0) {
      return session.Usage("unknown option: " + a, kUsage);
    } else {
      if (!statement.empty()) statement += ' ';
      statement += a;
    }
  }
  if (statement.empty()) return session.Usage("no statement given", kUsage);
  if (!session.Open(global)) return kExitError;
  const BSTR* text = session.Text(statement);
  const int64_t cut_before = CPiSort::CutValuesInProcess();
  const int result = background ? RunBackground(session, text)
                                : (session.Command().ExecuteEx(text, VARIANT_TRUE) != S_OK
                                       ? session.Fail()
                                       : kExitOk);
  ReportCutValues(cut_before);
  return result;
}

const CommandRegistration kExec{{"exec", kUsage, "run a command statement", RunExec}};

}  // namespace
}  // namespace qm::cli
