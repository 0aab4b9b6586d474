#include "index/document_column.h"

#include <filesystem>
#include <limits>
#include <system_error>

#include "platform/file_io.h"
#include "platform/text_encoding.h"
#include "base/trace.h"
#include "sources/column_conversion.h"
#include "sources/connection.h"
#include "sources/doc_converter.h"
#include "sources/document_text.h"

namespace qm {

namespace fs = std::filesystem;

const std::string* FindColumnTag(const TagMap& tags, std::string_view name) {
  for (const auto& [tag, value] : tags) {
    if (AsciiUpper(tag) == name) return &value;
  }
  return nullptr;
}

int32_t ContentWeight(const TagMap& tags) {
  const std::string* text = FindColumnTag(tags, "CONTENT_WEIGHT");
  int64_t weight = 0;
  if (text == nullptr || !ParseInteger64(*text, weight) || weight < 1) return 1;
  return static_cast<int32_t>(std::min<int64_t>(weight, std::numeric_limits<int32_t>::max()));
}

DocumentColumn DocumentColumn::FromTags(const TagMap& tags) {
  DocumentColumn column;
  const std::string* type = FindColumnTag(tags, "CONTENT_TYPE");
  const std::string kind = type != nullptr ? AsciiUpper(*type) : std::string();
  const char* base_tag = nullptr;
  if (kind == "URL") {
    column.kind = Kind::Url;
    base_tag = "BASE_URL";
  } else if (kind == "FILE_PATH") {
    column.kind = Kind::FilePath;
    base_tag = "BASE_FILE_PATH";
  } else if (kind == "DOCUMENT") {
    column.kind = Kind::Document;
    if (const std::string* t = FindColumnTag(tags, "DOCUMENT_TYPE")) column.document_type = *t;
  }
  if (base_tag != nullptr) {
    if (const std::string* b = FindColumnTag(tags, base_tag)) column.base = *b;
  }
  return column;
}

std::optional<std::string> FileUnderBase(std::string_view base, std::string_view value) {
  std::string joined(base);
  joined += value;
  if (base.empty()) return joined;
  const auto base_path = platform::WeaklyCanonicalPath(std::string(base));
  const auto joined_path = platform::WeaklyCanonicalPath(joined);
  if (!base_path || !joined_path) return std::nullopt;
  const fs::path resolved_base(*base_path);
  const fs::path resolved(*joined_path);
  // Component by component, so /data/docs2 is not taken for a file below /data/docs.
  auto b = resolved_base.begin();
  auto p = resolved.begin();
  for (; b != resolved_base.end(); ++b) {
    if (b->empty()) continue;  // a trailing separator
    if (p == resolved.end() || *p != *b) return std::nullopt;
    ++p;
  }
  while (p != resolved.end() && p->empty()) ++p;
  if (p == resolved.end()) return std::nullopt;  // the base itself
  return joined;
}

DocumentTexts::DocumentTexts(const CGlobalDefs& defs) : defs_(defs) {}

DocumentTexts::~DocumentTexts() = default;

DocConverter& DocumentTexts::Converter() {
  if (!converter_) converter_ = std::make_unique<DocConverter>(defs_);
  return *converter_;
}

Connection& DocumentTexts::Web() {
  if (!web_) web_ = std::make_unique<Connection>();
  return *web_;
}

std::string DocumentTexts::Text(const DocumentColumn& column, std::string_view value, bool binary) {
  switch (column.kind) {
    case DocumentColumn::Kind::Default:
      return std::string(value);
    case DocumentColumn::Kind::Url:
      return UrlDocumentText(Converter(), Web(), defs_, column.base, value);
    case DocumentColumn::Kind::FilePath: {
      const std::optional<std::string> path = FileUnderBase(column.base, value);
      if (!path) {
        Trace(true, "REBLIB.RepDB.StartCollector",
              "Could not convert document %s because of the following error: %S",
              column.base + std::string(value),
              "The file does not lie below the base file path " + column.base);
        return {};
      }
      return ConvertedDocumentText(Converter(), *path);
    }
    case DocumentColumn::Kind::Document: {
      const std::optional<std::string_view> type =
          column.document_type ? std::optional<std::string_view>(*column.document_type)
                               : std::nullopt;
      if (binary) return ConvertedDocumentText(Converter(), std::string(value), type);
      return EmbeddedDocumentText(Converter(), defs_, value, type ? *type : std::string_view());
    }
  }
  return {};
}

}  // namespace qm
