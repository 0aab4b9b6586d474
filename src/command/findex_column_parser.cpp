#include "command/findex_column_parser.h"

#include <algorithm>
#include <iterator>

#include "base/error_numbers.h"
#include "command/quoted_text.h"
#include "platform/text_encoding.h"
#include "base/exception_family.h"
#include "sources/column_conversion.h"

namespace qm {

namespace {


std::string CleanName(std::u16string_view text) {
  return Utf16ToUtf8(UnquoteValue(TrimSpaces(text)));
}

// A tag that no build reads, or a weight that is no whole number, would be
// ignored silently and give a findex other than the one asked for.
void RequireKnownTag(const std::string& column, const std::string& tag, const std::string& value,
                     const char* method) {
  static constexpr std::string_view kTags[] = {"CONTENT_WEIGHT", "CONTENT_TYPE", "BASE_URL",
                                               "BASE_FILE_PATH", "DOCUMENT_TYPE"};
  const std::string upper = AsciiUpper(tag);
  if (std::find(std::begin(kTags), std::end(kTags), upper) == std::end(kTags)) {
    throw CPiCmdException::Text(
        "Unknown column tag %s on column %s: a column takes CONTENT_WEIGHT, CONTENT_TYPE, "
        "BASE_URL, BASE_FILE_PATH and DOCUMENT_TYPE",
        method, nullptr, tag, column);
  }
  int64_t weight = 0;
  if (upper == "CONTENT_WEIGHT" && !ParseInteger64(value, weight)) {
    throw CPiCmdException::Text(
        "Column tag CONTENT_WEIGHT on column %s takes a whole number, not \"%s\"", method, nullptr,
        column, value);
  }
}

}  // namespace

void ParseFindexColumns(std::u16string_view columns, ColumnMap& column_map, const char* method) {
  auto reject = [method] { return CPiCmdException::Numbered(kErrColumnList, method, nullptr); };
  ColumnMap parsed = Guard<CPiCmdException, CPiCmdUnknownException>("InsertIndexTags", [&] {
    ColumnMap result;
    bool unterminated = false;
    const auto pieces = SplitOutsideQuotes(columns, u',', unterminated);
    if (unterminated || TrimSpaces(columns).empty()) throw reject();
    for (const auto piece : pieces) {
      const auto parts = SplitOutsideQuotes(piece, u':', unterminated);
      std::string name = CleanName(parts.front());
      if (name.empty()) throw reject();
      TagMap tags;
      for (std::size_t k = 1; k < parts.size(); ++k) {
        const std::u16string_view tag = parts[k];
        const std::size_t equals = FindOutsideQuotes(tag, u'=');
        if (equals == std::u16string_view::npos) throw reject();
        std::string tag_name = CleanName(tag.substr(0, equals));
        if (tag_name.empty()) throw reject();
        std::string value = CleanName(tag.substr(equals + 1));
        RequireKnownTag(name, tag_name, value, method);
        tags.insert_or_assign(std::move(tag_name), std::move(value));
      }
      result.insert_or_assign(std::move(name), std::move(tags));
    }
    return result;
  });
  column_map = std::move(parsed);
}

}  // namespace qm
