// The enumerations of the type library: information values, languages and the
// five option sets of the command object.
#pragma once

#include <cstdint>

namespace qm {

// GetFindexInfo.
enum idxInfoEnum : int32_t {
  idxTableName = 1,
  idxColumnNames = 2,
  idxKeyName = 3,
  idxTypeName = 5,   // "Integer", "Double", "Text (Ansi)", "Text (Unicode)", "Date/Time", "Error"
  idxWordCount = 6,  // summed over the add-on findexes
  idxKeyCount = 7,   // summed over the add-on findexes
  idxVersion = 10,
  idxDistinctWordCount = 11,   // summed over the add-on findexes
  // Enumeration names kept as written (hosts use them): do not correct.
  idxFracmentationLevel = 21,  // the number of add-on findexes
  idxDBConnectionString = 35,
  idxSQLSelect = 36,       // lower-cased
  idxDBDisplayName = 47,   // lower-cased
  idxSQLUsedAsTable = 49,  // "Yes" or "No"
  idxBuildTime = 69,
  idxLastUpdateTime = 70,
  idxType = 72,
  idxIndexMaxSize = 80,     // answered with an empty text
  idxIndexStartValue = 81,  // answered with an empty text
};

// GetOrderInfo; every answer is lower-cased.
enum odrInfoEnum : int32_t {
  odrTableName = 1,
  odrColumnNames = 2,
  odrKeyName = 3,
  odrVersion = 10,
  odrDBConnectionString = 35,
  odrSQLSelect = 36,
  odrDBDisplayName = 47,
  odrSQLUsedAsTable = 49,
  odrBuildTime = 69,
  odrLastUpdateTime = 70,
  odrTypeName = 73,  // "integer", "double", "text", "text (unicode)", "date/time", "error"
  odrType = 74,
};

enum lngLanguageEnum : int32_t {
  lngDanish = 1,
  lngEnglish = 2,
  lngFrench = 3,
  lngSpanish = 4,
  lngPortuguese = 5,
  lngItalian = 6,
  lngGerman = 7,
  lngDutch = 8,
  lngSwedish = 9,
  lngNorwegian = 10,
  lngRussian = 11,
  lngOther = 12,
};

// GetIndexLanguageOption. Defaults: English, stop words and accent removal.
enum iloLanguageOptionEnum : int32_t {
  iloLanguage = -1,
  iloUseStemming = 1,
  iloUsePhonetic = 2,
  iloRemoveAccent = 4,
  iloUseCharacterTranslation = 8,
  iloUseStopWords = 16,
};

// GetIndexGeneralOption. Defaults: phrases, default separators, save connection.
enum igoGeneralOptionEnum : int32_t {
  igoIndexMaxSize = -1,  // units of 100,000 keys; 0 = no limit
  igoIndexStartValue = -2,
  igoSeparators = -3,  // blanks shown as <SPACE>, <NEW_LINE>, <LINE_FEED>, <TAB>
  igoSupportScore = 1,
  igoSupportPhrases = 2,
  igoUseDefaultSeparators = 4,
  igoSaveDatabaseConnection = 8,
  igoRemoveHtml = 16,
  igoUseUnicode = 32,  // reported only; no setter sets it
};

// GetIndexUpdateOption.
enum iuoUpdateOptionEnum : int32_t {
  iuoUpdateSupport = -1,
  iuoUseDateTimeKey = 1,
  iuoUseDateTimeFraction = 2,
};

// GetOrderGeneralOption.
enum ogoGeneralOptionEnum : int32_t {
  ogoIgnoreChars = -1,
  // Enumeration names kept as written (hosts use them): do not correct.
  ogoIgnorreCase = 1,
  ogoSaveDatabaseConnection = 2,
};

// GetOrderUpdateOption.
enum ouoUpdateOptionEnum : int32_t {
  ouoUpdateSupport = -1,
  ouoUseDateTimeKey = 1,
  ouoUseDateTimeFraction = 2,
};

}  // namespace qm
