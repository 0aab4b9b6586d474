#include "base/tokenizer.h"

#include "base/exception_family.h"

namespace qm {

bool GetToken(std::string& source, std::string& token, char delimiter, bool drop_hash) {
  token.clear();
  std::size_t i = 0;
  while (i < source.size() && source[i] == delimiter) ++i;
  bool in_quotes = false;
  bool in_date = false;
  for (; i < source.size(); ++i) {
    const char c = source[i];
    if (c == '"') {
      if (i + 1 < source.size() && source[i + 1] == '"') {
        token.push_back('"');
        ++i;
      } else {
        in_quotes = !in_quotes;
        token.push_back('"');
      }
    } else if (c == '#' && !in_quotes) {
      in_date = !in_date;
      if (!drop_hash) token.push_back('#');
    } else if (c == delimiter && !in_quotes && !in_date) {
      source.erase(0, i + 1);
      return true;
    } else {
      token.push_back(c);
    }
  }
  token.clear();  // no delimiter ended it: no token
  return false;
}

int GetTokenBySet(std::string& source, std::string& token, std::string_view set) {
  const std::size_t start = source.find_first_not_of(set);
  if (start == std::string::npos) {
    token.clear();
    source.clear();
    return -1;
  }
  const std::size_t end = source.find_first_of(set, start);
  if (end == std::string::npos) {
    token = source.substr(start);
    source.clear();
    return -1;
  }
  token = source.substr(start, end - start);
  const int delimiter = static_cast<unsigned char>(source[end]);
  source.erase(0, end + 1);
  return delimiter;
}

namespace {
constexpr std::size_t kMaxTrimLength = 1999;
constexpr std::string_view kBlanks = " \t";
}  // namespace

void STrimLeft(std::string& text) {
  if (text.size() > kMaxTrimLength) throw CSTDFUNException::Text("String too long", "STrimLeft", nullptr);
  text.erase(0, std::min(text.find_first_not_of(kBlanks), text.size()));
}

void STrimRight(std::string& text) {
  if (text.size() > kMaxTrimLength) throw CSTDFUNException::Text("String too long", "STrimRight", nullptr);
  const auto e = text.find_last_not_of(kBlanks);
  text.erase(e == std::string::npos ? 0 : e + 1);
}

void RemoveQuotes(std::string& text) { std::erase(text, '"'); }

void TrimQuotes(std::string& text) {
  const auto b = text.find_first_not_of('"');
  if (b == std::string::npos) {
    text.clear();
    return;
  }
  const auto e = text.find_last_not_of('"');
  std::string inner = text.substr(b, e - b + 1);
  std::string out;
  out.reserve(inner.size());
  for (std::size_t i = 0; i < inner.size(); ++i) {
    out.push_back(inner[i]);
    if (inner[i] == '"' && i + 1 < inner.size() && inner[i + 1] == '"') ++i;
  }
  text = std::move(out);
}

}  // namespace qm
