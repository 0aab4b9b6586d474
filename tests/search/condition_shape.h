// A condition tree as text that shows every node kind and operator code.
#pragma once

#include <string>

#include "platform/text_encoding.h"
#include "search/condition_tree.h"

namespace qm::test {

// The tree in a form that shows every kind and code: NAME{value} for a
// condition (with ~flags:modifier when not a plain "="), words as written,
// operators by name around their operands.
inline std::string Shape(const CGiNode& node) {
  switch (node.kind) {
    case GiNodeKind::Word:
      return Utf16ToUtf8(node.text);
    case GiNodeKind::Condition: {
      std::string out = Utf16ToUtf8(node.text);
      if (node.flags != kGiCmpEqual || node.modifier != -1) {
        out += "~" + std::to_string(node.flags) + ":" + std::to_string(node.modifier);
      }
      return out + "{" + Shape(*node.left) + "}";
    }
    case GiNodeKind::Negation:
      return "NOT(" + Shape(*node.left) + ")";
    case GiNodeKind::Operator:
      break;
  }
  std::string name;
  switch (node.op) {
    case kGiOpAnd: name = "AND"; break;
    case kGiOpOr: name = "OR"; break;
    case kGiOpFilter: name = "FILTER"; break;
    case kGiOpAdjacent: name = "ADJ"; break;
    case kGiOpAndNot: name = "ANDNOT"; break;
    case kGiOpFilterNot: name = "FILTERNOT"; break;
    case kGiOpNear: name = "NEAR" + std::to_string(node.near_distance); break;
    default: name = "OP" + std::to_string(node.op); break;
  }
  return name + "(" + Shape(*node.left) + "," + Shape(*node.right) + ")";
}

}  // namespace qm::test
