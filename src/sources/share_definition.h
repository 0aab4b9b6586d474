// CShareDefinition: the definition record file (group's definitions folder +
// NAME.def), read only. A record is block 0 of a 4,096-byte block file, its
// fields in the block's item encoding one after another. Fields this engine
// does not use are read and held by type.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "base/value.h"

namespace qm {

class CGlobalDefs;

struct CDefinitionColumn {
  std::string Name;
  int32_t Values[3] = {0, 0, 0};
};

struct CDefinitionRecord {
  int32_t Field1 = 0;
  std::string Field2;
  DateTimeValue Field3;
  std::string Texts[4];
  int32_t Integers[7] = {0, 0, 0, 0, 0, 0, 0};
  std::vector<CDefinitionColumn> Columns;  // in file order
};

class CShareDefinition {
 public:
  explicit CShareDefinition(const CGlobalDefs& defs) : defs_(defs) {}
  // The record file of name (a plain name).
  std::string PathOf(std::string_view name) const;
  CDefinitionRecord Read(std::string_view name) const;

 private:
  const CGlobalDefs& defs_;
};

}  // namespace qm
