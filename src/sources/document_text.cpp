#include "sources/document_text.h"

#include <system_error>

#include "platform/file_io.h"
#include "base/exception_family.h"
#include "config/file_operations.h"
#include "config/global_defs.h"
#include "config/temp_names.h"
#include "base/trace.h"
#include "sources/connection.h"
#include "sources/doc_converter.h"

namespace qm {

namespace {


std::string Explain(CExceptionBase& e) {
  std::string text = e.GetFullTextUtf8(kLevelWritten);
  while (!text.empty() && (text.back() == '\n' || text.back() == '\r')) text.pop_back();
  return text;
}

class WorkFile {
 public:
  explicit WorkFile(std::string path) : path_(std::move(path)) {}
  WorkFile(const WorkFile&) = delete;
  WorkFile& operator=(const WorkFile&) = delete;
  ~WorkFile() {
    platform::UnlinkFile(path_);  // best effort: the file may be gone already
  }
  const std::string& Path() const { return path_; }

 private:
  std::string path_;
};

}  // namespace

std::string ConvertedDocumentText(DocConverter& converter, const std::string& path,
                                  std::optional<std::string_view> document_type) {
  try {
    return converter.ConvertForIndexing(path, document_type);
  } catch (CExceptionBase& e) {
    Trace(true, "REBLIB.RepDB.StartCollector",
          "Could not convert document %s because of the following error: %S", path, Explain(e));
    return {};
  }
}

std::string FileDocumentText(DocConverter& converter, std::string_view base_path,
                             std::string_view value) {
  return ConvertedDocumentText(converter, std::string(base_path) + std::string(value));
}

std::string UrlDocumentText(DocConverter& converter, Connection& connection,
                            const CGlobalDefs& defs, std::string_view base_url,
                            std::string_view value) {
  const std::string address = std::string(base_url) + std::string(value);
  const WorkFile file(SLGetTempWorkFilePath(defs, kTempCallerDocument, address));
  try {
    connection.OpenConnection(address);
    connection.DownloadResource(file.Path());
    connection.CloseConnection();
  } catch (CExceptionBase& e) {
    connection.CloseConnection();
    Trace(true, "REPLIB.RepDB.StartCollector",
          "Could not open url %s because of the following error: %S", address, Explain(e));
    return {};
  }
  return ConvertedDocumentText(converter, file.Path());
}

std::string EmbeddedDocumentText(DocConverter& converter, const CGlobalDefs& defs,
                                 std::string_view content, std::string_view document_type) {
  const WorkFile file(SLGetTempWorkFilePath(defs, kTempCallerDocument));
  try {
    WriteTextFile(file.Path(), content);
  } catch (CExceptionBase& e) {
    Trace(true, "REBLIB.RepDB.StartCollector",
          "Could not convert document %s because of the following error: %S", file.Path(),
          Explain(e));
    return {};
  }
  return ConvertedDocumentText(converter, file.Path(), document_type);
}

}  // namespace qm
