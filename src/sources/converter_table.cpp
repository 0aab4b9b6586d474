#include "sources/converter_table.h"

#include "platform/text_encoding.h"

namespace qm {

namespace {

std::string_view TrimBlanks(std::string_view text) {
  const auto first = text.find_first_not_of(" \t");
  if (first == std::string_view::npos) return {};
  return text.substr(first, text.find_last_not_of(" \t") - first + 1);
}

}  // namespace

ConverterTable ConverterTable::Parse(std::string_view text) {
  ConverterTable table;
  std::size_t pos = 0;
  while (pos <= text.size()) {
    std::size_t end = text.find('\n', pos);
    if (end == std::string_view::npos) end = text.size();
    std::string_view line = text.substr(pos, end - pos);
    pos = end + 1;
    const auto eq = line.find('=');
    if (eq == std::string_view::npos) continue;
    std::string_view entry = line.substr(eq + 1);
    if (!entry.empty() && entry.back() == '\r') entry.remove_suffix(1);
    table.entries_[ToUpper(line.substr(0, eq))] = std::string(entry);
  }
  return table;
}

std::optional<std::string> ConverterTable::Find(std::string_view key) const {
  auto it = entries_.find(ToUpper(key));
  if (it == entries_.end()) it = entries_.find("ALL");
  if (it == entries_.end()) return std::nullopt;
  return it->second;
}

ConverterEntry ConverterTable::SplitEntry(std::string_view entry) {
  const auto comma = entry.find(',');
  const std::string kind = ToUpper(entry.substr(0, comma));
  ConverterEntry result;
  if (comma != std::string_view::npos) result.argument = TrimBlanks(entry.substr(comma + 1));
  if (kind == "[COM_CONVERTER]") {
    result.kind = ConverterKind::Component;
  } else if (kind == "[QUILLMERE_HTML_CONVERTER]") {
    result.kind = ConverterKind::Html;
  } else if (kind == "[PLAIN_TEXT]") {
    result.kind = ConverterKind::PlainText;
  } else {
    result.kind = ConverterKind::Program;
  }
  return result;
}

}  // namespace qm
