#include "command/order_column_parser.h"

#include "base/error_numbers.h"
#include "command/quoted_text.h"
#include "platform/text_encoding.h"
#include "base/exception_family.h"

namespace qm {

namespace {
}  // namespace

void ParseOrderColumns(std::u16string_view list, OrderColumnList& columns, const char* method) {
  auto reject = [method] {
    return CPiCmdException::Numbered(kErrColumnList, method, nullptr);
  };
  OrderColumnList parsed = Guard<CPiCmdException, CPiCmdUnknownException>("InsertIndexTags", [&] {
    OrderColumnList result;
    bool unterminated = false;
    const auto pieces = SplitOutsideQuotes(list, u',', unterminated);
    if (unterminated) throw reject();
    for (const auto piece : pieces) {
      const std::u16string_view name = TrimSpaces(piece);
      if (name.empty()) throw reject();
      result.push_back(OrderColumn{Utf16ToUtf8(name), {}});
    }
    return result;
  });
  columns = std::move(parsed);
}

}  // namespace qm
