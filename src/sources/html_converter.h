// Converter: the built-in HTML converter. Turns an HTML document into its
// plain text, and fills a field per closing tag (the text just before it),
// per META NAME/CONTENT pair, plus the title and the description summary.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

#include "sources/field_map.h"

namespace qm {

class Converter {
 public:
  // Tags whose name is longer than this are skipped (they cannot be markup
  // this converter acts on).
  static constexpr std::size_t kMaxTagName = 990;

  // Adds the document's fields to `fields`; "DEFAULT_PLAIN_TEXT" is always set.
  // Never fails on malformed markup; runs in time linear in the input.
  void Convert(std::string_view html, FieldMap& fields) const;
};

// Controls become blanks, "&nbsp;" (any case) becomes a blank, runs of blanks
// become one, leading blanks go and one trailing blank is removed.
std::string NormalizeHtmlText(std::string_view text);

}  // namespace qm
