// CShareRepository: the repository record file (group's repositories folder +
// NAME.rep), read only: a named set of collectors, each filling one findex.
// Layout as for every record file (sources/record_block.h).
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "base/value.h"
#include "sources/share_definition.h"

namespace qm {

class CGlobalDefs;

struct CRepositoryRecord {
  int32_t Field1 = 0;
  std::string Field2;
  DateTimeValue Field3;
  std::string Field4;
  std::string DefinitionName;
  DateTimeValue Field6;
  int32_t Field7 = 0;
  // Collector name -> its integer, in file order.
  std::vector<std::pair<std::string, int32_t>> Members;
  CDefinitionRecord Definition;
};

class CShareRepository {
 public:
  explicit CShareRepository(const CGlobalDefs& defs) : defs_(defs) {}
  std::string PathOf(std::string_view name) const;
  // True when the record file exists (name must be plain, else false).
  bool Exists(std::string_view name) const;
  // The record and its definition (an empty definition name reads none).
  CRepositoryRecord Read(std::string_view name) const;

 private:
  const CGlobalDefs& defs_;
};

}  // namespace qm
