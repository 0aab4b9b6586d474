#include "text/phonet.h"

namespace qm::text {

namespace {

// The letters of ISO-8859-1; anything else (including characters that a "<"
// rule writes as placeholders) is a word boundary for the anchors.
bool IsLetter(char16_t c) {
  return (c >= u'A' && c <= u'Z') || (c >= u'a' && c <= u'z') ||
         (c >= 0xC0 && c <= 0xFF && c != 0xD7 && c != 0xF7);
}
bool IsDigit(char16_t c) { return c >= u'0' && c <= u'9'; }
bool EndsLiteral(char16_t c) {
  return IsDigit(c) || c == u'(' || c == u'-' || c == u'<' || c == u'^' || c == u'$';
}

// Bounds-checked reads: 0 past the end, as behind a C string.
char16_t CharAt(std::u16string_view s, std::size_t i) { return i < s.size() ? s[i] : 0; }

std::u16string Latin1(std::string_view bytes) {
  std::u16string out;
  out.reserve(bytes.size());
  for (const char b : bytes) out.push_back(static_cast<unsigned char>(b));
  return out;
}

bool IsBlank(char c) { return c == ' ' || c == '\t'; }

std::string_view TrimBlanks(std::string_view s) {
  while (!s.empty() && IsBlank(s.front())) s.remove_prefix(1);
  while (!s.empty() && IsBlank(s.back())) s.remove_suffix(1);
  return s;
}

bool IsOn(std::string_view value) { return value == "1" || value == "true"; }

}  // namespace

PhonetRules PhonetRules::Parse(std::string_view bytes) {
  PhonetRules rules;
  std::size_t pos = 0;
  while (pos < bytes.size()) {
    std::size_t end = bytes.find('\n', pos);
    if (end == std::string_view::npos) end = bytes.size();
    std::string_view line = bytes.substr(pos, end - pos);
    pos = end + 1;
    if (const auto nul = line.find('\0'); nul != std::string_view::npos) line = line.substr(0, nul);
    // A CR line end is not part of the value.
    if (!line.empty() && line.back() == '\r') line.remove_suffix(1);
    std::size_t i = 0;
    while (i < line.size() && IsBlank(line[i])) ++i;
    if (i == line.size() || line[i] == '#') continue;
    std::size_t f = i;
    while (f < line.size() && !IsBlank(line[f]) && line[f] != '#') ++f;
    const std::string_view key = line.substr(i, f - i);
    // The value runs to a "#" that no backslash escapes; the backslash stays.
    std::size_t v = f;
    while (v < line.size() && !(line[v] == '#' && line[v - 1] != '\\')) ++v;
    const std::string_view value = TrimBlanks(line.substr(f, v - f));
    if (key == "version") continue;
    if (key == "followup") {
      rules.followup_ = IsOn(value);
    } else if (key == "collapse_result") {
      rules.collapse_result_ = IsOn(value);
    } else if (key == "remove_accents") {
      rules.remove_accents_ = IsOn(value);
    } else {
      rules.rules_.push_back(Compile(Latin1(key), value == "_" ? u"" : Latin1(value)));
    }
  }
  // Only the first run of consecutive rules for a character is ever used.
  std::array<bool, 256> seen{};
  const auto count = static_cast<int32_t>(rules.rules_.size());
  for (int32_t n = 0; n < count;) {
    const char16_t c = rules.rules_[static_cast<std::size_t>(n)].pattern[0];
    int32_t m = n + 1;
    while (m < count && rules.rules_[static_cast<std::size_t>(m)].pattern[0] == c) ++m;
    if (!seen[c]) {
      seen[c] = true;
      rules.runs_[c] = Run{n, m, -1};
    }
    n = m;
  }
  rules.BuildCandidates();
  return rules;
}

void PhonetRules::BuildCandidates() {
  int32_t slots = 0;
  for (Run& run : runs_) {
    if (run.begin == run.end) continue;
    run.slot = slots++;
    for (int bucket = 0; bucket < kBuckets; ++bucket) {
      bucket_starts_.push_back(static_cast<uint32_t>(candidates_.size()));
      for (int32_t n = run.begin; n < run.end; ++n) {
        const std::u16string& literal = rules_[static_cast<std::size_t>(n)].literal;
        if (literal.empty() || literal[0] == bucket) candidates_.push_back(n);
      }
    }
    bucket_starts_.push_back(static_cast<uint32_t>(candidates_.size()));
  }
}

PhonetRules::Candidates PhonetRules::CandidatesFor(const Run& run, char16_t next) const {
  const std::size_t at = static_cast<std::size_t>(run.slot) * (kBuckets + 1) +
                         (next < kBuckets - 1 ? next : kBuckets - 1);
  return {candidates_.data() + bucket_starts_[at], candidates_.data() + bucket_starts_[at + 1]};
}

PhonetRules::Rule PhonetRules::Compile(std::u16string pattern, std::u16string replacement) {
  Rule rule;
  const std::u16string_view p = pattern;
  std::size_t s = 1;
  while (s < p.size() && !EndsLiteral(p[s])) ++s;
  rule.literal = p.substr(1, s - 1);
  if (CharAt(p, s) == u'(') {
    rule.has_group = true;
    rule.group = p.substr(s + 1);
    s = p.find(u')', s);
    s = s == std::u16string_view::npos ? p.size() : s + 1;
  }
  while (CharAt(p, s) == u'-') {
    ++rule.dashes;
    ++s;
  }
  if (CharAt(p, s) == u'<') ++s;
  if (IsDigit(CharAt(p, s))) {
    rule.priority = CharAt(p, s) - u'0';
    ++s;
  }
  // Anything but an anchor or the end left here makes a rule that never matches.
  const char16_t rest = CharAt(p, s);
  rule.follow_anchor = rest == 0 ? Anchor::kAnywhere : rest == u'$' ? Anchor::kEnd : Anchor::kNever;
  if (rest == u'^' && CharAt(p, s + 1) == u'^') ++s;
  if (rest == 0) {
    rule.anchor = Anchor::kAnywhere;
  } else if (rest == u'^') {
    rule.anchor = CharAt(p, s + 1) == u'$' ? Anchor::kWholeWord : Anchor::kStart;
  } else if (rest == u'$') {
    rule.anchor = Anchor::kEnd;
  }
  rule.rewrites = p.find(u'<', 1) != std::u16string_view::npos;
  rule.restarts = p.find(u"^^", 1) != std::u16string_view::npos;
  rule.pattern = std::move(pattern);
  rule.replacement = std::move(replacement);
  return rule;
}

int PhonetRules::MatchLetters(const Rule& rule, std::u16string_view w, std::size_t from) {
  const std::size_t n = rule.literal.size();
  if (from + n > w.size() || w.compare(from, n, rule.literal) != 0) return -1;
  if (!rule.has_group) return static_cast<int>(n);
  const char16_t c = CharAt(w, from + n);
  if (!IsLetter(c) || rule.group.find(c) == std::u16string::npos) return -1;
  return static_cast<int>(n) + 1;
}

bool PhonetRules::MatchAt(const Rule& rule, std::u16string_view w, std::size_t i, Match& m) {
  if (rule.anchor == Anchor::kNever) return false;
  const int letters = MatchLetters(rule, w, i + 1);
  if (letters < 0) return false;
  m.full = letters + 1;
  // Dashes never take the match below one letter; a dash beyond that fails it.
  if (rule.dashes > m.full - 1) return false;
  m.consumed = m.full - rule.dashes;
  const bool ends = !IsLetter(CharAt(w, i + static_cast<std::size_t>(m.full)));
  const bool starts = i == 0 || !IsLetter(w[i - 1]);
  switch (rule.anchor) {
    case Anchor::kAnywhere:
      return true;
    case Anchor::kStart:
      return starts;
    case Anchor::kWholeWord:
      return starts && ends;
    case Anchor::kEnd:
      return !starts && ends;  // so never at the first position
    case Anchor::kNever:
      break;
  }
  return false;
}

int PhonetRules::Veto(const Rule& rule, std::u16string_view w, std::size_t i,
                      const Match& m) const {
  const auto k = static_cast<std::size_t>(m.consumed);
  if (!followup_ || m.consumed <= 1 || rule.dashes > 0 || i + k >= w.size()) return -1;
  const char16_t last = w[i + k - 1];
  if (last > 0xFF) return -1;
  const Run& run = runs_[last];
  if (run.slot < 0) return -1;
  const Candidates candidates = CandidatesFor(run, w[i + k]);
  for (const int32_t* n = candidates.begin; n != candidates.end; ++n) {
    const Rule& next = rules_[static_cast<std::size_t>(*n)];
    if (next.follow_anchor == Anchor::kNever) continue;
    const int letters = MatchLetters(next, w, i + k);
    // It must cover more than the current rule and rank no lower.
    if (letters <= 0 || next.priority < rule.priority) continue;
    if (next.follow_anchor == Anchor::kEnd &&
        IsLetter(CharAt(w, i + k + static_cast<std::size_t>(letters)))) {
      continue;
    }
    return next.priority;
  }
  return -1;
}

void PhonetRules::Encode(std::u16string_view word, std::size_t cap, std::u16string& out,
                         std::u16string& work) const {
  out.clear();
  work.assign(word.substr(0, word.find(u'\0')));
  std::u16string& w = work;
  const auto append_checked = [&](char16_t c) {
    if (out.size() < cap && !(collapse_result_ && !out.empty() && out.back() == c)) {
      out.push_back(c);
    }
  };
  std::size_t i = 0;
  bool rewrote = false;          // the last step at i was a "<" rewrite
  bool copy_if_no_rules = false;  // just restarted by a "^^" rule without "<"
  while (i < w.size()) {
    const char16_t c = w[i];
    if (c > 0xFF) {
      out.push_back(c);
      ++i;
      rewrote = copy_if_no_rules = false;
      continue;
    }
    const Run& run = runs_[c];
    if (run.begin == run.end) {
      if (copy_if_no_rules) append_checked(c);
      ++i;
      rewrote = copy_if_no_rules = false;
      continue;
    }
    copy_if_no_rules = false;
    const Rule* chosen = nullptr;
    Match m;
    bool last_vetoed_at_zero = false;
    const Candidates candidates = CandidatesFor(run, i + 1 < w.size() ? w[i + 1] : 0);
    for (const int32_t* n = candidates.begin; n != candidates.end; ++n) {
      const Rule& rule = rules_[static_cast<std::size_t>(*n)];
      last_vetoed_at_zero = false;
      if (!MatchAt(rule, w, i, m)) continue;
      const int veto = Veto(rule, w, i, m);
      if (veto >= 0) {
        // Only the run's very last rule counts; the rules skipped after it never match.
        last_vetoed_at_zero = veto == 0 && *n == run.end - 1;
        continue;
      }
      chosen = &rule;
      break;
    }
    if (chosen == nullptr) {
      // A run whose last rule lost a veto between two priority-0 rules keeps the letter.
      if (last_vetoed_at_zero) append_checked(c);
      ++i;
      rewrote = false;
      continue;
    }
    const std::u16string& rep = chosen->replacement;
    const auto k = static_cast<std::size_t>(m.consumed);
    if (chosen->rewrites && !rewrote) {
      if (!out.empty() && !rep.empty() && (out.back() == c || out.back() == rep[0])) {
        out.pop_back();
      }
      // The replacement overwrites the word from i on, never growing it.
      std::size_t written = 0;
      while (written < rep.size() && i + written < w.size()) {
        w[i + written] = rep[written];
        ++written;
      }
      if (k > written) w.erase(i + written, k - written);
      rewrote = true;
      continue;
    }
    i += k - 1;
    rewrote = false;
    for (std::size_t j = 0; j + 1 < rep.size() && out.size() < cap; ++j) {
      if (out.empty() || out.back() != rep[j]) out.push_back(rep[j]);
    }
    if (chosen->restarts) {
      if (!rep.empty()) out.push_back(rep.back());
      w.erase(0, i + 1);
      i = 0;
      copy_if_no_rules = !chosen->rewrites;
      continue;
    }
    if (!chosen->rewrites && !rep.empty()) append_checked(rep.back());
    ++i;
  }
}

}  // namespace qm::text
