#include "text/word_pipeline.h"

#include "config/global_defs.h"
#include "format/index_header.h"
#include "text/separators.h"

namespace qm {

namespace {

CSeparatorSet SeparatorsOf(const WordPipelineOptions& options) {
  return CSeparatorSet(BuildSeparators(
      options.separators, (options.general_flags & WordPipelineOptions::kAddDefaultSeparators) != 0));
}

std::unique_ptr<CLanguage> Loaded(std::unique_ptr<CLanguage> language,
                                  const WordPipelineOptions& options) {
  if (language) {
    language->LoadLanguage(options.language,
                           options.language_flags & WordPipelineOptions::kLanguageSteps);
  }
  return language;
}

std::optional<CLanguageWordFilter> FilterOver(CLanguage* language) {
  if (language == nullptr) return std::nullopt;
  return CLanguageWordFilter(*language);
}

}  // namespace

WordPipelineOptions WordPipelineOptions::FromHeader(const CIndexHeader& header) {
  WordPipelineOptions options;
  options.language = header.Language;
  options.language_flags = header.LanguageFlags;
  options.separators = header.Separators;
  options.general_flags = header.GeneralFlags;
  return options;
}

CWordPipeline::CWordPipeline(const CGlobalDefs& defs, const WordPipelineOptions& options)
    // Without a language step the words are written as cut and no language
    // file is needed.
    : CWordPipeline(options.UsesLanguage() ? std::make_unique<CLanguage>(defs) : nullptr,
                    options) {}

CWordPipeline::CWordPipeline(std::string language_folder, const WordPipelineOptions& options)
    : CWordPipeline(
          options.UsesLanguage() ? std::make_unique<CLanguage>(std::move(language_folder)) : nullptr,
          options) {}

CWordPipeline::CWordPipeline(std::unique_ptr<CLanguage> language,
                             const WordPipelineOptions& options)
    : options_(options),
      language_(Loaded(std::move(language), options)),
      filter_(FilterOver(language_.get())),
      splitter_(SeparatorsOf(options), (options.general_flags & WordPipelineOptions::kRemoveHtml) != 0,
                filter_ ? &*filter_ : nullptr) {}

void CWordPipeline::Form(std::u16string_view word, std::u16string& out) {
  if (!filter_) {
    out.assign(word);
  } else if (filter_->IsStopWord(word)) {
    out.clear();
  } else {
    filter_->Normalise(word, out);
  }
}

}  // namespace qm
