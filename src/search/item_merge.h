// The array operations of search results: the merges of two key-sorted
// result arrays by an operator, the reduction to one row per key, and the
// removal of deleted keys. (A lookup's runs become one array in
// search/item_runs.h.)
//
// A result array holds its count row at row 0 (column 0: the rows including
// the count row) and its rows after it, sorted by key and, for equal keys, by
// position. Every operation here is one linear pass over its inputs.
#pragma once

#include <cstdint>
#include <functional>
#include <span>

#include "format/items.h"

namespace qm {

// The rows a merge may produce, the count row included (0: no limit), and
// whether it had to stop short.
struct MergeLimit {
  int32_t max_rows = 0;
  bool truncated = false;
};

// Result rows without the count row (never below 0).
int32_t ResultRows(const CItems& items);
// An empty result of the given columns: the count row alone.
CItems EmptyResult(const CColumnSet& columns);
// Sets the count row from the array's count.
void StampCount(CItems& items);

// Combines two result arrays of the same columns by an operator code (1 AND,
// 2 OR, 4 FILTER, 6 adjacency, 7 proximity, 8 AND NOT, 9 FILTER NOT, 11
// NEAR); any other code gives an empty result. distance: the proximity or
// NEAR distance (-1 for proximity without a number copies unmatched rows);
// word_count: the words of the enclosing condition, which share the bonuses.
// The limit bounds the rows of OR, proximity and NEAR.
CItems MergeResults(const CItems& left, const CItems& right, int32_t code, int32_t distance,
                    int32_t word_count, MergeLimit& limit);

// AND (1), FILTER (4), AND NOT (8) or FILTER NOT (9) of a result and the
// rows of a condition not yet reduced to one row per key (right_words: the
// condition's words): the same rows and scores as reducing the right side
// first, without reducing the keys the left side never meets.
CItems KeepByCondition(const CItems& left, const CItems& right, int32_t code, int32_t right_words);

// One row per key (the last of each key); with scores, its score becomes
// 200 / word_count + the rows of the key + the highest score among them.
void ReduceItems(CItems& items, int32_t word_count);

// Drops every row whose key is in deleted (ascending); met is called once
// for each deleted key that was found in the array.
void RemoveKeys(CItems& items, std::span<const int32_t> deleted,
                const std::function<void(int32_t key)>& met);

}  // namespace qm
