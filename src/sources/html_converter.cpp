#include "sources/html_converter.h"

#include "platform/text_encoding.h"
#include "base/exception_family.h"

namespace qm {

namespace {

constexpr std::string_view kScriptEnd = "</script";

// Tag markup is split at any ASCII white space, so tags written over several
// lines work like tags written on one.
bool IsBlank(char c) { return c == ' ' || c == '\t' || c == '\n' || c == '\r' || c == '\f'; }

char AsciiLower(char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; }

bool EqualsIgnoreCase(std::string_view text, std::string_view lower) {
  if (text.size() != lower.size()) return false;
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (AsciiLower(text[i]) != lower[i]) return false;
  }
  return true;
}

bool IsAscii(std::string_view text) {
  for (char c : text) {
    if (static_cast<unsigned char>(c) >= 0x80) return false;
  }
  return true;
}

std::string UpperName(std::string_view name) {
  return IsAscii(name) ? AsciiUpper(name) : ToUpper(name);
}

// Where the script that starts at `from` ends: just after its closing tag
// ("</script" in any case, then blanks or "/" up to ">"), or the end of html.
std::size_t SkipScript(std::string_view html, std::size_t from) {
  std::size_t pos = from;
  while ((pos = html.find('<', pos)) != std::string_view::npos) {
    if (EqualsIgnoreCase(html.substr(pos, kScriptEnd.size()), kScriptEnd)) {
      const std::size_t after = pos + kScriptEnd.size();
      if (after == html.size()) return after;
      const char c = html[after];
      if (c == '>' || c == '/' || IsBlank(c)) {
        const std::size_t gt = html.find('>', after);
        return gt == std::string_view::npos ? html.size() : gt + 1;
      }
    }
    ++pos;
  }
  return html.size();
}

// Splits META attributes at blanks, double quotes and "=", as strtok would:
// empty tokens are skipped and the one delimiter after a token is consumed.
class MetaTokens {
 public:
  explicit MetaTokens(std::string_view tag) : tag_(tag) {}

  bool Next(std::string_view& token) {
    while (pos_ < tag_.size() && IsDelimiter(tag_[pos_])) ++pos_;
    if (pos_ >= tag_.size()) return false;
    const std::size_t start = pos_;
    while (pos_ < tag_.size() && !IsDelimiter(tag_[pos_])) ++pos_;
    token = tag_.substr(start, pos_ - start);
    if (pos_ < tag_.size()) ++pos_;
    return true;
  }

  // The value after CONTENT: tokens split at double quotes only, skipping
  // any made only of blanks, "=" and double quotes.
  std::string_view NextContent() {
    while (pos_ < tag_.size()) {
      while (pos_ < tag_.size() && tag_[pos_] == '"') ++pos_;
      if (pos_ >= tag_.size()) break;
      const std::size_t start = pos_;
      while (pos_ < tag_.size() && tag_[pos_] != '"') ++pos_;
      const std::string_view token = tag_.substr(start, pos_ - start);
      if (pos_ < tag_.size()) ++pos_;
      if (!OnlyFiller(token)) return token;
    }
    return {};
  }

 private:
  static bool IsDelimiter(char c) { return IsBlank(c) || c == '"' || c == '='; }
  static bool OnlyFiller(std::string_view token) {
    for (char c : token) {
      if (!IsDelimiter(c)) return false;
    }
    return true;
  }

  std::string_view tag_;
  std::size_t pos_ = 0;
};

void StoreMeta(std::string_view tag, FieldMap& fields) {
  MetaTokens tokens(tag);
  std::string name;
  std::string content;
  std::string_view token;
  while (tokens.Next(token)) {
    if (EqualsIgnoreCase(token, "name")) {
      if (tokens.Next(token)) name = UpperName(token);
    } else if (EqualsIgnoreCase(token, "content")) {
      content = tokens.NextContent();
    }
  }
  if (name.empty()) return;
  if (name == "DESCRIPTION") fields[kFieldSummary] = content;
  fields[std::move(name)] = std::move(content);
}

}  // namespace

std::string NormalizeHtmlText(std::string_view text) {
  std::string out;
  out.reserve(text.size());
  for (std::size_t i = 0; i < text.size(); ++i) {
    char c = text[i];
    if (static_cast<unsigned char>(c) < 32) {
      c = ' ';
    } else if (c == '&' && EqualsIgnoreCase(text.substr(i + 1, 5), "nbsp;")) {
      c = ' ';
      i += 5;
    }
    if (c == ' ' && (out.empty() || out.back() == ' ')) continue;
    out.push_back(c);
  }
  if (!out.empty() && out.back() == ' ') out.pop_back();
  return out;
}

void Converter::Convert(std::string_view html, FieldMap& fields) const {
  Guard<CConverterException, CConverterUnknownException>("Convert", [&] {
    std::string plain;
    plain.reserve(html.size());
    std::size_t pos = 0;
    for (;;) {
      const std::size_t lt = html.find('<', pos);
      if (lt == std::string_view::npos) break;
      const std::size_t gt = html.find('>', lt + 1);
      if (gt == std::string_view::npos) break;  // not a tag: the rest is text
      const std::string_view text = html.substr(pos, lt - pos);
      const std::string_view tag = html.substr(lt + 1, gt - lt - 1);
      pos = gt + 1;

      if (!text.empty()) {
        plain.append(text);
        plain.push_back(' ');
      }
      std::size_t name_end = 0;
      while (name_end < tag.size() && !IsBlank(tag[name_end]) && tag[name_end] != '=') ++name_end;
      if (name_end > kMaxTagName) continue;
      const std::string name = UpperName(tag.substr(0, name_end));

      if (name == "SCRIPT") {
        pos = SkipScript(html, pos);
      } else if (name.size() > 1 && name[0] == '/') {
        std::string value = NormalizeHtmlText(text);
        if (name == "/TITLE") fields[kFieldTitle] = value;
        fields[name.substr(1)] = std::move(value);
      } else if (name == "META") {
        StoreMeta(tag, fields);
      }
    }
    if (pos < html.size()) plain.append(html.substr(pos));
    fields[kFieldPlainText] = NormalizeHtmlText(plain);
  });
}

}  // namespace qm
