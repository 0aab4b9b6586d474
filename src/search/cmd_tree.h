// CGiCmdTree: one search command. Splits a search statement into the SQL
// around its bracketed condition, parses the condition into a condition tree,
// keeps the ORDER BY list written inside the brackets, and rebuilds plain SQL
// from the keys a search found.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

#include "search/condition_tree.h"
#include "search/findex_facts.h"

namespace qm {

class CGlobalDefs;
class CLanguage;
class CSeparatorSet;

class CGiCmdTree {
 public:
  // Findexes are looked up in the settings' catalogue; languages come from
  // its Language folder. REQUIRES: defs outlives the command.
  explicit CGiCmdTree(const CGlobalDefs& defs);
  // Explicit language folder (ending in "/") and findex lookup.
  CGiCmdTree(std::string language_folder, GiFindexFactsSource facts);
  ~CGiCmdTree();
  CGiCmdTree(const CGiCmdTree&) = delete;
  CGiCmdTree& operator=(const CGiCmdTree&) = delete;

  // Splits the statement and parses its condition (upper-cased).
  void SplitSqlW(std::u16string_view statement);
  // Parses a condition (already upper case): order list, tree, part count,
  // NOT rewrite. A failure leaves no tree standing.
  void StartBuildTreeW(std::u16string_view condition);

  // The parsed tree as text; throws when nothing has been parsed.
  std::u16string TreeToString() const;
  // Replaces the condition field by the SQL for the database.
  void RebuildSql(std::u16string_view key_string, bool score_active,
                  std::u16string_view key_column);
  // The order list for the SQL side: mode 0 as written, mode 1 upper case
  // with every item naming SCORE dropped.
  std::u16string RebuildOrderList(int mode) const;

  // Findex name of the first condition node, left first; throws without one.
  static std::u16string FindFirstIndexW(const CGiNode& subtree);
  // Condition nodes reached through AND/OR/NEAR/adjacency operators; nothing
  // under a negation or on either side of a FILTER counts.
  static int32_t CountSearchParts(const CGiNode* tree);
  // A blank-separated plain query as condition text on one findex.
  static std::u16string ParsePlainQueryW(std::u16string_view text,
                                         std::u16string_view findex_name);

  const std::u16string& SqlHead() const { return head_; }
  const std::u16string& SqlTail() const { return tail_; }
  const std::u16string& OrderList() const { return order_; }
  bool HasOrder() const { return has_order_; }
  // The bracketed condition; after RebuildSql, the rebuilt SQL.
  const std::u16string& Condition() const { return condition_; }
  bool HasScoreColumn() const { return score_column_; }
  int32_t PartCount() const { return part_count_; }
  bool IsParsed() const { return root_ != nullptr; }
  // REQUIRES: IsParsed().
  const CGiNode& Root() const { return *root_; }

 private:
  std::unique_ptr<CGiNode> BuildNode(std::u16string_view text, bool value_mode, int depth);
  // Fills a condition node; true when a plain query replaced it by the tree
  // in node.left.
  bool FillCondition(CGiNode& node, std::u16string_view text, int depth);
  std::u16string RemoveStopWords(std::u16string_view value, const CSeparatorSet& separators);
  CLanguage& Language();

  std::u16string head_;
  std::u16string tail_;
  std::u16string order_;
  bool has_order_ = false;
  std::u16string condition_;
  bool score_column_ = false;
  int32_t part_count_ = 0;
  std::unique_ptr<CGiNode> root_;
  const CGlobalDefs* defs_ = nullptr;  // not owned; null with an explicit folder
  std::string language_folder_;
  std::unique_ptr<CLanguage> language_;
  GiFindexFactsSource facts_;
};

}  // namespace qm
