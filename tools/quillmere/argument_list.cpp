#include "argument_list.h"

#include <algorithm>
#include <charconv>

#include "command_registry.h"

namespace qm::cli {

std::optional<std::string> ArgumentList::Last(std::string_view name) const {
  for (auto it = options.rbegin(); it != options.rend(); ++it) {
    if (it->first == name) return it->second;
  }
  return std::nullopt;
}

std::string ArgumentList::JoinedWords() const {
  std::string joined;
  for (const std::string& word : words) {
    if (!joined.empty()) joined += ' ';
    joined += word;
  }
  return joined;
}

std::string SplitArguments(const std::vector<std::string>& args,
                           std::initializer_list<std::string_view> with_value,
                           std::initializer_list<std::string_view> flags, ArgumentList& out) {
  const auto listed = [](std::initializer_list<std::string_view> names, std::string_view a) {
    return std::find(names.begin(), names.end(), a) != names.end();
  };
  for (std::size_t i = 0; i < args.size(); ++i) {
    const std::string& a = args[i];
    if (IsHelpFlag(a)) {
      out.help = true;
    } else if (a.rfind("--", 0) != 0) {
      out.words.push_back(a);
    } else if (listed(with_value, a)) {
      if (i + 1 >= args.size()) return a + " needs a value";
      out.options.emplace_back(a, args[++i]);
    } else if (listed(flags, a)) {
      out.options.emplace_back(a, std::string());
    } else {
      return "unknown option: " + a;
    }
  }
  return {};
}

std::optional<int32_t> WholeNumber(std::string_view text, int32_t minimum) {
  int32_t value = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
  if (text.empty() || error != std::errc() || end != text.data() + text.size() || value < minimum) {
    return std::nullopt;
  }
  return value;
}

}  // namespace qm::cli
