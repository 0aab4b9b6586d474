#include "text/character_translation.h"

#include "platform/text_encoding.h"
#include "text/language_file.h"

namespace qm::text {

namespace {

std::u16string_view Cut(std::u16string_view text) {
  return text.substr(0, Utf16CutLength(text, CharacterTranslationList::kMaxTextLength));
}

}  // namespace

void CharacterTranslationList::Add(std::u16string_view from, std::u16string_view to) {
  // An empty from text would match everywhere and never end a replacement loop.
  if (from.empty()) return;
  pairs_.emplace_back(std::u16string(Cut(from)), std::u16string(Cut(to)));
}

bool CharacterTranslationList::Parse(std::u16string_view text, CharacterTranslationList& out) {
  CharacterTranslationList list;
  char16_t op = 0;  // the operator of the last line that named one
  std::size_t pos = 0;
  while (pos <= text.size()) {
    std::size_t end = text.find(u'\n', pos);
    if (end == std::u16string_view::npos) end = text.size();
    const auto tokens = SplitUtf16Tokens(text.substr(pos, end - pos));
    pos = end + 1;
    if (tokens.empty()) continue;
    const auto is_operator = [](std::u16string_view t) { return t == u"-" || t == u"="; };
    std::u16string_view from;
    std::u16string_view to;
    if (tokens.size() == 3 && is_operator(tokens[1])) {
      op = tokens[1][0];
      from = tokens[0];
      to = tokens[2];
    } else if (tokens.size() == 2 && !is_operator(tokens[1]) && op != 0) {
      from = tokens[0];
      to = tokens[1];
    } else {
      return false;
    }
    if (to == u"#") to = {};
    list.Add(from, to);
    if (op == u'=') list.Add(to, from);
  }
  out = std::move(list);
  return true;
}

void CharacterTranslationList::Apply(std::u16string& word, std::u16string& scratch) const {
  for (const auto& [from, to] : pairs_) {
    std::size_t count = 0;
    for (std::size_t at = word.find(from); at != std::u16string::npos;
         at = word.find(from, at + from.size())) {
      ++count;
    }
    if (count == 0) continue;
    const std::size_t result_length = word.size() - count * from.size() + count * to.size();
    if (result_length >= kWordLimit) continue;
    scratch.clear();
    std::size_t done = 0;
    for (std::size_t at = word.find(from); at != std::u16string::npos;
         at = word.find(from, at + from.size())) {
      scratch.append(word, done, at - done);
      scratch.append(to);
      done = at + from.size();
    }
    scratch.append(word, done, std::u16string::npos);
    word.swap(scratch);
  }
}

}  // namespace qm::text
