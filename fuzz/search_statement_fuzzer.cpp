// Feeds arbitrary bytes to the search statement parser, the plain-query
// conversion, printing and SQL rebuild. Only the parser's own exception may
// come out, and a parsed tree must hold no negation and print back.
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

#include "base/exception_family.h"
#include "fuzz_check.h"
#include "platform/text_encoding.h"
#include "search/cmd_tree.h"
#include "text/separators.h"

namespace {

using namespace qm;

// Two text findexes and an Integer one; others are unknown.
GiFindexFacts Facts(const std::u16string& name) {
  GiFindexFacts facts;
  facts.separators = u" " + std::u16string(kDefaultSeparatorPunctuation);
  facts.language_options = 0;
  if (name == u"ID") {
    facts.findex_type = 1;
  } else if (name == u"A" || name == u"TITLE") {
    facts.findex_type = 2;
  } else {
    throw CGiRepositoryException::Text("Unknown findex", "OpenRepository", nullptr);
  }
  return facts;
}

void CheckNoNegation(const CGiNode& node) {
  fuzz::Require(node.kind != GiNodeKind::Negation);
  if (node.left) CheckNoNegation(*node.left);
  if (node.right) CheckNoNegation(*node.right);
  fuzz::Require(node.kind != GiNodeKind::Operator || (node.left && node.right));
  fuzz::Require(node.kind != GiNodeKind::Condition || node.left);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, std::size_t size) {
  if (size == 0) return 0;
  std::u16string text;
  if (data[0] % 2 == 0) {
    text = Utf8ToUtf16(std::string_view(reinterpret_cast<const char*>(data + 1), size - 1));
  } else {
    for (std::size_t i = 1; i + 1 < size; i += 2) {
      text.push_back(static_cast<char16_t>(data[i] | (data[i + 1] << 8)));
    }
  }
  CGiCmdTree command("/nonexistent/", Facts);
  try {
    command.SplitSqlW(text);
    CheckNoNegation(command.Root());
    (void)command.TreeToString();
    command.RebuildSql(u"80;(1,2);40;(3);", true, u"ID");
    command.RebuildSql(u"(1)", false, u"ID");
    (void)command.RebuildOrderList(1);
  } catch (const CGiCmdTreeException&) {
  }
  try {
    (void)CGiCmdTree::ParsePlainQueryW(text, u"TITLE");
  } catch (const CGiCmdTreeException&) {
  }
  return 0;
}
