// The numbered errors: their texts and levels live in the error-message file
// (data/System/mrvconf.txt, made into mrvconf.ini), the numbers here. Hosts
// and stored job states match on the numbers, so they never change.
#pragma once

#include <cstdint>

namespace qm {

enum ErrorNumber : int32_t {
  kErrOptionsDoNotMatch = 10,      // options or result-set columns do not fit
  kErrOutOfMemory = 11,
  kErrCommandSyntax = 13,          // a word missing or not the expected one
  kErrNoCommand = 15,              // empty statement or unknown command
  kErrExtraWords = 16,
  kErrColumnList = 17,
  kErrOnOrRebuild = 18,
  kErrOrderNoRows = 26,
  kErrWordTreeFull = 29,
  kErrConnectToDatabase = 31,
  kErrCreateIndexRefused = 36,
  kErrConnectionSettings = 40,
  kErrGroupMissing = 41,
  kErrDropAddOn = 44,
  kErrDeleteKey = 46,
  kErrFindexNoRows = 47,
  kErrEmptySearchCondition = 52,
  kErrNeedsPositions = 57,
  kErrSortDirection = 59,
  kErrNoScoreSupport = 60,
  kErrNoOrderForColumn = 61,
};

}  // namespace qm
