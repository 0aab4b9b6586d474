// How the text values of a type 2 order are prepared before they are sorted
// and stored: with ignore case upper-cased (the ignore characters too), then
// the ignore characters trimmed from both ends. Values that are equal after
// this share one entry of the column file and one rank.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace qm {

class OrderTextPreparation {
 public:
  // general_flags: the order's general option flags (bit 1 ignore case).
  OrderTextPreparation(int32_t general_flags, std::u16string_view ignore_chars);

  bool IgnoresCase() const { return ignore_case_; }

  // In place; narrow text is UTF-8.
  void Prepare(std::string& utf8) const;
  void Prepare(std::u16string& text) const;

 private:
  bool Ignored(char32_t c) const;

  bool ignore_case_;
  std::vector<char32_t> ignored_;  // sorted code points
};

}  // namespace qm
