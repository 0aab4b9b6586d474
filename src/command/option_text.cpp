#include "command/option_text.h"

#include <initializer_list>

#include "platform/text_encoding.h"
#include "quillmere/api_enums.h"

namespace qm {

namespace {

// Sets out to "1" or "0" and returns true when option is one of bits.
bool BitText(int32_t flags, int32_t option, std::initializer_list<int32_t> bits, std::string& out) {
  for (const int32_t bit : bits) {
    if (option == bit) {
      out.assign(1, (flags & bit) != 0 ? '1' : '0');  // a literal trips GCC 12's -Wrestrict
      return true;
    }
  }
  return false;
}

}  // namespace

std::string IndexLanguageOptionText(const IndexOptions& options, int32_t option) {
  if (option == iloLanguage) return std::to_string(options.Language);
  std::string out;
  BitText(options.LanguageFlags, option,
          {kIloUseStemming, kIloUsePhonetic, kIloRemoveAccent, kIloUseCharacterTranslation,
           kIloUseStopWords},
          out);
  return out;
}

std::string IndexGeneralOptionText(const IndexOptions& options, int32_t option) {
  switch (option) {
    case igoIndexMaxSize: return std::to_string(options.IndexMaxSize);
    case igoIndexStartValue: return std::to_string(options.IndexStartValue);
    case igoSeparators: return SeparatorText(options.Separators);
    default: break;
  }
  std::string out;
  BitText(options.GeneralFlags, option,
          {kIgoSupportScore, kIgoSupportPhrases, kIgoUseDefaultSeparators,
           kIgoSaveDatabaseConnection, kIgoRemoveHtml, kIgoUseUnicode},
          out);
  return out;
}

namespace {

// Findexes and orders share the update flags; each names its support option.
std::string UpdateOptionText(int32_t flags, int32_t support, int32_t option,
                             int32_t support_option) {
  if (option == support_option) return std::to_string(support);
  std::string out;
  BitText(flags, option, {kUpdateUseDateTimeKey, kUpdateUseDateTimeFraction}, out);
  return out;
}

}  // namespace

std::string IndexUpdateOptionText(const IndexOptions& options, int32_t option) {
  return UpdateOptionText(options.UpdateFlags, options.UpdateSupport, option, iuoUpdateSupport);
}

std::string OrderGeneralOptionText(const OrderOptions& options, int32_t option) {
  if (option == ogoIgnoreChars) return Utf16ToUtf8(options.IgnoreChars);
  std::string out;
  BitText(options.GeneralFlags, option, {kOgoIgnoreCase, kOgoSaveDatabaseConnection}, out);
  return out;
}

std::string OrderUpdateOptionText(const OrderOptions& options, int32_t option) {
  return UpdateOptionText(options.UpdateFlags, options.UpdateSupport, option, ouoUpdateSupport);
}

std::string SeparatorText(std::u16string_view separators) {
  std::u16string shown;
  for (const char16_t c : separators) {
    switch (c) {
      case u' ': shown += u"<SPACE>"; break;
      case u'\n': shown += u"<NEW_LINE>"; break;
      case u'\r': shown += u"<LINE_FEED>"; break;
      case u'\t': shown += u"<TAB>"; break;
      default: shown += c; break;
    }
  }
  return Utf16ToUtf8(shown);
}

}  // namespace qm
