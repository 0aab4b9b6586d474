#include "search/findex_facts.h"

#include "platform/text_encoding.h"
#include "search/cmd_tree.h"
#include "search/gi_repository.h"
#include "text/language.h"

namespace qm {

GiFindexFactsSource CatalogueFacts(const CGlobalDefs& defs) {
  return [&defs](const std::u16string& findex_name) {
    CGiRepository view(defs);
    view.OpenRepository(Utf16ToUtf8(findex_name));
    GiFindexFacts facts;
    facts.separators = view.GetSeparators();
    facts.findex_type = view.GetFindexType();
    facts.language = view.Language();
    facts.language_options = view.LanguageOptions();
    return facts;
  };
}

// Here rather than beside the other constructor: only what searches the
// catalogue needs the catalogue view.
CGiCmdTree::CGiCmdTree(const CGlobalDefs& defs) : defs_(&defs), facts_(CatalogueFacts(defs)) {}

}  // namespace qm
