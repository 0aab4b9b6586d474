// The column list of a findex definition: NAME[:TAG=VALUE[:TAG=VALUE...]],
// columns separated by commas. Commas and colons inside double quotes do not
// separate (BASE_URL="http://host/docs/").
#pragma once

#include <string_view>

#include "format/index_header.h"

namespace qm {

// Replaces column_map by the columns of the list (a repeated column replaces
// the earlier one). An empty list, an empty column or tag name, a tag without
// "=" or an unterminated double quote is PiCmd error 17 raised with method;
// column_map is then left as it was.
void ParseFindexColumns(std::u16string_view columns, ColumnMap& column_map, const char* method);

}  // namespace qm
