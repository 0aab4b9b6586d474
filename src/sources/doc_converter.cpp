#include "sources/doc_converter.h"

#include <system_error>

#include "platform/file_io.h"
#include "config/converter_runner.h"
#include "base/exception_family.h"
#include "config/file_operations.h"
#include "config/global_defs.h"
#include "config/temp_names.h"
#include "sources/document_encoding.h"

namespace qm {

namespace {


// Runs one step of a conversion: exceptions of the family pass on unchanged,
// anything else becomes the step's own message.
template <class Body>
decltype(auto) Step(const char* message, Body&& body) {
  try {
    return body();
  } catch (const CException&) {
    throw;
  } catch (const CUnknownException&) {
    throw;
  } catch (...) {
    throw CDocConverterException::Text(std::string_view(message), "ConvertText", nullptr);
  }
}

std::string ReadText(const std::string& path) {
  return Step("Unknown error reading file", [&] {
    std::string bytes;
    if (!platform::ReadWholeFile(path, bytes)) {
      throw CDocConverterException::Text("Unknown error reading file", "ConvertText", nullptr);
    }
    return DecodeDocumentBytes(bytes);
  });
}

void StoreTextAndSummary(std::string text, FieldMap& fields) {
  std::string summary = Step("Unknown error generating summary", [&] {
    return std::string(FirstCharacters(text, DocConverter::kSummaryLength));
  });
  Step("Error updating DEFAULT_PLAIN_TEXT or DEFAULT_SUMMARY", [&] {
    fields[kFieldPlainText] = std::move(text);
    fields[kFieldSummary] = std::move(summary);
  });
}

// "%1" becomes the document, "%2" the output file, in one left-to-right pass,
// so a path that itself holds "%1" or "%2" is put in as it is.
std::string FillPaths(std::string_view argument, std::string_view document,
                      std::string_view output) {
  std::string out;
  out.reserve(argument.size());
  for (std::size_t i = 0; i < argument.size(); ++i) {
    if (argument[i] == '%' && i + 1 < argument.size() &&
        (argument[i + 1] == '1' || argument[i + 1] == '2')) {
      out.append(argument[i + 1] == '1' ? document : output);
      ++i;
    } else {
      out.push_back(argument[i]);
    }
  }
  return out;
}

// Removes the converter's output file however the conversion ends.
class OutputFile {
 public:
  explicit OutputFile(std::string path) : path_(std::move(path)) {}
  OutputFile(const OutputFile&) = delete;
  OutputFile& operator=(const OutputFile&) = delete;
  ~OutputFile() {
    if (!path_.empty()) {
      platform::UnlinkFile(path_);  // best effort: the file may be gone already
    }
  }
  const std::string& Path() const { return path_; }
  // Deletes the file now, reporting a failure.
  void Delete() {
    Step("Unknown error deleting file", [&] { DropFile(path_); });
    path_.clear();
  }

 private:
  std::string path_;
};

}  // namespace

std::string PathExtension(std::string_view path) {
  const auto slash = path.find_last_of('/');
  const std::string_view last = slash == std::string_view::npos ? path : path.substr(slash + 1);
  const auto dot = last.find_last_of('.');
  return dot == std::string_view::npos ? std::string() : std::string(last.substr(dot));
}

DocConverter::DocConverter(const CGlobalDefs& defs) : defs_(defs), components_(defs) {
  std::string text;
  if (platform::ReadWholeFile(defs_.GetFolder(FolderKind::Converters) + "Converters.txt", text)) {
    table_ = ConverterTable::Parse(text);
  }
}

int DocConverter::ConvertText(const std::string& document_path, FieldMap& fields,
                              std::optional<std::string_view> document_type) {
  try {
    const std::string key = document_type && !document_type->empty()
                                ? std::string(*document_type)
                                : PathExtension(document_path);
    const std::optional<std::string> entry = table_.Find(key);
    if (!entry) return 1;
    const ConverterEntry converter = ConverterTable::SplitEntry(*entry);
    switch (converter.kind) {
      case ConverterKind::Component:
        components_.Tranformation(converter.argument, document_path, fields);
        break;
      case ConverterKind::Html:
        html_.Convert(ReadText(document_path), fields);
        break;
      case ConverterKind::PlainText:
        StoreTextAndSummary(ReadText(document_path), fields);
        break;
      case ConverterKind::Program:
        RunProgram(converter.argument, document_path, fields);
        break;
    }
    return 0;
  } catch (const CExceptionBase&) {
    throw;
  } catch (...) {
    throw CDocConverterUnknownException::Unknown("ConvertText");
  }
}

void DocConverter::RunProgram(const std::string& command_line, const std::string& document_path,
                              FieldMap& fields) {
  // The output file is made only for a program that writes one, so other
  // conversions leave nothing behind in the work folder.
  OutputFile output(SLGetTempWorkFilePath(defs_, kTempCallerConverterOutput));
  // The line is split before anything is put in; each argument then gets its
  // folder placeholders and the two paths.
  const ArgumentFiller fill = [&](std::string_view argument) {
    return Step("Unknown error generating execute path", [&] {
      return FillPaths(defs_.ExpandPlaceholders(argument), document_path, output.Path());
    });
  };
  Step("Unknown error executing converter", [&] { qm::ConvertText(command_line, fill); });
  std::string text = ReadText(output.Path());
  output.Delete();
  StoreTextAndSummary(std::move(text), fields);
}

std::string DocConverter::ConvertForIndexing(const std::string& document_path,
                                             std::optional<std::string_view> document_type) {
  FieldMap fields{{kFieldPlainText, std::string()}};
  ConvertText(document_path, fields, document_type);
  return fields[kFieldPlainText];
}

}  // namespace qm
