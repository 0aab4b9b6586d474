// CShareCollector: the collector record file (group's repositories folder +
// REPOSITORY_COLLECTOR.col), read only. The collector number names the
// findex the collector fills; the kind (1 to 7) selects optional sections.
#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "base/value.h"
#include "sources/share_definition.h"

namespace qm {

class CGlobalDefs;

struct CCollectorRecord {
  int32_t Field1 = 0;
  std::string Field2;
  DateTimeValue Field3;
  DateTimeValue Field4;
  std::string Field5;
  std::string Field6;
  int32_t CollectorNumber = 0;
  std::string DefinitionName;
  int32_t CollectorKind = 0;
  int32_t Field10 = 0;
  // Group key -> (text -> text), in key order.
  std::map<std::string, std::map<std::string, std::string>> Groups;
  // First text -> the other two.
  std::map<std::string, std::pair<std::string, std::string>> Entries;
  // The optional sections, each held as read: texts, integers, dates in
  // file order.
  std::vector<std::string> SectionTexts;
  std::vector<int32_t> SectionIntegers;
  std::vector<DateTimeValue> SectionDates;
  CDefinitionRecord Definition;
};

class CShareCollector {
 public:
  explicit CShareCollector(const CGlobalDefs& defs) : defs_(defs) {}
  std::string PathOf(std::string_view repository, std::string_view collector) const;
  bool Exists(std::string_view repository, std::string_view collector) const;
  CCollectorRecord Read(std::string_view repository, std::string_view collector) const;

 private:
  const CGlobalDefs& defs_;
};

}  // namespace qm
