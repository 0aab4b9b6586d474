#include "api/type_library.h"

#include <cstdint>
#include <string_view>
#include <utility>
#include <vector>

#include "api/dispatch_table.h"
#include "quillmere/api_enums.h"
#include "quillmere/quillmere.h"

namespace qm {

namespace {

struct Enumeration {
  const char* name;
  std::vector<std::pair<const char*, int32_t>> values;
};

#define QM_ENUM_VALUE(value) \
  { #value, value }

// The enumerations of api_enums.h, by their names there.
const std::vector<Enumeration>& Enumerations() {
  static const std::vector<Enumeration> all = {
      {"idxInfoEnum",
       {QM_ENUM_VALUE(idxTableName), QM_ENUM_VALUE(idxColumnNames), QM_ENUM_VALUE(idxKeyName),
        QM_ENUM_VALUE(idxTypeName), QM_ENUM_VALUE(idxWordCount), QM_ENUM_VALUE(idxKeyCount),
        QM_ENUM_VALUE(idxVersion), QM_ENUM_VALUE(idxDistinctWordCount),
        QM_ENUM_VALUE(idxFracmentationLevel), QM_ENUM_VALUE(idxDBConnectionString),
        QM_ENUM_VALUE(idxSQLSelect), QM_ENUM_VALUE(idxDBDisplayName),
        QM_ENUM_VALUE(idxSQLUsedAsTable), QM_ENUM_VALUE(idxBuildTime),
        QM_ENUM_VALUE(idxLastUpdateTime), QM_ENUM_VALUE(idxType), QM_ENUM_VALUE(idxIndexMaxSize),
        QM_ENUM_VALUE(idxIndexStartValue)}},
      {"odrInfoEnum",
       {QM_ENUM_VALUE(odrTableName), QM_ENUM_VALUE(odrColumnNames), QM_ENUM_VALUE(odrKeyName),
        QM_ENUM_VALUE(odrVersion), QM_ENUM_VALUE(odrDBConnectionString),
        QM_ENUM_VALUE(odrSQLSelect), QM_ENUM_VALUE(odrDBDisplayName),
        QM_ENUM_VALUE(odrSQLUsedAsTable), QM_ENUM_VALUE(odrBuildTime),
        QM_ENUM_VALUE(odrLastUpdateTime), QM_ENUM_VALUE(odrTypeName), QM_ENUM_VALUE(odrType)}},
      {"lngLanguageEnum",
       {QM_ENUM_VALUE(lngDanish), QM_ENUM_VALUE(lngEnglish), QM_ENUM_VALUE(lngFrench),
        QM_ENUM_VALUE(lngSpanish), QM_ENUM_VALUE(lngPortuguese), QM_ENUM_VALUE(lngItalian),
        QM_ENUM_VALUE(lngGerman), QM_ENUM_VALUE(lngDutch), QM_ENUM_VALUE(lngSwedish),
        QM_ENUM_VALUE(lngNorwegian), QM_ENUM_VALUE(lngRussian), QM_ENUM_VALUE(lngOther)}},
      {"iloLanguageOptionEnum",
       {QM_ENUM_VALUE(iloLanguage), QM_ENUM_VALUE(iloUseStemming), QM_ENUM_VALUE(iloUsePhonetic),
        QM_ENUM_VALUE(iloRemoveAccent), QM_ENUM_VALUE(iloUseCharacterTranslation),
        QM_ENUM_VALUE(iloUseStopWords)}},
      {"igoGeneralOptionEnum",
       {QM_ENUM_VALUE(igoIndexMaxSize), QM_ENUM_VALUE(igoIndexStartValue),
        QM_ENUM_VALUE(igoSeparators), QM_ENUM_VALUE(igoSupportScore),
        QM_ENUM_VALUE(igoSupportPhrases), QM_ENUM_VALUE(igoUseDefaultSeparators),
        QM_ENUM_VALUE(igoSaveDatabaseConnection), QM_ENUM_VALUE(igoRemoveHtml),
        QM_ENUM_VALUE(igoUseUnicode)}},
      {"iuoUpdateOptionEnum",
       {QM_ENUM_VALUE(iuoUpdateSupport), QM_ENUM_VALUE(iuoUseDateTimeKey),
        QM_ENUM_VALUE(iuoUseDateTimeFraction)}},
      {"ogoGeneralOptionEnum",
       {QM_ENUM_VALUE(ogoIgnoreChars), QM_ENUM_VALUE(ogoIgnorreCase),
        QM_ENUM_VALUE(ogoSaveDatabaseConnection)}},
      {"ouoUpdateOptionEnum",
       {QM_ENUM_VALUE(ouoUpdateSupport), QM_ENUM_VALUE(ouoUseDateTimeKey),
        QM_ENUM_VALUE(ouoUseDateTimeFraction)}},
  };
  return all;
}

#undef QM_ENUM_VALUE

// Every text here is plain ASCII without quotes or backslashes.
std::string Quoted(std::string_view text) {
  std::string out;
  out.reserve(text.size() + 2);
  out.push_back('"');
  out.append(text);
  out.push_back('"');
  return out;
}

const char* TypeName(DispatchType type) {
  switch (type) {
    case DispatchType::Long: return "long";
    case DispatchType::Double: return "double";
    case DispatchType::Bool: return "VARIANT_BOOL";
    case DispatchType::Text: return "BSTR";
  }
  return "";
}

void AppendClass(std::string& out, const DispatchTable& table, const char* friendly_name,
                 const char* class_help, const char* independent, const char* clsid,
                 const char* iid, const char* interface_help) {
  out += "    {\n";
  out += "      \"name\": " + Quoted(table.ProgId().substr(table.ProgId().find('.') + 1,
                                                      table.ProgId().rfind('.') -
                                                          table.ProgId().find('.') - 1)) +
         ",\n";
  out += "      \"friendlyName\": " + Quoted(friendly_name) + ",\n";
  out += "      \"helpString\": " + Quoted(class_help) + ",\n";
  out += "      \"progId\": " + Quoted(table.ProgId()) + ",\n";
  out += "      \"versionIndependentProgId\": " + Quoted(independent) + ",\n";
  out += "      \"clsid\": " + Quoted(clsid) + ",\n";
  out += "      \"threadingModel\": " + Quoted(QM_THREADING_MODEL) + ",\n";
  out += "      \"interface\": {\n";
  out += "        \"name\": " + Quoted(table.InterfaceName()) + ",\n";
  out += "        \"iid\": " + Quoted(iid) + ",\n";
  out += "        \"helpString\": " + Quoted(interface_help) + ",\n";
  out += "        \"dual\": true,\n";
  out += "        \"methods\": [\n";
  const auto& methods = table.Methods();
  for (std::size_t m = 0; m < methods.size(); ++m) {
    const DispatchMethod& method = methods[m];
    out += "          {\"dispid\": " + std::to_string(method.dispid) +
           ", \"name\": " + Quoted(method.name) + ", \"parameters\": [";
    for (std::size_t p = 0; p < method.parameters.size(); ++p) {
      const DispatchParameter& parameter = method.parameters[p];
      out += std::string(p > 0 ? ", " : "") + "{\"name\": " + Quoted(parameter.name) +
             ", \"type\": " + Quoted(TypeName(parameter.type)) +
             ", \"direction\": " + Quoted(parameter.is_result ? "out,retval" : "in") + "}";
    }
    out += std::string("]}") + (m + 1 < methods.size() ? "," : "") + "\n";
  }
  out += "        ]\n";
  out += "      }\n";
  out += "    }";
}

}  // namespace

std::string TypeLibraryJson() {
  std::string out = "{\n";
  out += "  \"library\": {\"name\": " + Quoted(QM_TYPELIB_NAME) +
         ", \"helpString\": " + Quoted(QM_TYPELIB_HELP) +
         ", \"libid\": " + Quoted(QM_LIBID_QUILLMEREAPI) +
         ", \"version\": " + Quoted(QM_TYPELIB_VERSION) +
         ", \"locale\": " + std::to_string(QM_TYPELIB_LOCALE) + "},\n";
  out += "  \"application\": {\"name\": \"QuillmereAPI\", \"appid\": " +
         Quoted(QM_APPID_QUILLMEREAPI) + ", \"module\": \"QuillmereAPI.DLL\"},\n";
  out += "  \"classes\": [\n";
  AppendClass(out, APISearchDispatch(), QM_FRIENDLY_NAME_APISEARCH, "Quillmere Search API",
              QM_PROGID_APISEARCH_INDEPENDENT, QM_CLSID_APISEARCH, QM_IID_IAPISEARCH,
              "IAPISearch Interface");
  out += ",\n";
  AppendClass(out, APICommandDispatch(), QM_FRIENDLY_NAME_APICOMMAND,
              "Quillmere Search Command API", QM_PROGID_APICOMMAND_INDEPENDENT,
              QM_CLSID_APICOMMAND, QM_IID_IAPICOMMAND,
              "API Command Interface");
  out += "\n  ],\n";
  out += "  \"enumerations\": [\n";
  const auto& enumerations = Enumerations();
  for (std::size_t e = 0; e < enumerations.size(); ++e) {
    out += "    {\"name\": " + Quoted(enumerations[e].name) + ", \"values\": {";
    const auto& values = enumerations[e].values;
    for (std::size_t v = 0; v < values.size(); ++v) {
      out += std::string(v > 0 ? ", " : "") + Quoted(values[v].first) + ": " +
             std::to_string(values[v].second);
    }
    out += std::string("}}") + (e + 1 < enumerations.size() ? "," : "") + "\n";
  }
  out += "  ]\n}\n";
  return out;
}

}  // namespace qm
