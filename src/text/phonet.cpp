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

// Reads the literal run and the optional group of pattern from position s,
// comparing against w from position i + k; advances s and k.
void MatchLiteralAndGroup(std::u16string_view pattern, std::u16string_view w, std::size_t i,
                          std::size_t& s, int& k) {
  while (CharAt(pattern, s) != 0 && CharAt(w, i + k) == CharAt(pattern, s) &&
         !EndsLiteral(CharAt(pattern, s))) {
    ++k;
    ++s;
  }
  if (CharAt(pattern, s) == u'(') {
    const char16_t c = CharAt(w, i + k);
    if (IsLetter(c) && pattern.find(c, s + 1) != std::u16string_view::npos) {
      ++k;
      while (s < pattern.size() && pattern[s] != u')') ++s;
      if (s < pattern.size()) ++s;
    }
  }
}

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
      Rule rule;
      rule.pattern = Latin1(key);
      if (value != "_") rule.replacement = Latin1(value);
      rule.rewrites = rule.pattern.find(u'<', 1) != std::u16string::npos;
      rule.restarts = rule.pattern.find(u"^^", 1) != std::u16string::npos;
      rules.rules_.push_back(std::move(rule));
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
      rules.runs_[c] = Run{n, m};
    }
    n = m;
  }
  return rules;
}

bool PhonetRules::MatchAt(const Rule& rule, std::u16string_view w, std::size_t i,
                          Match& m) const {
  const std::u16string_view p = rule.pattern;
  std::size_t s = 1;
  int k = 1;
  MatchLiteralAndGroup(p, w, i, s, k);
  m.has_dash = CharAt(p, s) == u'-';
  m.full = k;
  while (CharAt(p, s) == u'-' && k > 1) {
    --k;
    ++s;
  }
  m.consumed = k;
  if (CharAt(p, s) == u'<') ++s;
  m.priority = 5;
  if (IsDigit(CharAt(p, s))) {
    m.priority = CharAt(p, s) - u'0';
    ++s;
  }
  if (CharAt(p, s) == u'^' && CharAt(p, s + 1) == u'^') ++s;
  const char16_t rest = CharAt(p, s);
  if (rest == 0) return true;
  const std::size_t after = i + static_cast<std::size_t>(m.full);
  if (rest == u'^') {
    return (i == 0 || !IsLetter(w[i - 1])) &&
           (CharAt(p, s + 1) != u'$' || !IsLetter(CharAt(w, after)));
  }
  if (rest == u'$') return i > 0 && IsLetter(w[i - 1]) && !IsLetter(CharAt(w, after));
  return false;
}

int PhonetRules::Veto(std::u16string_view w, std::size_t i, const Match& m) const {
  const auto k = static_cast<std::size_t>(m.consumed);
  if (!followup_ || m.consumed <= 1 || m.has_dash || i + k >= w.size()) return -1;
  const char16_t last = w[i + k - 1];
  if (last > 0xFF) return -1;
  const Run run = runs_[last];
  for (int32_t n = run.begin; n < run.end; ++n) {
    const std::u16string_view p = rules_[static_cast<std::size_t>(n)].pattern;
    std::size_t s = 1;
    int k2 = m.consumed;
    MatchLiteralAndGroup(p, w, i, s, k2);
    while (CharAt(p, s) == u'-') ++s;
    if (CharAt(p, s) == u'<') ++s;
    int priority = 5;
    if (IsDigit(CharAt(p, s))) {
      priority = CharAt(p, s) - u'0';
      ++s;
    }
    const char16_t rest = CharAt(p, s);
    const bool fits = rest == 0 ||
                      (rest == u'$' && !IsLetter(CharAt(w, i + static_cast<std::size_t>(k2))));
    if (!fits || k2 == m.consumed || priority < m.priority) continue;
    return priority;
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
    const Run run = runs_[c];
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
    for (int32_t n = run.begin; n < run.end; ++n) {
      const Rule& rule = rules_[static_cast<std::size_t>(n)];
      last_vetoed_at_zero = false;
      if (!MatchAt(rule, w, i, m)) continue;
      const int veto = Veto(w, i, m);
      if (veto >= 0) {
        last_vetoed_at_zero = veto == 0;
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
