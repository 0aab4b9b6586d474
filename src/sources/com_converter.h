// ComConverter: runs a converter component (a shared library implementing
// include/quillmere/converter_plugin.h) named by its identifier in the
// converters folder's Components.txt.
#pragma once

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "sources/field_map.h"

namespace qm {

class CGlobalDefs;

class ComConverter {
 public:
  explicit ComConverter(const CGlobalDefs& defs);
  ~ComConverter();
  ComConverter(const ComConverter&) = delete;
  ComConverter& operator=(const ComConverter&) = delete;

  // Opens the document with the component and asks it for every field of
  // `fields`, in map order; a non-empty answer replaces the field's value.
  // Failures are "ComConverter" exceptions: "Error Instantiating ComCustom: %S"
  // (method "Tranformation") when the component cannot be made, "Error opening
  // document", or the component's own error text (method "CheckError").
  void Tranformation(std::string_view component_id, const std::string& document_path,
                     FieldMap& fields);

 private:
  struct Component;

  // The loaded component; raises "Error instantiating object: Error: %S"
  // (method "ComCustom") with "Class not registered" or "Unknown".
  const Component& ComCustom(std::string_view component_id);
  std::optional<std::string> LibraryPath(const std::string& upper_id);

  const CGlobalDefs& defs_;
  std::optional<std::map<std::string, std::string>> registry_;  // Components.txt, read once
  std::map<std::string, std::unique_ptr<Component>> loaded_;     // by upper-case identifier
};

}  // namespace qm
