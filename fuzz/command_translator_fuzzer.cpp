// Feeds arbitrary bytes to the command translator, the column parsers and the
// trace masking. Only the translator's own exception family may come out.
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

#include "command/command_translator.h"
#include "command/findex_column_parser.h"
#include "command/order_column_parser.h"
#include "command/statement_mask.h"
#include "platform/text_encoding.h"
#include "base/exception_family.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, std::size_t size) {
  using namespace qm;
  if (size == 0) return 0;
  // The first byte chooses how the rest is read: UTF-8 text or raw UTF-16 units
  // (lone surrogates included).
  std::u16string text;
  if (data[0] % 2 == 0) {
    text = Utf8ToUtf16(std::string_view(reinterpret_cast<const char*>(data + 1), size - 1));
  } else {
    for (std::size_t i = 1; i + 1 < size; i += 2) {
      text.push_back(static_cast<char16_t>(data[i] | (data[i + 1] << 8)));
    }
  }

  CIndexHeader findex;
  COrderInfo order;
  ConnectionSettings connection;
  const IndexOptions index_options;
  const OrderOptions order_options;
  PiCmd cmd(findex, order, connection, index_options, order_options);
  try {
    cmd.TranslateW(text);
  } catch (const CPiCmdException&) {
  }
  try {
    ParseFindexColumns(text, findex.Columns, "TranslateW");
  } catch (const CPiCmdException&) {
  }
  try {
    ParseOrderColumns(text, order.Columns, "TranslateW");
  } catch (const CPiCmdException&) {
  }
  (void)MaskStatementForTrace(text);
  (void)MaskConnectionSecrets(text);
  return 0;
}
