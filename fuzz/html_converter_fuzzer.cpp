// Any bytes, read as a document and run through the HTML converter, convert
// without failing, and the plain text comes out normalised.
#include <cstddef>
#include <cstdint>
#include <string_view>

#include "sources/document_encoding.h"
#include "sources/html_converter.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::string text =
      qm::DecodeDocumentBytes(std::string_view(reinterpret_cast<const char*>(data), size));
  qm::FieldMap fields;
  qm::Converter().Convert(text, fields);
  const std::string& plain = fields.at(qm::kFieldPlainText);
  if (qm::NormalizeHtmlText(plain) != plain) __builtin_trap();
  return 0;
}
