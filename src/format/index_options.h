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

  // The options a findex was built with.
  static IndexOptions FromHeader(const CIndexHeader& header) {
    IndexOptions options;
    Fields(options, header, [](auto& to, const auto& from) { to = from; });
    return options;
  }
  void CopyTo(CIndexHeader& definition) const {
    Fields(*this, definition, [](const auto& from, auto& to) { to = from; });
  }

 private:
  // The one list of the fields options and header share: op(option, field).
  template <class Options, class Header, class Op>
  static void Fields(Options& o, Header& h, Op op) {
    op(o.Language, h.Language);
    op(o.LanguageFlags, h.LanguageFlags);
    op(o.GeneralFlags, h.GeneralFlags);
    op(o.IndexMaxSize, h.IndexMaxSize);
    op(o.IndexStartValue, h.IndexStartValue);
    op(o.Separators, h.Separators);
    op(o.UpdateFlags, h.UpdateFlags);
    op(o.UpdateSupport, h.UpdateSupport);
  }
};

struct OrderOptions {
  int32_t GeneralFlags = 0;
  std::u16string IgnoreChars;
  int32_t UpdateFlags = 0;
  int32_t UpdateSupport = 0;

  // The options an order was built with.
  static OrderOptions FromInfo(const COrderInfo& info) {
    OrderOptions options;
    Fields(options, info, [](auto& to, const auto& from) { to = from; });
    return options;
  }
  void CopyTo(COrderInfo& definition) const {
    Fields(*this, definition, [](const auto& from, auto& to) { to = from; });
  }

 private:
  template <class Options, class Info, class Op>
  static void Fields(Options& o, Info& i, Op op) {
    op(o.GeneralFlags, i.GeneralFlags);
    op(o.IgnoreChars, i.IgnoreChars);
    op(o.UpdateFlags, i.UpdateFlags);
    op(o.UpdateSupport, i.UpdateSupport);
  }
};

}  // namespace qm
