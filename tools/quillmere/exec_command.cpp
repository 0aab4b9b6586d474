// quillmere exec: runs one command statement through the command object,
// blocking, or as a background job whose progress the host shows.
#include <sys/stat.h>

#include <chrono>
#include <map>
#include <cstdio>
#include <string>
#include <thread>
#include <vector>

#include "base/exception.h"
#include "command/command_translator.h"
#include "command/command_type.h"
#include "command_registry.h"
#include "host_session.h"
#include "index/findex_file_set.h"
#include "index/findex_files.h"
#include "index/order_file_set.h"
#include "index/word_sort.h"
#include "platform/terminal.h"
#include "platform/text_encoding.h"

namespace qm::cli {
namespace {

constexpr const char* kUsage = "exec [--background] [--quiet] STATEMENT";
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
      "When the statement has run, one summary line follows: the time taken and, for\n"
      "a findex build, the rows read and words written by it and the keys the findex\n"
      "now holds (its add-ons included); for an order build the keys of the order:\n"
      "  exec: 1.25 s, 5000 rows read, 69523 words written, 5000 keys in findex PACKAGES\n"
      "--quiet leaves the summary (and the progress of --background) out.\n\n"
      "A statement on a findex or order that is not in the group (UPDATE, DROP,\n"
      "DELETE FROM FINDEX, CREATE FINDEX NAME without a definition) fails with\n"
      "\"no findex NAME in group GROUP\".\n\n"
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

int RunBackground(HostSession& session, const BSTR* statement, bool quiet) {
  APICommand& command = session.Command();
  if (command.ExecuteEx(statement, VARIANT_FALSE) != S_OK) return session.Fail();
  const bool terminal = platform::IsTerminal(stdout);
  int32_t shown = -1;
  for (;;) {
    int32_t progress = 0;
    if (command.GetProgress(&progress) != S_OK) return session.Fail();
    if (progress != shown && !quiet) {
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

// What a statement works on, as the engine's translator reads it; nothing
// for a statement it refuses (the engine reports that when it runs).
struct Target {
  int32_t type = kCmdNotRecognised;
  bool create = false;
  std::string findex;
  std::string order;
};

Target TargetOf(const std::string& statement) {
  CIndexHeader findex;
  COrderInfo order;
  ConnectionSettings connection;
  const IndexOptions index_options;
  const OrderOptions order_options;
  PiCmd cmd(findex, order, connection, index_options, order_options);
  Target target;
  try {
    cmd.TranslateW(Utf8ToUtf16(statement));
  } catch (const CExceptionBase&) {
    return target;
  }
  target.type = cmd.CmdType();
  target.create = cmd.Create() != 0;
  target.findex = findex.IndexName;
  target.order = order.OrderName;
  return target;
}

// False (after the message) when the statement needs a findex or order that
// the group lacks.
bool RequireTarget(HostSession& session, const Target& t) {
  switch (t.type) {
    case kCmdFindexStored:
    case kCmdDropFindex:
    case kCmdDeleteKey: return session.RequireFindex(t.findex);
    case kCmdFindexDefined: return t.create || session.RequireFindex(t.findex);
    case kCmdOrderStored:
    case kCmdDropOrder: return session.RequireOrder(t.order);
    case kCmdOrderDefined: return t.create || session.RequireOrder(t.order);
    default: return true;
  }
}

// One file of a findex as it stands: its header and the identity and change
// time of its .sdx. A rebuild swaps a new file in and an update rewrites it,
// so either moves the stamp even within the second the header's times show.
struct FindexFileState {
  CIndexHeader header;
  ino_t inode = 0;
  int64_t changed_ns = 0;

  bool SameAs(const FindexFileState& other) const {
    return inode == other.inode && changed_ns == other.changed_ns && header == other.header;
  }
};

// The files of a findex and its add-ons, by file name; unreadable ones left out.
std::map<std::string, FindexFileState> FindexStates(CGlobalDefs& defs, const std::string& name) {
  std::map<std::string, FindexFileState> states;
  for (int32_t n = 0;; ++n) {
    const std::string file = n == 0 ? ToUpper(name) : findex::AddOnName(name, n);
    if (!FindexFilesExist(defs, file)) return states;
    try {
      FindexFileState state;
      state.header = ReadFindexHeaderShared(defs, file);
      struct stat info {};
      if (::stat(findex::PathsOf(defs, file).sdx.c_str(), &info) == 0) {
        state.inode = info.st_ino;
        state.changed_ns = int64_t{info.st_mtim.tv_sec} * 1000000000 + info.st_mtim.tv_nsec;
      }
      states.emplace(file, std::move(state));
    } catch (const CExceptionBase&) {
    }
  }
}

// "exec: 1.25 s, ..." for a statement that has run.
std::string Summary(HostSession& session, const Target& t, double seconds,
                    const std::map<std::string, FindexFileState>& before) {
  char time[32];
  std::snprintf(time, sizeof time, "%.2f s", seconds);
  std::string line = "exec: " + std::string(time);
  try {
    if (t.type == kCmdFindexStored || t.type == kCmdFindexDefined) {
      // The files this build wrote are those that changed.
      int64_t rows = 0, words = 0, keys = 0;
      for (const auto& [file, state] : FindexStates(session.Defs(), t.findex)) {
        const CIndexHeader& header = state.header;
        keys += header.KeyCount;
        const auto old = before.find(file);
        if (old != before.end() && old->second.SameAs(state)) continue;
        rows += header.KeyCount;
        words += header.WordCount;
      }
      line += ", " + std::to_string(rows) + " rows read, " + std::to_string(words) +
              " words written, " + std::to_string(keys) + " keys in findex " + ToUpper(t.findex);
    } else if (t.type == kCmdOrderStored || t.type == kCmdOrderDefined) {
      const COrderInfo info = order_files::ReadInfoShared(session.Defs(), t.order);
      line += ", " + std::to_string(info.Count) + " keys in order " + ToUpper(t.order);
    }
  } catch (const CExceptionBase&) {
    // The statement ran; only its figures cannot be read.
  }
  return line;
}

int RunExec(const GlobalOptions& global, const std::vector<std::string>& args) {
  HostSession session("exec");
  bool background = false;
  bool quiet = false;
  std::string statement;
  for (const std::string& a : args) {
    if (statement.empty() && IsHelpFlag(a)) {
      PrintHelp();
      return kExitOk;
    }
    if (statement.empty() && a == "--background") {
      background = true;
    } else if (statement.empty() && a == "--quiet") {
      quiet = true;
    } else if (statement.empty() && a.rfind("--", 0) == 0) {
      return session.Usage("unknown option: " + a, kUsage);
    } else {
      if (!statement.empty()) statement += ' ';
      statement += a;
    }
  }
  if (statement.empty()) return session.Usage("no statement given", kUsage);
  if (!session.Open(global)) return kExitError;
  const Target target = TargetOf(statement);
  if (!RequireTarget(session, target)) return kExitError;
  std::map<std::string, FindexFileState> before;
  if (!quiet && (target.type == kCmdFindexStored || target.type == kCmdFindexDefined)) {
    before = FindexStates(session.Defs(), target.findex);
  }
  const auto start = std::chrono::steady_clock::now();
  const BSTR* text = session.Text(statement);
  const int64_t cut_before = CPiSort::CutValuesInProcess();
  int status = kExitOk;
  if (background) {
    status = RunBackground(session, text, quiet);
  } else if (session.Command().ExecuteEx(text, VARIANT_TRUE) != S_OK) {
    status = session.Fail();
  }
  ReportCutValues(cut_before);
  if (status != kExitOk || quiet) return status;
  const std::chrono::duration<double> taken = std::chrono::steady_clock::now() - start;
  std::printf("%s\n", Summary(session, target, taken.count(), before).c_str());
  return kExitOk;
}

const CommandRegistration kExec{{"exec", kUsage, "run a command statement", RunExec}};

}  // namespace
}  // namespace qm::cli
