// Findex columns whose values name documents (column tag CONTENT_TYPE "URL",
// "FILE_PATH" or "DOCUMENT"): the text a build indexes for such a value. A
// document that cannot be had or converted is traced and indexes as empty
// text; the build goes on.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "format/index_header.h"

namespace qm {

class CGlobalDefs;
class Connection;
class DocConverter;

// The value of a column tag, by name in any case; null when absent.
const std::string* FindColumnTag(const TagMap& tags, std::string_view name);

// CONTENT_WEIGHT: an integer; absent, unreadable or below 1 counts as 1.
int32_t ContentWeight(const TagMap& tags);

struct DocumentColumn {
  enum class Kind { Default, Url, FilePath, Document };

  Kind kind = Kind::Default;
  std::string base;  // BASE_URL or BASE_FILE_PATH
  std::optional<std::string> document_type;  // DOCUMENT_TYPE

  // CONTENT_TYPE in any case; any other value is DEFAULT.
  static DocumentColumn FromTags(const TagMap& tags);
  bool IsDocument() const { return kind != Kind::Default; }
};

// The file a FILE_PATH value names: base and value joined as they are. With a
// base, the joined path, resolved (symbolic links and ".." followed), must lie
// below the resolved base; otherwise there is none.
std::optional<std::string> FileUnderBase(std::string_view base, std::string_view value);

// One converter and one web connection for a whole build, made when the
// first document needs them.
class DocumentTexts {
 public:
  explicit DocumentTexts(const CGlobalDefs& defs);
  ~DocumentTexts();
  DocumentTexts(const DocumentTexts&) = delete;
  DocumentTexts& operator=(const DocumentTexts&) = delete;

  // The UTF-8 text of the document value names: value is the column's text
  // (UTF-8), or for a binary column the path of the copy the data source
  // made of it.
  std::string Text(const DocumentColumn& column, std::string_view value, bool binary);

 private:
  DocConverter& Converter();
  Connection& Web();

  const CGlobalDefs& defs_;
  std::unique_ptr<DocConverter> converter_;
  std::unique_ptr<Connection> web_;
};

}  // namespace qm
