// The option getters' answers: one option of a set of index or order options
// as text, asked for by its value in the option enumerations of
// quillmere/api_enums.h. The same rendering serves the engine's current
// options and the options stored in a findex header or order info.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "format/index_options.h"
#include "format/index_header.h"
#include "format/order_info.h"

namespace qm {

// A bit option gives "1" or "0", a number its decimal text, the separators and
// ignore characters their text; an option value not in the set gives "".
std::string IndexLanguageOptionText(const IndexOptions& options, int32_t option);
std::string IndexGeneralOptionText(const IndexOptions& options, int32_t option);
std::string IndexUpdateOptionText(const IndexOptions& options, int32_t option);
std::string OrderGeneralOptionText(const OrderOptions& options, int32_t option);
std::string OrderUpdateOptionText(const OrderOptions& options, int32_t option);

// Separators as UTF-8 with space, line feed, carriage return and tab written
// as "<SPACE>", "<NEW_LINE>", "<LINE_FEED>" and "<TAB>".
std::string SeparatorText(std::u16string_view separators);

}  // namespace qm
