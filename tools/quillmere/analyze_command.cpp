// quillmere analyze: shows how a text is cut and normalised for an index, one
// line per word the indexer considers, through the word pipeline the builder
// uses.
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include "command_registry.h"
#include "platform/file_io.h"
#include "platform/text_encoding.h"
#include "base/exception.h"
#include "config/global_defs.h"
#include "base/shipped_data.h"
#include "terminal_text.h"
#include "text/language.h"
#include "text/word_pipeline.h"

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
  bool help = false;

  WordPipelineOptions Pipeline() const {
    WordPipelineOptions p;
    p.language = language;
    p.language_flags = (stemming ? CLanguage::kUseStemming : 0) |
                       (phonetic ? CLanguage::kUsePhonetic : 0) |
                       (accents ? CLanguage::kRemoveAccents : 0) |
                       (translation ? CLanguage::kUseCharacterTranslation : 0) |
                       (stop_words ? CLanguage::kUseStopWords : 0);
    p.separators = Utf8ToUtf16(separators);
    p.general_flags = (default_separators ? WordPipelineOptions::kAddDefaultSeparators : 0) |
                      (html ? WordPipelineOptions::kRemoveHtml : 0);
    return p;
  }
};

constexpr const char* kUsage =
    "analyze [--language N] [--stopwords] [--accents] [--stemming] [--translation] [--phonetic] "
    "[--html] [--separators TEXT] [--no-default-separators]";

void PrintHelp() {
  std::printf(
      "usage: quillmere [--data DIR] %s\n\n"
      "Reads UTF-8 text on standard input and prints one line per word the indexer\n"
      "considers: position<TAB>word as cut<TAB>normalised form. The form is empty for\n"
      "a stop word or a word that normalises to nothing; such words are not indexed\n"
      "and show the position as it stands. A sentence end leaves a gap of one position.\n\n"
      "  --language N               1 Danish, 2 English (default), 3 French, 4 Spanish,\n"
      "                             5 Portuguese, 6 Italian, 7 German, 8 Dutch,\n"
      "                             9 Swedish, 10 Norwegian, 11 Russian, 12 Other\n"
      "  --stopwords --accents --stemming --translation --phonetic\n"
      "                             the language steps of the index\n"
      "  --html                     remove scripts and tags first\n"
      "  --separators TEXT          the separator option (%%NNN, <SPACE>, <TAB>, ...)\n"
      "  --no-default-separators    do not add the default separators\n\n"
      "Language data comes from the data directory's Language folder (--data DIR or\n"
      "the configured path). Without one, or when it has no data for the language,\n"
      "the shipped language data is used and a note on standard error says so.\n",
      kUsage);
}

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
    else if (IsHelpFlag(a)) o.help = true;
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

// The pipeline for the options. Language data comes from the data
// directory's Language folder; when there is no data directory, or its
// Language folder has no data for the language (init not run), the shipped
// language data is used and a note on standard error says so.
std::unique_ptr<CWordPipeline> MakePipeline(const AnalyzeOptions& o, const GlobalOptions& global) {
  const WordPipelineOptions options = o.Pipeline();
  if (!options.UsesLanguage()) return std::make_unique<CWordPipeline>(std::string(), options);

  CGlobalDefs defs;
  if (!global.data_dir.empty()) defs.SetDataPath(global.data_dir);
  const std::string language_folder = std::string(LanguageFolderName(o.language)) + "/";
  std::string why;
  try {
    const std::string folder = defs.GetFolder(FolderKind::Language);
    if (!platform::FileExists(folder + language_folder + "info.txt")) {
      why = folder + " has no " + language_folder + "info.txt";
    }
  } catch (CExceptionBase&) {
    why = "no data directory (--data DIR or the configured path)";
  }
  if (why.empty()) return std::make_unique<CWordPipeline>(defs, options);
  const std::string shipped = ShippedDataFolder("Language/" + language_folder + "info.txt") + "Language/";
  std::fprintf(stderr, "quillmere analyze: %s; using the shipped language data in %s\n",
               why.c_str(), shipped.c_str());
  return std::make_unique<CWordPipeline>(shipped, options);
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
  if (options.help) {
    PrintHelp();
    return kExitOk;
  }
  const std::unique_ptr<CWordPipeline> pipeline = MakePipeline(options, global);
  const std::string text = ReadAll(stdin);

  std::string out;
  std::int32_t position = 0;
  pipeline->ConsideredWords(text, position, [&](const SplitWord& w) {
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
    std::fprintf(stderr, "quillmere analyze: %s", TerminalText(e).c_str());
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
