// The arguments of a subcommand taken apart: its options ("--name", with a
// value for those that take one) and its other words, each in the order given.
#pragma once

#include <cstdint>
#include <initializer_list>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace qm::cli {

struct ArgumentList {
  std::vector<std::string> words;
  std::vector<std::pair<std::string, std::string>> options;  // name, value ("" for a flag)
  bool help = false;                                         // --help or -h given

  // The last value given for name, if any.
  std::optional<std::string> Last(std::string_view name) const;
  bool Has(std::string_view name) const { return Last(name).has_value(); }
  // The words joined with blanks: a statement the shell split.
  std::string JoinedWords() const;
};

// Splits args: an argument starting with "--" is an option and must be one
// of with_value (its value is the next argument) or flags. Returns an error
// text for an unknown option or a missing value, else empty.
std::string SplitArguments(const std::vector<std::string>& args,
                           std::initializer_list<std::string_view> with_value,
                           std::initializer_list<std::string_view> flags, ArgumentList& out);

// A decimal integer of at least minimum that fits 32 bits; nothing otherwise.
std::optional<int32_t> WholeNumber(std::string_view text, int32_t minimum);

}  // namespace qm::cli
