#include "command/findex_column_parser.h"

#include "base/error_numbers.h"
#include "command/quoted_text.h"
#include "platform/text_encoding.h"
#include "base/exception_family.h"

namespace qm {

namespace {


std::string CleanName(std::u16string_view text) {
  return Utf16ToUtf8(UnquoteValue(TrimSpaces(text)));
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
        tags.insert_or_assign(std::move(tag_name), CleanName(tag.substr(equals + 1)));
      }
      result.insert_or_assign(std::move(name), std::move(tags));
    }
    return result;
  });
  column_map = std::move(parsed);
}

}  // namespace qm
