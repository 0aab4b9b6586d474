#include "sources/com_converter.h"

#include <quillmere/converter_plugin.h>

#include "platform/file_io.h"
#include "platform/shared_library.h"
#include "platform/text_encoding.h"
#include "base/exception_family.h"
#include "config/global_defs.h"
#include "base/trace.h"
#include "sources/document_encoding.h"

namespace qm {

namespace {

constexpr std::string_view kInstantiationFailure = "Error instantiating object: Error: %S";
constexpr const char* kTraceTag = "REPLIB.ComConverter.ComCustom";

template <class Fn>
Fn Entry(const platform::SharedLibrary& library, const char* name) {
  return reinterpret_cast<Fn>(library.Symbol(name));
}

std::string_view TrimBlanks(std::string_view text) {
  const auto first = text.find_first_not_of(" \t\r");
  if (first == std::string_view::npos) return {};
  return text.substr(first, text.find_last_not_of(" \t\r") - first + 1);
}

// The first line of an exception's text, for nesting it into another message.
std::string MessageOf(CExceptionBase& e) {
  std::string text = e.GetFullTextUtf8(kLevelWritten);
  const auto end = text.find_first_of("\r\n");
  if (end != std::string::npos) text.resize(end);
  return text;
}

}  // namespace

struct ComConverter::Component {
  platform::SharedLibrary library;
  QmCreateConverterObjectFn create = nullptr;
  QmReleaseConverterObjectFn release = nullptr;
  QmCustomInitializeFn initialize = nullptr;
  QmOpenDocumentFn open = nullptr;
  QmGetFieldTextFn field_text = nullptr;
  QmCloseDocumentFn close = nullptr;
  QmCustomTerminateFn terminate = nullptr;
  QmGetErrorStatusFn error_status = nullptr;
  QmGetErrorMessageFn error_message = nullptr;

  bool Complete() const {
    return create && release && initialize && open && field_text && close && terminate &&
           error_status && error_message;
  }
};

ComConverter::ComConverter(const CGlobalDefs& defs) : defs_(defs) {}
ComConverter::~ComConverter() = default;

std::optional<std::string> ComConverter::LibraryPath(const std::string& upper_id) {
  const std::string folder = defs_.GetFolder(FolderKind::Converters);
  if (!registry_) {
    registry_.emplace();
    std::string text;
    if (platform::ReadWholeFile(folder + "Components.txt", text)) {
      std::size_t pos = 0;
      while (pos < text.size()) {
        std::size_t end = text.find('\n', pos);
        if (end == std::string::npos) end = text.size();
        const std::string_view line = std::string_view(text).substr(pos, end - pos);
        pos = end + 1;
        const auto eq = line.find('=');
        if (eq == std::string_view::npos) continue;
        (*registry_)[ToUpper(TrimBlanks(line.substr(0, eq)))] =
            std::string(TrimBlanks(line.substr(eq + 1)));
      }
    }
  }
  const auto it = registry_->find(upper_id);
  if (it == registry_->end() || it->second.empty()) return std::nullopt;
  std::string path = defs_.ExpandPlaceholders(it->second);
  if (path[0] != '/') path = folder + path;
  return path;
}

const ComConverter::Component& ComConverter::ComCustom(std::string_view component_id) {
  const std::string id = ToUpper(TrimBlanks(component_id));
  if (const auto it = loaded_.find(id); it != loaded_.end()) return *it->second;

  const std::optional<std::string> path = LibraryPath(id);
  if (!path || !platform::FileExists(*path)) {
    throw CComConverterException::Text(kInstantiationFailure, "ComCustom", nullptr,
                                       "Class not registered");
  }
  auto component = std::make_unique<Component>();
  std::string error;
  component->library = platform::SharedLibrary::Load(*path, error);
  if (component->library.IsLoaded()) {
    const auto& lib = component->library;
    const auto version = Entry<QmConverterInterfaceVersionFn>(lib, "ConverterInterfaceVersion");
    component->create = Entry<QmCreateConverterObjectFn>(lib, "CreateConverterObject");
    component->release = Entry<QmReleaseConverterObjectFn>(lib, "ReleaseConverterObject");
    component->initialize = Entry<QmCustomInitializeFn>(lib, "CustomInitialize");
    component->open = Entry<QmOpenDocumentFn>(lib, "OpenDocument");
    component->field_text = Entry<QmGetFieldTextFn>(lib, "GetFieldText");
    component->close = Entry<QmCloseDocumentFn>(lib, "CloseDocument");
    component->terminate = Entry<QmCustomTerminateFn>(lib, "CustomTerminate");
    component->error_status = Entry<QmGetErrorStatusFn>(lib, "GetErrorStatus");
    component->error_message = Entry<QmGetErrorMessageFn>(lib, "GetErrorMessage");
    if (version == nullptr || version() != QM_CONVERTER_INTERFACE_VERSION) {
      error = "missing or different ConverterInterfaceVersion";
    } else if (!component->Complete()) {
      error = "an entry point is missing";
    }
  }
  if (!error.empty()) {
    Trace(TraceLevel1, kTraceTag, "Converter component %s (%s) refused: %s", id, *path, error);
    throw CComConverterException::Text(kInstantiationFailure, "ComCustom", nullptr, "Unknown");
  }
  return *loaded_.emplace(id, std::move(component)).first->second;
}

void ComConverter::Tranformation(std::string_view component_id, const std::string& document_path,
                                 FieldMap& fields) {
  Guard<CComConverterException, CComConverterUnknownException>("Tranformation", [&] {
    const Component* component = nullptr;
    try {
      component = &ComCustom(component_id);
    } catch (CException& e) {
      throw CComConverterException::Text("Error Instantiating ComCustom: %S", "Tranformation",
                                         nullptr, MessageOf(e));
    }
    const Component& c = *component;

    const auto release = [&c](QmConverterObject* o) { c.release(o); };
    std::unique_ptr<QmConverterObject, decltype(release)> object(c.create(), release);
    if (!object) {
      throw CComConverterException::Text("Error Instantiating ComCustom: %S", "Tranformation",
                                         nullptr, "Error instantiating object: Error: Unknown");
    }
    QmConverterObject* o = object.get();
    const auto check_error = [&] {
      if (c.error_status(o) == 0) return;
      const char* message = c.error_message(o);
      throw CComConverterException::Text("%S", "CheckError", nullptr,
                                         DecodeDocumentBytes(message ? message : ""));
    };

    // Once initialised, the component is always terminated, and an opened
    // document always closed, also when a step fails.
    bool initialized = false;
    bool opened = false;
    try {
      const std::string data = defs_.GetFolder(FolderKind::Data);
      const std::string converters = defs_.GetFolder(FolderKind::Converters);
      const std::string group = defs_.GetGroup();
      c.initialize(o, data.c_str(), converters.c_str(), group.c_str());
      initialized = true;
      check_error();
      if (c.open(o, document_path.c_str()) != 0) {
        throw CComConverterException::Text("Error opening document", "OpenDocument", nullptr);
      }
      opened = true;
      check_error();
      for (auto& [name, value] : fields) {
        const char* text = c.field_text(o, name.c_str());
        check_error();
        if (text != nullptr && *text != '\0') value = DecodeDocumentBytes(text);
      }
      opened = false;
      c.close(o);
      check_error();
      initialized = false;
      c.terminate(o);
      check_error();
    } catch (...) {
      if (opened) c.close(o);
      if (initialized) c.terminate(o);
      throw;
    }
  });
}

}  // namespace qm
