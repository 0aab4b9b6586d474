// CWordPipeline: how the values of one findex become the words it stores,
// configured once from the findex's language and general options. The builder
// feeds it every text value of a build, the search side normalises its words
// through it, and `quillmere analyze` shows its work, so all three agree.
//
// One object serves one build or one search; it reuses its buffers and is not
// shareable between threads.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "text/language.h"
#include "text/language_word_filter.h"
#include "text/word_splitter.h"

namespace qm {

class CGlobalDefs;
struct CIndexHeader;

// The options of a findex that decide how its text is cut and normalised.
struct WordPipelineOptions {
  // General option bits read here; the others do not touch the words.
  static constexpr int32_t kAddDefaultSeparators = 4;
  static constexpr int32_t kRemoveHtml = 16;
  // Every language step bit (CLanguage::kUseStemming ... kUseStopWords).
  static constexpr int32_t kLanguageSteps = 31;

  int32_t language = kDefaultLanguage;
  int32_t language_flags = 0;
  std::u16string separators;  // the separator option text, as stored
  int32_t general_flags = 0;

  static WordPipelineOptions FromHeader(const CIndexHeader& header);
  bool UsesLanguage() const { return (language_flags & kLanguageSteps) != 0; }
};

class CWordPipeline {
 public:
  // Language data from the settings' Language folder (kind 17). Language
  // files are read only when a language step is on; a failed load raises the
  // language object's "Language" error.
  CWordPipeline(const CGlobalDefs& defs, const WordPipelineOptions& options);
  // Language data from language_folder (ending in "/" or not).
  CWordPipeline(std::string language_folder, const WordPipelineOptions& options);
  CWordPipeline(const CWordPipeline&) = delete;
  CWordPipeline& operator=(const CWordPipeline&) = delete;

  // The builder's call per text value: visit(const SplitWord&) for each word
  // that is written, with its normalised form, its position and its code.
  // position is the running word position of the row: each written word
  // moves it on by one and takes it; a sentence end or the end of the value
  // moves it one further, written word or not.
  template <class Visit>
  void WrittenWords(std::u16string_view value, std::int32_t& position, Visit&& visit) {
    splitter_.Split(value, position, [&](const SplitWord& w) {
      if (w.Written()) visit(w);
    });
  }
  // UTF-8 values are read as code points (invalid bytes become U+FFFD).
  template <class Visit>
  void WrittenWords(std::string_view value, std::int32_t& position, Visit&& visit) {
    splitter_.Split(value, position, [&](const SplitWord& w) {
      if (w.Written()) visit(w);
    });
  }

  // Every word the indexer considers, written or not (a dropped word has an
  // empty form and the position as it stands); positions move as above.
  template <class Text, class Visit>
  void ConsideredWords(const Text& value, std::int32_t& position, Visit&& visit) {
    splitter_.Split(value, position, std::forward<Visit>(visit));
  }

  // The form of one word as cut (upper case, trimmed), as a written word
  // would get it; empty for a stop word or a word that normalises to nothing.
  // out must not alias word.
  void Form(std::u16string_view word, std::u16string& out);

  const WordPipelineOptions& Options() const { return options_; }
  // The configured language object, or null when no language step is on.
  const CLanguage* Language() const { return language_.get(); }

 private:
  CWordPipeline(std::unique_ptr<CLanguage> language, const WordPipelineOptions& options);

  WordPipelineOptions options_;
  std::unique_ptr<CLanguage> language_;
  std::optional<CLanguageWordFilter> filter_;
  CWordSplitter splitter_;
};

}  // namespace qm
