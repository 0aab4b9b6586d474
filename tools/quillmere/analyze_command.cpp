// quillmere analyze: shows how a text is cut and normalised for an index, one
// line per word the indexer considers, through the splitter the builder uses.
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include "command_registry.h"
#include "platform/text_encoding.h"
#include "shared/exception.h"
#include "text/separators.h"
#include "text/word_filter.h"
#include "text/word_splitter.h"

namespace qm::cli {
namespace {

struct AnalyzeOptions {
  int language = 2;
  bool stop_words = false;
  bool accents = false;
  bool stemming = false;
  bool translation = false;
  bool phonetic = false;
  bool html = false;
  std::string separators;
  bool default_separators = true;

  bool AnyLanguageStep() const { return stop_words || accents || stemming || translation || phonetic; }
};

constexpr const char* kUsage =
    "analyze [--language N] [--stopwords] [--accents] [--stemming] [--translation] [--phonetic] "
    "[--html] [--separators TEXT] [--no-default-separators]";

int UsageError(const std::string& what) {
  std::fprintf(stderr, "quillmere analyze: %s\nusage: quillmere [--data DIR] %s\n", what.c_str(), kUsage);
  return kExitUsage;
}

bool ParseOptions(const std::vector<std::string>& args, AnalyzeOptions& o, std::string& error) {
  for (std::size_t i = 0; i < args.size(); ++i) {
    const std::string& a = args[i];
    if (a == "--stopwords") o.stop_words = true;
    else if (a == "--accents") o.accents = true;
    else if (a == "--stemming") o.stemming = true;
    else if (a == "--translation") o.translation = true;
    else if (a == "--phonetic") o.phonetic = true;
    else if (a == "--html") o.html = true;
    else if (a == "--no-default-separators") o.default_separators = false;
    else if (a == "--separators" || a == "--language") {
      if (i + 1 >= args.size()) {
        error = a + " needs a value";
        return false;
      }
      const std::string& value = args[++i];
      if (a == "--separators") {
        o.separators = value;
        continue;
      }
      char* end = nullptr;
      const long n = std::strtol(value.c_str(), &end, 10);
      if (value.empty() || *end != '\0' || n < 1 || n > 12) {
        error = "--language takes a number from 1 to 12";
        return false;
      }
      o.language = static_cast<int>(n);
    } else {
      error = "unknown option: " + a;
      return false;
    }
  }
  return true;
}

// THE place where the language steps plug in: the normaliser for the options,
// or null when no language step is asked for. The language object is not part
// of the engine yet, so asking for a step is refused rather than ignored.
std::unique_ptr<CWordFilter> MakeLanguageFilter(const AnalyzeOptions& o, const GlobalOptions& /*global*/,
                                                std::string& error) {
  if (!o.AnyLanguageStep()) return nullptr;
  error = "language processing (--stopwords, --accents, --stemming, --translation, --phonetic) "
          "is not available in this build";
  return nullptr;
}

std::string ReadAll(std::FILE* in) {
  std::string text;
  char buffer[65536];
  std::size_t n;
  while ((n = std::fread(buffer, 1, sizeof buffer, in)) > 0) text.append(buffer, n);
  return text;
}

int Analyze(const GlobalOptions& global, const std::vector<std::string>& args) {
  AnalyzeOptions options;
  std::string error;
  if (!ParseOptions(args, options, error)) return UsageError(error);
  std::unique_ptr<CWordFilter> filter = MakeLanguageFilter(options, global, error);
  if (!error.empty()) {
    std::fprintf(stderr, "quillmere analyze: %s\n", error.c_str());
    return kExitError;
  }

  CWordSplitter splitter(
      CSeparatorSet(BuildSeparators(Utf8ToUtf16(options.separators), options.default_separators)),
      options.html, filter.get());
  const std::string text = ReadAll(stdin);

  std::string out;
  std::int32_t position = 0;
  splitter.Split(text, position, [&](const SplitWord& w) {
    out += std::to_string(w.position);
    out += '\t';
    AppendUtf16AsUtf8(w.cut, out);
    out += '\t';
    AppendUtf16AsUtf8(w.form, out);
    out += '\n';
    if (out.size() >= 65536) {
      std::fwrite(out.data(), 1, out.size(), stdout);
      out.clear();
    }
  });
  std::fwrite(out.data(), 1, out.size(), stdout);
  return std::fflush(stdout) == 0 ? kExitOk : kExitError;
}

int RunAnalyze(const GlobalOptions& global, const std::vector<std::string>& args) {
  try {
    return Analyze(global, args);
  } catch (CExceptionBase& e) {
    std::fprintf(stderr, "quillmere analyze: %s", e.GetFullTextUtf8(kLevelWritten).c_str());
    return kExitError;
  }
}

const CommandRegistration kRegistration({
    "analyze",
    kUsage,
    "print how standard input is cut into words: position, word, normalised form",
    RunAnalyze,
});

}  // namespace
}  // namespace qm::cli
