// quillmere words FINDEX: the words of a text findex, one a line, in the
// order of its word tree.
#include <cstdint>
#include <cstdio>
#include <limits>
#include <optional>
#include <string>
#include <vector>

#include "argument_list.h"
#include "command_registry.h"
#include "host_session.h"
#include "platform/text_encoding.h"

namespace qm::cli {
namespace {

constexpr const char* kUsage = "words FINDEX [--filter PATTERN] [--start N] [--count N]";

// A line end separates words in every findex built with the default
// separators; one built without them may hold it inside a word, which then
// spans two lines.
constexpr char16_t kSeparator[] = u"\n";

void PrintHelp() {
  std::printf(
      "usage: quillmere [GLOBAL OPTIONS] %s\n\n"
      "Lists the words of the text findex FINDEX, one a line, as they are stored\n"
      "(normalised, upper case) and in their stored order; then those of its add-on\n"
      "findexes, each in its own order.\n\n"
      "--filter   only the words matching PATTERN: * stands for any run of\n"
      "           characters, ? for one character (case does not matter);\n"
      "           default * (every word)\n"
      "--start    the number of the first word listed, counting matching words\n"
      "           from 1 (default 1)\n"
      "--count    how many words at most (default: all); the findex and each of its\n"
      "           add-ons are counted on their own\n\n"
      "Exit status: 0 done, 1 engine error (no such findex, or a findex of numbers\n"
      "or dates), 2 usage error.\n",
      kUsage);
}

int RunWords(const GlobalOptions& global, const std::vector<std::string>& args) {
  HostSession session("words");
  ArgumentList list;
  if (const std::optional<int> done = session.TakeArguments(
          args, {"--filter", "--start", "--count"}, {}, kUsage, PrintHelp, list)) {
    return *done;
  }
  if (list.words.size() != 1) return session.Usage("expected one findex name", kUsage);
  const std::string& findex = list.words[0];
  int32_t start = 1;
  // The engine lists the words numbered start to start + count: one more
  // than count.
  int32_t last_offset = std::numeric_limits<int32_t>::max();
  if (const auto text = list.Last("--start")) {
    const std::optional<int32_t> n = WholeNumber(*text, 1);
    if (!n) return session.Usage("--start takes a number of 1 or more: " + *text, kUsage);
    start = *n;
  }
  if (const auto text = list.Last("--count")) {
    const std::optional<int32_t> n = WholeNumber(*text, 0);
    if (!n) return session.Usage("--count takes a number of 0 or more: " + *text, kUsage);
    last_offset = *n - 1;
  }
  const std::string filter = list.Last("--filter").value_or("*");

  if (!session.OpenSearch(global)) return kExitError;
  if (!session.RequireFindex(findex)) return kExitError;
  if (last_offset < 0) return kExitOk;  // --count 0
  BSTR words;
  const BSTR separator = kSeparator;
  if (session.Search().GetFindexWordsEx(session.Text(findex), start, last_offset,
                                        session.Text(filter), &separator, &words) != S_OK) {
    return session.Fail();
  }
  if (!words.empty()) std::printf("%s\n", Utf16ToUtf8(words).c_str());
  return kExitOk;
}

const CommandRegistration kWords{
    {"words", kUsage, "list the words of a findex", RunWords}};

}  // namespace
}  // namespace qm::cli
