// The phonet rule engine: a rule file (1.dat) of patterns and replacements
// that turns an upper-case word into a phonetic code.
//
// Rule file: ISO-8859-1 lines; blank lines and lines starting with "#" are
// comments; "version", "followup", "collapse_result" and "remove_accents" are
// keywords; every other line is "PATTERN REPLACEMENT" ("_" = empty). Patterns:
// a literal run, an optional letter group "(...)", dashes for context letters,
// "<" to rewrite the word, a priority digit, and "^", "^^" or "$" anchors.
// Only the first run of consecutive rules starting with a character is used.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace qm::text {

class PhonetRules {
 public:
  // Never fails: lines that are not keywords are rules, and a broken rule
  // simply never matches.
  static PhonetRules Parse(std::string_view bytes);

  // Replaces out by the code of an upper-case word. The code holds at most cap
  // characters except where a "^^" rule restarts the word. Characters above
  // code 255, which no rule can name, are copied to the code unchanged.
  // work is a reusable buffer.
  void Encode(std::u16string_view word, std::size_t cap, std::u16string& out,
              std::u16string& work) const;
  void Encode(std::u16string_view word, std::u16string& out, std::u16string& work) const {
    Encode(word, word.size(), out, work);
  }

  // Read for completeness; accents are removed (or not) before the rules run.
  bool RemoveAccents() const { return remove_accents_; }

 private:
  // Where a pattern must stand once its letters matched.
  enum class Anchor : uint8_t { kAnywhere, kStart, kWholeWord, kEnd, kNever };
  struct Rule {
    std::u16string pattern;
    std::u16string replacement;
    // The pattern taken apart once, when the file is read.
    std::u16string literal;  // letters after the first, up to a marker
    std::u16string group;    // everything after "(": the next letter must be in it
    bool has_group = false;
    int dashes = 0;          // context letters at the end of the match
    int priority = 5;
    Anchor anchor = Anchor::kNever;         // as the chosen rule
    Anchor follow_anchor = Anchor::kNever;  // as a follow-up rule: kAnywhere, kEnd or kNever
    bool rewrites = false;   // "<" after the first character
    bool restarts = false;   // "^^" after the first character
  };
  struct Run {
    int32_t begin = 0;
    int32_t end = 0;  // empty run: no rule for the character
    int32_t slot = -1;
  };
  // The rules of a run that can match when `next` follows its character: those
  // with no literal letters and those whose first literal letter is `next`, in
  // file order. Position past the end of the word: next = 0.
  struct Candidates {
    const int32_t* begin;
    const int32_t* end;
  };
  Candidates CandidatesFor(const Run& run, char16_t next) const;
  void BuildCandidates();
  static constexpr int kBuckets = 257;  // 0-255, and 256 for any other character
  struct Match {
    int consumed = 0;  // letters the rule takes
    int full = 0;      // with the context letters
  };

  static Rule Compile(std::u16string pattern, std::u16string replacement);
  // Letters matched by the literal run and group of rule against w from `from`
  // on (the rule's first character not counted), or -1.
  static int MatchLetters(const Rule& rule, std::u16string_view w, std::size_t from);
  static bool MatchAt(const Rule& rule, std::u16string_view w, std::size_t i, Match& m);
  // The priority of a follow-up rule that vetoes rule, or -1.
  int Veto(const Rule& rule, std::u16string_view w, std::size_t i, const Match& m) const;

  std::vector<Rule> rules_;
  std::array<Run, 256> runs_{};
  std::vector<int32_t> candidates_;
  std::vector<uint32_t> bucket_starts_;  // per run slot, kBuckets + 1 offsets
  bool followup_ = true;
  bool collapse_result_ = false;
  bool remove_accents_ = true;
};

}  // namespace qm::text
