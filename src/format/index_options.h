// The command engine's current index and order options: every findex or order
// it builds takes a copy of them into its definition.
#pragma once

#include <cstdint>
#include <string>

#include "format/index_header.h"
#include "format/order_info.h"

namespace qm {

// Index language option bits.
inline constexpr int32_t kIloUseStemming = 1;
inline constexpr int32_t kIloUsePhonetic = 2;
inline constexpr int32_t kIloRemoveAccent = 4;
inline constexpr int32_t kIloUseCharacterTranslation = 8;
inline constexpr int32_t kIloUseStopWords = 16;

// Index general option bits.
inline constexpr int32_t kIgoSupportScore = 1;
inline constexpr int32_t kIgoSupportPhrases = 2;
inline constexpr int32_t kIgoUseDefaultSeparators = 4;
inline constexpr int32_t kIgoSaveDatabaseConnection = 8;
inline constexpr int32_t kIgoRemoveHtml = 16;
inline constexpr int32_t kIgoUseUnicode = 32;

// Update option bits (index and order alike).
inline constexpr int32_t kUpdateUseDateTimeKey = 1;
inline constexpr int32_t kUpdateUseDateTimeFraction = 2;

// Order general option bits.
inline constexpr int32_t kOgoIgnoreCase = 1;
inline constexpr int32_t kOgoSaveDatabaseConnection = 2;

struct IndexOptions {
  int32_t Language = 2;
  int32_t LanguageFlags = kIloUseStopWords | kIloRemoveAccent;  // 20
  int32_t GeneralFlags =
      kIgoSupportPhrases | kIgoUseDefaultSeparators | kIgoSaveDatabaseConnection;  // 14
  int32_t IndexMaxSize = 0;  // units of 100,000 keys; 0 = no limit
  int32_t IndexStartValue = 0;
  std::u16string Separators;
  int32_t UpdateFlags = 0;
  int32_t UpdateSupport = 0;

  void CopyTo(CIndexHeader& definition) const {
    definition.Language = Language;
    definition.LanguageFlags = LanguageFlags;
    definition.GeneralFlags = GeneralFlags;
    definition.IndexMaxSize = IndexMaxSize;
    definition.IndexStartValue = IndexStartValue;
    definition.Separators = Separators;
    definition.UpdateFlags = UpdateFlags;
    definition.UpdateSupport = UpdateSupport;
  }
};

struct OrderOptions {
  int32_t GeneralFlags = 0;
  std::u16string IgnoreChars;
  int32_t UpdateFlags = 0;
  int32_t UpdateSupport = 0;

  void CopyTo(COrderInfo& definition) const {
    definition.GeneralFlags = GeneralFlags;
    definition.IgnoreChars = IgnoreChars;
    definition.UpdateFlags = UpdateFlags;
    definition.UpdateSupport = UpdateSupport;
  }
};

}  // namespace qm
