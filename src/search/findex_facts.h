// What parsing a condition needs to know about the findex it names: how its
// words were cut and normalised, and the type of its values.
#pragma once

#include <cstdint>
#include <functional>
#include <string>

namespace qm {

class CGlobalDefs;

struct GiFindexFacts {
  std::u16string separators;     // expanded separator text (never empty)
  int32_t findex_type = 0;       // VALUE_TYPE of the indexed words
  int32_t language = 2;
  int32_t language_options = 20; // CLanguage option bits
};

// Looks a findex name (upper case, already a plain name) up; throws when the
// name has no catalogue entry.
using GiFindexFactsSource = std::function<GiFindexFacts(const std::u16string& findex_name)>;

// The facts from the catalogue view of the settings' data directory.
GiFindexFactsSource CatalogueFacts(const CGlobalDefs& defs);

}  // namespace qm
