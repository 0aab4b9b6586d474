// Walking the files of an order to find damage: what `quillmere check order`
// reports, read with the order format's own readers.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace qm {

class CGlobalDefs;

// Every problem of the order name, one text each naming its place
// ("TITLES.srt row 4: ..."); empty when sound: the header reads and its
// column layouts fit its type; the .srt holds the count of rows its size
// and the header say, keys strictly ascending; and for type 2 each column
// file's values strictly ascend, and the keys of its n-th value are exactly
// the keys whose rank in the .srt is n. Reads under a reader unit of the
// order's kind 3 lock. REQUIRES: some file of the order exists.
std::vector<std::string> CheckOrderFiles(const CGlobalDefs& defs, std::string_view name);

}  // namespace qm
