// CLanguage: the per-language normalisation of words for a findex and for the
// search words that meet it (stop words, accent removal, Snowball stemming,
// character translation, phonetic code), configured from the language folder.
//
// One object serves one index build or one search; it reuses internal buffers
// and is not shareable between threads.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "quillmere/api_enums.h"
#include "text/character_table.h"
#include "text/character_translation.h"
#include "text/phonet.h"
#include "text/snowball_stemmer.h"
#include "text/stop_words.h"

namespace qm {

class CGlobalDefs;

inline constexpr int32_t kDefaultLanguage = lngEnglish;

// The folder name of a language below the language folder ("English"), or
// empty outside 1-12.
std::string_view LanguageFolderName(int32_t language);
// The libstemmer algorithm of a language, or null (language 12).
const char* LanguageStemmerName(int32_t language);

class CLanguage {
 public:
  // Bit values of the steps in an index's language options.
  static constexpr int32_t kUseStemming = 1;
  static constexpr int32_t kUsePhonetic = 2;
  static constexpr int32_t kRemoveAccents = 4;
  static constexpr int32_t kUseCharacterTranslation = 8;
  static constexpr int32_t kUseStopWords = 16;

  // info.txt's phonetic mode that selects the phonet rules of 1.dat.
  static constexpr int32_t kPhonetMode = 2;

  // language_folder: the languages folder (ending in "/") holding one folder
  // per language and General/ with the character tables.
  explicit CLanguage(std::string language_folder);
  // The Language folder (kind 17) of the settings' data directory; a missing
  // data path raises a "Language" error with the settings' failure chained.
  explicit CLanguage(const CGlobalDefs& defs);
  ~CLanguage();
  CLanguage(const CLanguage&) = delete;
  CLanguage& operator=(const CLanguage&) = delete;

  // (Re)configures the object; returns at once if nothing changed since the
  // last complete load. A failed load leaves the object unconfigured (every
  // step off) and raises a "Language" error.
  void LoadLanguage(int32_t language, bool use_stop_words, bool use_stemming, bool use_phonetic,
                    bool remove_accents, bool use_character_translation);
  // The same, from the option bits above.
  void LoadLanguage(int32_t language, int32_t options);

  // True if the word (upper case, as cut) is a stop word. False when stop
  // words are off.
  bool IsStopWord(std::u16string_view word) const;

  // Steps 2-5 (accents, stemming, translation, phonetic code) on an upper-case
  // word; the stop word test is the caller's, made before. out may be reused
  // from word to word and must not alias word.
  void Normalise(std::u16string_view word, std::u16string& out);
  std::u16string Normalise(std::u16string_view word);
  // UTF-8 in and out.
  std::string Normalise(std::string_view word);

  bool IsLoaded() const { return loaded_; }
  int32_t GetLanguage() const { return config_.language; }
  int32_t GetOptions() const;
  const std::string& GetLanguageFolder() const { return folder_; }

 private:
  struct Config {
    int32_t language = 0;
    bool use_stop_words = false;
    bool use_stemming = false;
    bool use_phonetic = false;
    bool remove_accents = false;
    bool use_character_translation = false;
    bool operator==(const Config&) const = default;
  };

  void Load(const Config& wanted);
  void Reset();
  std::string LanguagePath(int32_t language, std::string_view file) const;
  void InitializeStemming(int32_t language);
  void InitializePhonetic(int32_t language);
  void LoadCharacterTranslations(int32_t language);
  void LoadStopWords(int32_t language);
  void RemoveAccents(std::u16string& word) const;
  void Stem(std::u16string& word);
  void ApplyCharacterTranslationW(std::u16string& word);
  void ApplyPhonetic(std::u16string& word);

  std::string folder_;
  Config config_;
  bool loaded_ = false;

  int32_t phonetic_mode_ = 0;
  std::string table_name_;
  std::optional<text::CharacterTable> table_;
  std::unique_ptr<text::SnowballStemmer> stemmer_;
  std::optional<text::PhonetRules> phonet_;
  std::optional<text::CharacterTranslationList> translations_;
  std::optional<text::StopWordList> stop_words_;

  // Reused from word to word.
  std::u16string scratch_;
  std::u16string work_;
  std::u16string wide_in_;
  std::u16string wide_out_;
};

}  // namespace qm
