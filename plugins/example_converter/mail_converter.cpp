// An example converter component for simple mail-like documents:
//
//   Subject: Rivers of Europe
//   From: someone@example.org
//
//   The body text, which is what gets indexed.
//
// Header lines ("Name: value") run up to the first empty line; the body
// follows. "DEFAULT_PLAIN_TEXT" is the body, "DEFAULT_TITLE" the subject, and
// any other field name is answered with the header of that name.
#include <quillmere/converter_plugin.h>

#include <cctype>
#include <fstream>
#include <map>
#include <memory>
#include <sstream>
#include <string>

struct QmConverterObject {
  std::map<std::string, std::string> headers;  // names upper-cased
  std::string body;
  std::string answer;  // the last text handed out
  std::string error;
  bool failed = false;
};

namespace {

std::string Upper(std::string text) {
  for (char& c : text) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
  return text;
}

std::string Trim(const std::string& text) {
  const auto first = text.find_first_not_of(" \t\r");
  if (first == std::string::npos) return {};
  return text.substr(first, text.find_last_not_of(" \t\r") - first + 1);
}

void Fail(QmConverterObject* object, std::string message) {
  object->failed = true;
  object->error = std::move(message);
}

// Parses the document; false (with the error set) when a header line is malformed.
bool Parse(QmConverterObject* object, std::istream& in) {
  std::string line;
  int number = 0;
  while (std::getline(in, line)) {
    ++number;
    if (Trim(line).empty()) break;
    const auto colon = line.find(':');
    if (colon == std::string::npos || colon == 0) {
      Fail(object, "Malformed header line " + std::to_string(number));
      return false;
    }
    object->headers[Upper(Trim(line.substr(0, colon)))] = Trim(line.substr(colon + 1));
  }
  std::ostringstream body;
  body << in.rdbuf();
  object->body = body.str();
  return true;
}

}  // namespace

extern "C" {

int ConverterInterfaceVersion(void) { return QM_CONVERTER_INTERFACE_VERSION; }

QmConverterObject* CreateConverterObject(void) {
  try {
    // Ownership passes to the engine until ReleaseConverterObject.
    return std::make_unique<QmConverterObject>().release();
  } catch (...) {
    return nullptr;
  }
}

void ReleaseConverterObject(QmConverterObject* object) {
  std::unique_ptr<QmConverterObject> owned(object);
}

void CustomInitialize(QmConverterObject* object, const char*, const char*, const char*) {
  object->failed = false;
  object->error.clear();
}

int OpenDocument(QmConverterObject* object, const char* document_path) {
  try {
    std::ifstream in(document_path ? document_path : "", std::ios::binary);
    if (!in) return 1;
    object->headers.clear();
    object->body.clear();
    Parse(object, in);
    return 0;
  } catch (...) {
    return 1;
  }
}

const char* GetFieldText(QmConverterObject* object, const char* field_name) {
  try {
    const std::string name = Upper(field_name ? field_name : "");
    if (name == "DEFAULT_PLAIN_TEXT") {
      object->answer = object->body;
    } else {
      const auto it = object->headers.find(name == "DEFAULT_TITLE" ? "SUBJECT" : name);
      object->answer = it != object->headers.end() ? it->second : std::string();
    }
    return object->answer.c_str();
  } catch (...) {
    Fail(object, "Out of memory");
    return nullptr;
  }
}

void CloseDocument(QmConverterObject* object) {
  object->headers.clear();
  object->body.clear();
}

void CustomTerminate(QmConverterObject*) {}

int GetErrorStatus(QmConverterObject* object) { return object->failed ? 1 : 0; }

const char* GetErrorMessage(QmConverterObject* object) { return object->error.c_str(); }

}  // extern "C"
