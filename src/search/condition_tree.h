// The condition tree of one search command: what the parser builds from the
// bracketed condition of a statement and the evaluator walks.
//
// A node is one of four kinds. Children are owned; freeing a node frees its
// subtree. Trees are built by CGiCmdTree and read-only afterwards.
#pragma once

#include <cstdint>
#include <memory>
#include <string>

namespace qm {

enum class GiNodeKind : int32_t {
  Word = 1,       // a word, wildcard pattern or phrase word of a value
  Condition = 2,  // findex name, comparison, value subtree
  Negation = 3,   // NOT child (only before the rewrite)
  Operator = 4,   // left op right
};

// Operator codes of operator and negation nodes.
inline constexpr int32_t kGiOpAnd = 1;
inline constexpr int32_t kGiOpOr = 2;
inline constexpr int32_t kGiOpNot = 3;
inline constexpr int32_t kGiOpFilter = 4;
inline constexpr int32_t kGiOpNone = 5;       // a leaf: no operator in the text
inline constexpr int32_t kGiOpAdjacent = 6;   // the words of a phrase, in order
inline constexpr int32_t kGiOpProximity = 7;  // what 1, 2, 6, 8, 11 merge as under "=|"
inline constexpr int32_t kGiOpAndNot = 8;     // made by the NOT rewrite
inline constexpr int32_t kGiOpFilterNot = 9;  // made by the NOT rewrite
inline constexpr int32_t kGiOpNear = 11;

// Comparison flag bits of a condition node.
inline constexpr int32_t kGiCmpEqual = 1;
inline constexpr int32_t kGiCmpQuestion = 2;
inline constexpr int32_t kGiCmpSimilarPercent = 4;   // "=~" + number
inline constexpr int32_t kGiCmpSimilarDistance = 8;  // "=^" + number
inline constexpr int32_t kGiCmpProximity = 16;       // "=|" + number (distance)
inline constexpr int32_t kGiCmpPlainQuery = 32;      // "=$", rewritten while parsing
inline constexpr int32_t kGiCmpGreater = 64;
inline constexpr int32_t kGiCmpLess = 128;

// NEAR without a written distance.
inline constexpr int32_t kGiDefaultNearDistance = 10;
// Deepest nesting of operators and parentheses a condition may have, so a
// hostile statement cannot exhaust the stack of the parser or the evaluator.
inline constexpr int kGiMaxConditionDepth = 400;
// Longest word text and findex name, in UTF-16 units (a terminator would make 200).
inline constexpr std::size_t kGiMaxNodeText = 199;

struct CGiNode {
  GiNodeKind kind = GiNodeKind::Word;
  // Word: the word (upper case, quotes undone). Condition: the findex name.
  std::u16string text;
  // Condition only.
  int32_t flags = 0;
  int32_t modifier = -1;  // -1: no number written
  // Operator and negation: the operator code. Operator with NEAR: the distance.
  int32_t op = kGiOpNone;
  int32_t near_distance = 0;
  // Operator: both operands. Condition (value subtree) and negation: left only.
  std::unique_ptr<CGiNode> left;
  std::unique_ptr<CGiNode> right;

  const CGiNode* Child() const { return left.get(); }

  static std::unique_ptr<CGiNode> Word(std::u16string word) {
    auto n = std::make_unique<CGiNode>();
    n->kind = GiNodeKind::Word;
    n->text = std::move(word);
    return n;
  }
  static std::unique_ptr<CGiNode> Operator(int32_t code, std::unique_ptr<CGiNode> l,
                                           std::unique_ptr<CGiNode> r) {
    auto n = std::make_unique<CGiNode>();
    n->kind = GiNodeKind::Operator;
    n->op = code;
    n->left = std::move(l);
    n->right = std::move(r);
    return n;
  }
};

}  // namespace qm
