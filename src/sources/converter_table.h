// The converter table of Converters.txt: which conversion applies to a
// document, by upper-case key (an extension with its dot, a document type
// name, or "ALL").
#pragma once

#include <map>
#include <optional>
#include <string>
#include <string_view>

namespace qm {

enum class ConverterKind {
  Component,  // "[COM_CONVERTER]": a converter component, argument = its identifier
  Html,       // "[QUILLMERE_HTML_CONVERTER]": the built-in HTML converter
  PlainText,  // "[PLAIN_TEXT]": the file is the text
  Program,    // any other label: an external program, argument = its command line
};

struct ConverterEntry {
  ConverterKind kind = ConverterKind::Program;
  std::string argument;
};

class ConverterTable {
 public:
  // Lines "key=entry" separated by line feeds; the key is upper-cased, one
  // carriage return ending the entry is dropped, lines without "=" are
  // ignored and a later key replaces an earlier one.
  static ConverterTable Parse(std::string_view text);

  // The raw entry for the key (compared upper-cased), else the "ALL" entry.
  std::optional<std::string> Find(std::string_view key) const;

  // "kind, argument": the kind is the text before the first ",", upper-cased
  // and matched exactly against the markers; the argument is the rest without
  // surrounding blanks.
  static ConverterEntry SplitEntry(std::string_view entry);

 private:
  std::map<std::string, std::string> entries_;
};

}  // namespace qm
