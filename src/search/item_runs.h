// Item arrays as the lookup fills them: a sequence of runs, one per word read
// (and per findex of a view), each run starting with a count row whose key
// column holds the rows of the run, count row included. An empty array or a
// zero count ends the sequence.
//
// The operators of the evaluator need one key-sorted array: MergeRuns turns
// a sequence of runs into that.
#pragma once

#include <cstdint>

namespace qm {

class CItems;

// The number of runs in items, checking that every count row lies inside the
// array; a count that does not raises a "GiFIndex" error (a damaged array).
int32_t CountRuns(const CItems& items);

// Merges every run of items into one run sorted by key, with one count row
// at row 0. Rows with equal keys: with a position column both are kept,
// ordered by position; without one they become one row (the earlier run's)
// whose score, when there is a score column, is the sum of both (saturating).
// Each run must be sorted by key (and position). An empty array stays empty;
// a single run is left as it is.
void MergeRuns(CItems& items);

}  // namespace qm
