// quillmere repl [--json]: one command object and one search object kept
// alive across lines of calls read from standard input, each answered on one
// line; all calls go through the C interface.
#include <cmath>
#include <cstdio>
#include <iostream>
#include <optional>
#include <string>
#include <vector>

#include "argument_list.h"
#include "command_registry.h"
#include "dispatch_object.h"
#include "host_session.h"
#include "json_text.h"
#include "platform/terminal.h"
#include "platform/text_encoding.h"
#include "shell_words.h"
#include "terminal_text.h"

namespace qm::cli {
namespace {

constexpr const char* kUsage = "repl [--json]";

void PrintHelp() {
  std::printf(
      "usage: quillmere [GLOBAL OPTIONS] %s\n\n"
      "Keeps one APICommand and one APISearch alive and calls their methods through\n"
      "the C interface, one call a line, read from standard input (a terminal or a\n"
      "pipe) until its end:\n\n"
      "  OBJECT.METHOD [ARG]...\n\n"
      "OBJECT is APICommand or APISearch (or one of their ProgIDs), in any case;\n"
      "METHOD and the arguments are those of quillmere call (see quillmere call\n"
      "--help for how each argument converts). Words split as a shell splits them:\n"
      "'...' keeps everything, \"...\" everything but a backslash before \" or \\, and\n"
      "a backslash outside quotes keeps the next character. An unquoted null is the\n"
      "null text; 'null' is the four letters. Blank lines and lines whose first\n"
      "character (after blanks) is # are skipped.\n\n"
      "--data and --group are applied to both objects through SetDataPath and\n"
      "SetGroup, --connect or --dsn to the command object through\n"
      "SetDBConnectionStringEx; nothing else is set up (no saved default options).\n\n"
      "Each line gets one answer line, written at once:\n"
      "  the result as quillmere call prints it, or an empty line for a method\n"
      "  without one;\n"
      "  ! DESCRIPTION when the call failed or refused, or could not be made (a\n"
      "  quote not closed, an unknown object or method, a wrong argument).\n"
      "A backslash, line feed or carriage return in either shows as \\\\, \\n or \\r.\n\n"
      "--json: each answer is one JSON object instead,\n"
      "  {\"result\": RESULT, \"out\": [], \"error\": null}\n"
      "  {\"result\": null, \"out\": [], \"error\": \"DESCRIPTION\"}\n"
      "RESULT is a number for an integer or a double (null for a double that is not\n"
      "finite), true (-1) or false (0) for a boolean, any other boolean value as its\n"
      "number (1 stays 1), a string for a text, or null for a method without a\n"
      "result. \"out\" lists out parameters other than the result: no method of the\n"
      "two interfaces has one, so it is empty.\n\n"
      "Exit status: 0 at the end of the input, 1 when the objects cannot be created\n"
      "or set up, 2 usage error.\n",
      kUsage);
}

bool SameText(std::string_view a, std::string_view b) { return ToUpper(a) == ToUpper(b); }

// text on one line: backslashes, line feeds and carriage returns escaped.
std::string OneLine(std::string_view text) {
  std::string out;
  for (const char c : text) {
    switch (c) {
      case '\\': out += "\\\\"; break;
      case '\n': out += "\\n"; break;
      case '\r': out += "\\r"; break;
      default: out += c;
    }
  }
  return out;
}

// An error description without the message chain's "\r\n" and the last line end.
std::string Description(std::string text) {
  text = TerminalLines(std::move(text));
  while (!text.empty() && text.back() == '\n') text.pop_back();
  return text;
}

std::string JsonValue(const CallValue& value) {
  switch (value.type) {
    case QM_VT_R8: return std::isfinite(value.r8) ? ValueText(value) : "null";
    case QM_VT_UTF8: return JsonString(value.text);
    case QM_VT_I4:
    case QM_VT_BOOL: return ValueText(value);
    default: return "null";
  }
}

std::string AnswerLine(const CallOutcome& outcome, bool json) {
  const bool done = outcome.status == CallOutcome::Status::Done;
  if (json) {
    return std::string("{\"result\": ") +
           (done && outcome.has_result ? JsonValue(outcome.result) : "null") +
           ", \"out\": [], \"error\": " +
           (done ? "null" : JsonString(Description(outcome.error))) + "}";
  }
  if (!done) return "! " + OneLine(Description(outcome.error));
  return outcome.has_result ? OneLine(ValueText(outcome.result)) : std::string();
}

class Repl {
 public:
  Repl(DispatchObject command, DispatchObject search)
      : command_(std::move(command)), search_(std::move(search)) {}

  CallOutcome Run(std::string_view line) {
    CallOutcome outcome;
    outcome.status = CallOutcome::Status::Usage;
    std::vector<ShellWord> words;
    if (!SplitShellWords(line, words, outcome.error)) return outcome;
    if (words.empty()) {
      outcome.error = "expected OBJECT.METHOD";
      return outcome;
    }
    const std::string& head = words.front().text;
    const std::size_t dot = head.rfind('.');
    if (dot == std::string::npos) {
      outcome.error = "expected OBJECT.METHOD, not '" + head + "'";
      return outcome;
    }
    DispatchObject* object = Object(std::string_view(head).substr(0, dot));
    if (object == nullptr) {
      outcome.error = "unknown object '" + head.substr(0, dot) + "' (APICommand or APISearch)";
      return outcome;
    }
    std::vector<CallArgument> args;
    for (std::size_t i = 1; i < words.size(); ++i) {
      args.push_back({words[i].text, !words[i].quoted && words[i].text == "null"});
    }
    return object->Call(std::string_view(head).substr(dot + 1), args);
  }

 private:
  DispatchObject* Object(std::string_view name) {
    for (const char* known : {"APICommand", QM_PROGID_APICOMMAND, QM_PROGID_APICOMMAND_INDEPENDENT}) {
      if (SameText(name, known)) return &command_;
    }
    for (const char* known : {"APISearch", QM_PROGID_APISEARCH, QM_PROGID_APISEARCH_INDEPENDENT}) {
      if (SameText(name, known)) return &search_;
    }
    return nullptr;
  }

  DispatchObject command_;
  DispatchObject search_;
};

// Whether a line holds no call: blank, or a comment.
bool Skipped(std::string_view line) {
  const std::size_t first = line.find_first_not_of(" \t\r");
  return first == std::string_view::npos || line[first] == '#';
}

int RunRepl(const GlobalOptions& global, const std::vector<std::string>& args) {
  HostSession session("repl");
  ArgumentList list;
  if (const std::optional<int> done =
          session.TakeArguments(args, {}, {"--json"}, kUsage, PrintHelp, list)) {
    return *done;
  }
  if (!list.words.empty()) return session.Usage("unexpected argument: " + list.words[0], kUsage);
  const bool json = list.Has("--json");

  std::string failure;
  std::optional<DispatchObject> command = DispatchObject::Create("APICommand", failure);
  std::optional<DispatchObject> search;
  if (command) search = DispatchObject::Create("APISearch", failure);
  if (!search || !command->Apply(global, failure) || !search->Apply(global, failure)) {
    return session.Fail(failure);
  }
  Repl repl(std::move(*command), std::move(*search));

  const bool prompt = platform::IsTerminal(stdin) && platform::IsTerminal(stdout);
  std::string line;
  while (true) {
    if (prompt) {
      std::fputs("quillmere> ", stdout);
      std::fflush(stdout);
    }
    if (!std::getline(std::cin, line)) break;
    if (Skipped(line)) continue;
    const std::string answer = AnswerLine(repl.Run(line), json) + "\n";
    std::fwrite(answer.data(), 1, answer.size(), stdout);
    std::fflush(stdout);
  }
  if (prompt) std::fputs("\n", stdout);
  return kExitOk;
}

const CommandRegistration kRepl{
    {"repl", kUsage, "call API methods line by line on two live objects", RunRepl}};

}  // namespace
}  // namespace qm::cli
