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

  bool Followup() const { return followup_; }
  bool CollapseResult() const { return collapse_result_; }
  // Read for completeness; accents are removed (or not) before the rules run.
  bool RemoveAccents() const { return remove_accents_; }
  std::size_t RuleCount() const { return rules_.size(); }

 private:
  struct Rule {
    std::u16string pattern;
    std::u16string replacement;
    bool rewrites = false;      // "<" after the first character
    bool restarts = false;      // "^^" after the first character
  };
  struct Run {
    int32_t begin = 0;
    int32_t end = 0;  // empty run: no rule for the character
  };
  struct Match {
    int consumed = 0;     // letters the rule takes
    int full = 0;         // with the context letters
    int priority = 5;
    bool has_dash = false;
  };

  bool MatchAt(const Rule& rule, std::u16string_view w, std::size_t i, Match& m) const;
  // The priority of a follow-up rule that vetoes m, or -1.
  int Veto(std::u16string_view w, std::size_t i, const Match& m) const;

  std::vector<Rule> rules_;
  std::array<Run, 256> runs_{};
  bool followup_ = true;
  bool collapse_result_ = false;
  bool remove_accents_ = true;
};

}  // namespace qm::text
