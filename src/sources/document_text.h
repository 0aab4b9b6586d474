// The text a findex indexes for one value of a document column. A document
// that cannot be fetched or converted is traced and counts as empty text, so
// one bad document never stops a build.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace qm {

class CGlobalDefs;
class Connection;
class DocConverter;

// A document file (FILE_PATH values, binary DOCUMENT values already in a file).
std::string ConvertedDocumentText(DocConverter& converter, const std::string& path,
                                  std::optional<std::string_view> document_type = std::nullopt);

// FILE_PATH: base path and value joined as they are.
std::string FileDocumentText(DocConverter& converter, std::string_view base_path,
                             std::string_view value);

// URL: base address and value joined as they are; the resource is fetched
// into a work file named after the address's extension, converted, deleted.
std::string UrlDocumentText(DocConverter& converter, Connection& connection,
                            const CGlobalDefs& defs, std::string_view base_url,
                            std::string_view value);

// DOCUMENT held as text: the content is written to a work file and converted
// as the given document type.
std::string EmbeddedDocumentText(DocConverter& converter, const CGlobalDefs& defs,
                                 std::string_view content, std::string_view document_type);

}  // namespace qm
