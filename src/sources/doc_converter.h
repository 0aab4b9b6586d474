// DocConverter: turns a document file into text fields by the conversion
// that Converters.txt (in the converters folder) names for its type.
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "sources/com_converter.h"
#include "sources/converter_table.h"
#include "sources/field_map.h"
#include "sources/html_converter.h"

namespace qm {

class CGlobalDefs;

// One converter serves one build thread: it keeps loaded components.
class DocConverter {
 public:
  // Reads Converters.txt once; a missing file means no document converts.
  // The settings must outlive the converter.
  explicit DocConverter(const CGlobalDefs& defs);
  DocConverter(const DocConverter&) = delete;
  DocConverter& operator=(const DocConverter&) = delete;

  // Converts the document by the entry for its type (document_type when
  // given and not empty, else the path's extension with its dot), else by
  // the "ALL" entry. Returns 0 when a converter ran, 1 when none applies
  // (fields unchanged). Family exceptions from a step pass through; any
  // other failure is a "DocConverter" error naming the step.
  int ConvertText(const std::string& document_path, FieldMap& fields,
                  std::optional<std::string_view> document_type = std::nullopt);

  // The text to index: "DEFAULT_PLAIN_TEXT" after ConvertText, empty when no
  // converter applies.
  std::string ConvertForIndexing(const std::string& document_path,
                                 std::optional<std::string_view> document_type = std::nullopt);

  // Characters of a plain-text or program result kept as its summary.
  static constexpr std::size_t kSummaryLength = 150;

 private:
  void RunProgram(const std::string& command_line, const std::string& document_path,
                  FieldMap& fields);

  const CGlobalDefs& defs_;
  ConverterTable table_;
  ComConverter components_;
  Converter html_;
};

// The extension of a path's last element, with its dot ("" when none).
std::string PathExtension(std::string_view path);

}  // namespace qm
