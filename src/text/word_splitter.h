// CWordSplitter: the preparation and splitting of one text value, shared by
// the index builder, the search side and the analyze command, so that all of
// them cut and number words alike.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <utility>

#include "text/next_word.h"
#include "text/separators.h"
#include "text/word_filter.h"

namespace qm {

// One word the indexer considers (a trimmed, non-empty word that is not made
// of separators alone).
struct SplitWord {
  std::u16string_view cut;   // upper case, trimmed
  std::u16string_view form;  // normalised form; empty when the word is not written
  std::int32_t position = 0; // the word's position when written, else the position as it stands
  NextWordCode code = NextWordCode::kWord;
  bool Written() const { return !form.empty(); }
};

class CWordSplitter {
 public:
  // filter may be null (no language steps: the form is the word as cut); it
  // must outlive the splitter.
  CWordSplitter(CSeparatorSet separators, bool remove_html, CWordFilter* filter = nullptr)
      : separators_(std::move(separators)), remove_html_(remove_html), filter_(filter) {}

  // Splits one value: upper-cases it character by character, removes scripts
  // and tags when asked, appends a blank and takes its words. position is the
  // caller's running word position: each written word moves it on by one and
  // takes the new value; a sentence end or the end of the text moves it one
  // further, whether or not that word was written. visit(const SplitWord&) is
  // called for every word considered; the views live until the next call.
  template <class Visit>
  void Split(std::u16string_view value, std::int32_t& position, Visit&& visit) {
    text_.assign(value);
    Run(position, visit);
  }
  // UTF-8 text is read as code points (invalid bytes become U+FFFD).
  template <class Visit>
  void Split(std::string_view utf8_value, std::int32_t& position, Visit&& visit) {
    text_.clear();
    AppendUtf8(utf8_value);
    Run(position, visit);
  }

  const CSeparatorSet& Separators() const { return separators_; }

 private:
  template <class Visit>
  void Run(std::int32_t& position, Visit& visit) {
    Prepare();
    std::u16string_view rest = text_;
    SplitWord word;
    while (Next(rest, position, word)) visit(std::as_const(word));
  }

  void AppendUtf8(std::string_view utf8);
  // Upper case, scripts and tags, the appended blank; in text_.
  void Prepare();
  // The next considered word from rest, false at the end.
  bool Next(std::u16string_view& rest, std::int32_t& position, SplitWord& out);

  CSeparatorSet separators_;
  bool remove_html_;
  CWordFilter* filter_;
  std::u16string text_;
  std::u16string form_;
  CWordBuffer word_;
};

}  // namespace qm
