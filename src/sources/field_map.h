// The fields a document conversion fills: upper-case name -> text.
#pragma once

#include <map>
#include <string>

namespace qm {

using FieldMap = std::map<std::string, std::string>;

inline constexpr const char* kFieldPlainText = "DEFAULT_PLAIN_TEXT";
inline constexpr const char* kFieldSummary = "DEFAULT_SUMMARY";
inline constexpr const char* kFieldTitle = "DEFAULT_TITLE";

}  // namespace qm
