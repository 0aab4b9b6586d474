#include "text/language.h"

#include <array>

#include "platform/text_encoding.h"
#include "base/exception_family.h"
#include "config/global_defs.h"
#include "text/double_metaphone.h"
#include "text/language_file.h"

namespace qm {

namespace {

struct LanguageInfo {
  std::string_view folder;
  const char* stemmer;
};

constexpr std::array<LanguageInfo, 12> kLanguages = {{
    {"Danish", "danish"},
    {"English", "english"},
    {"French", "french"},
    {"Spanish", "spanish"},
    {"Portuguese", "portuguese"},
    {"Italian", "italian"},
    {"German", "german"},
    {"Dutch", "dutch"},
    {"Swedish", "swedish"},
    {"Norwegian", "norwegian"},
    {"Russian", "russian"},
    {"Other", nullptr},
}};

bool IsKnownLanguage(int32_t language) { return language >= 1 && language <= 12; }

[[noreturn]] void ParseError(const char* method) {
  throw CLanguageException::Text("Error parsing file", method, nullptr);
}

// A decimal number with an optional sign, or false.
bool ParseDecimal(std::string_view token, int32_t& value) {
  std::size_t i = 0;
  bool negative = false;
  if (!token.empty() && (token[0] == '-' || token[0] == '+')) {
    negative = token[0] == '-';
    i = 1;
  }
  if (i == token.size()) return false;
  int64_t v = 0;
  for (; i < token.size(); ++i) {
    if (token[i] < '0' || token[i] > '9') return false;
    v = v * 10 + (token[i] - '0');
    if (v > INT32_MAX) return false;
  }
  value = static_cast<int32_t>(negative ? -v : v);
  return true;
}

}  // namespace

std::string_view LanguageFolderName(int32_t language) {
  return IsKnownLanguage(language) ? kLanguages[static_cast<std::size_t>(language - 1)].folder
                                   : std::string_view();
}

const char* LanguageStemmerName(int32_t language) {
  return IsKnownLanguage(language) ? kLanguages[static_cast<std::size_t>(language - 1)].stemmer
                                   : nullptr;
}

CLanguage::CLanguage(std::string language_folder) : folder_(std::move(language_folder)) {
  if (!folder_.empty() && folder_.back() != '/') folder_.push_back('/');
}

CLanguage::CLanguage(const CGlobalDefs& defs)
    : CLanguage(Guard<CLanguageException, CLanguageUnknownException>(
          "CLanguage", [&] { return defs.GetFolder(FolderKind::Language); })) {}

CLanguage::~CLanguage() = default;

std::string CLanguage::LanguagePath(int32_t language, std::string_view file) const {
  std::string path = folder_;
  path.append(LanguageFolderName(language));
  path.push_back('/');
  path.append(file);
  return path;
}

void CLanguage::LoadLanguage(int32_t language, int32_t options) {
  LoadLanguage(language, (options & kUseStopWords) != 0, (options & kUseStemming) != 0,
               (options & kUsePhonetic) != 0, (options & kRemoveAccents) != 0,
               (options & kUseCharacterTranslation) != 0);
}

void CLanguage::LoadLanguage(int32_t language, bool use_stop_words, bool use_stemming,
                             bool use_phonetic, bool remove_accents,
                             bool use_character_translation) {
  const Config wanted{language,       use_stop_words, use_stemming,
                      use_phonetic,   remove_accents, use_character_translation};
  Guard<CLanguageException, CLanguageUnknownException>("LoadLanguage", [&] {
    if (loaded_ && wanted == config_) return;
    try {
      Load(wanted);
    } catch (...) {
      Reset();
      throw;
    }
  });
}

void CLanguage::Reset() {
  loaded_ = false;
  config_ = Config{};
  phonetic_mode_ = 0;
  table_name_.clear();
  table_.reset();
  stemmer_.reset();
  phonet_.reset();
  translations_.reset();
  stop_words_.reset();
}

void CLanguage::Load(const Config& wanted) {
  const int32_t language = wanted.language;
  if (!IsKnownLanguage(language)) {
    throw CLanguageException::Text("Unknown language %i", "LoadLanguage", nullptr, language);
  }
  // Components of the same language are kept; another language rebuilds them all.
  const bool same_language = loaded_ && config_.language == language;
  loaded_ = false;
  if (!same_language) Reset();

  const std::string info = text::ReadLanguageFile(LanguagePath(language, "info.txt"));
  const auto tokens = text::SplitBlankTokens(info);
  int32_t mode = 0;
  if (tokens.size() < 2 || !ParseDecimal(tokens[1], mode)) ParseError("LoadLanguage");
  table_name_ = std::string(tokens[0]);
  phonetic_mode_ = mode;

  if (language != lngOther) {
    const std::string bytes = text::ReadLanguageFile(folder_ + "General/" + table_name_);
    text::CharacterTable table;
    if (!text::CharacterTable::Parse(bytes, table)) ParseError("LoadLanguage");
    table_ = table;
  } else {
    table_.reset();
  }

  if (wanted.remove_accents && language == lngOther) {
    throw CLanguageException::Text(
        "Accents can only be removed for specific languages, not for other languages. Use "
        "custom character translation instead.",
        "LoadLanguage", nullptr);
  }
  if (wanted.use_stemming) {
    InitializeStemming(language);
  } else {
    stemmer_.reset();
  }
  if (wanted.use_phonetic) {
    InitializePhonetic(language);
  } else {
    phonet_.reset();
  }
  if (wanted.use_character_translation) {
    if (!translations_) LoadCharacterTranslations(language);
  } else {
    translations_.reset();
  }
  if (wanted.use_stop_words) {
    if (!stop_words_) LoadStopWords(language);
  } else {
    stop_words_.reset();
  }
  config_ = wanted;
  loaded_ = true;
}

void CLanguage::InitializeStemming(int32_t language) {
  if (language == lngOther) {
    throw CLanguageException::Text(
        "Stemming is only supported for specific languages, not for other languages",
        "InitializeStemming", nullptr);
  }
  if (stemmer_) return;
  stemmer_ = text::SnowballStemmer::Create(LanguageStemmerName(language));
  if (!stemmer_) {
    throw CLanguageException::Text("No stemmer for language %i", "InitializeStemming", nullptr,
                                   language);
  }
}

void CLanguage::InitializePhonetic(int32_t language) {
  if (language == lngOther) {
    throw CLanguageException::Text(
        "Phonetic search is only supported for specific languages, not for other languages",
        "InitializePhonetic", nullptr);
  }
  // English uses Double Metaphone and needs no rule set.
  if (language == lngEnglish || phonet_) return;
  phonet_ = text::PhonetRules::Parse(text::ReadLanguageFile(LanguagePath(language, "1.dat")));
}

void CLanguage::LoadCharacterTranslations(int32_t language) {
  const std::string bytes = text::ReadLanguageFile(LanguagePath(language, "lang.txt"));
  std::u16string file_text;
  text::CharacterTranslationList list;
  if (!text::DecodeUtf16Le(bytes, file_text) ||
      !text::CharacterTranslationList::Parse(file_text, list)) {
    ParseError("LoadCharacterTranslations");
  }
  translations_ = std::move(list);
}

void CLanguage::LoadStopWords(int32_t language) {
  const std::string bytes = text::ReadLanguageFile(LanguagePath(language, "stop.txt"));
  std::u16string file_text;
  if (!text::DecodeUtf16Le(bytes, file_text)) ParseError("LoadStopWords");
  stop_words_ = text::StopWordList::FromText(file_text);
}

int32_t CLanguage::GetOptions() const {
  if (!loaded_) return 0;
  return (config_.use_stemming ? kUseStemming : 0) | (config_.use_phonetic ? kUsePhonetic : 0) |
         (config_.remove_accents ? kRemoveAccents : 0) |
         (config_.use_character_translation ? kUseCharacterTranslation : 0) |
         (config_.use_stop_words ? kUseStopWords : 0);
}

bool CLanguage::IsStopWord(std::u16string_view word) const {
  return Guard<CLanguageException, CLanguageUnknownException>(
      "IsStopWord", [&] { return stop_words_.has_value() && stop_words_->Contains(word); });
}

void CLanguage::RemoveAccents(std::u16string& word) const {
  const auto& plain = table_->Plain();
  for (std::size_t i = 0; i < word.size(); ++i) {
    const char16_t c = word[i];
    // Characters beyond Latin-1 have no entry: they stay as they are.
    if (c > 0xFF) continue;
    const uint8_t mapped = plain[c];
    if (mapped == 0) {
      word.resize(i);
      return;
    }
    word[i] = mapped;
  }
}

void CLanguage::Stem(std::u16string& word) {
  if (!stemmer_->Stem(word, scratch_)) {
    throw CLanguageException::Text("Error stemming word", "Normalise", nullptr);
  }
  word.swap(scratch_);
}

void CLanguage::ApplyCharacterTranslationW(std::u16string& word) {
  translations_->Apply(word, scratch_);
}

void CLanguage::ApplyPhonetic(std::u16string& word) {
  if (config_.language == lngEnglish) {
    text::DoubleMetaphonePrimary(word, scratch_);
    word.swap(scratch_);
    return;
  }
  if (phonetic_mode_ == kPhonetMode && phonet_) {
    phonet_->Encode(word, scratch_, work_);
    word.swap(scratch_);
    return;
  }
  const auto& sound = table_->Sound();
  std::size_t kept = 0;
  for (const char16_t c : word) {
    if (c > 0xFF) {
      word[kept++] = c;  // no entry beyond Latin-1: unchanged
    } else if (sound[c] != 0) {
      word[kept++] = sound[c];
    }
  }
  word.resize(kept);
}

void CLanguage::Normalise(std::u16string_view word, std::u16string& out) {
  out.assign(word);
  if (!loaded_) return;
  if (config_.remove_accents) RemoveAccents(out);
  if (stemmer_) Stem(out);
  if (translations_) ApplyCharacterTranslationW(out);
  if (config_.use_phonetic) ApplyPhonetic(out);
}

std::u16string CLanguage::Normalise(std::u16string_view word) {
  std::u16string out;
  Normalise(word, out);
  return out;
}

std::string CLanguage::Normalise(std::string_view word) {
  wide_in_.clear();
  AppendUtf8AsUtf16(word, wide_in_);
  Normalise(wide_in_, wide_out_);
  return Utf16ToUtf8(wide_out_);
}

}  // namespace qm
