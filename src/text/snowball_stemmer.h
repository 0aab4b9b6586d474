// One Snowball stemmer (libstemmer) used with UTF-16 words: the word is
// lower-cased and encoded as UTF-8 for the stemmer, and the stem comes back
// upper-cased. Not shareable between threads.
#pragma once

#include <memory>
#include <string>
#include <string_view>

struct sb_stemmer;

namespace qm::text {

class SnowballStemmer {
 public:
  // Null when libstemmer does not know the algorithm (or is out of memory).
  static std::unique_ptr<SnowballStemmer> Create(const char* algorithm);

  // Stems an upper-case word into out (upper case). False if the stemmer failed.
  bool Stem(std::u16string_view word, std::u16string& out);

 private:
  struct Deleter {
    void operator()(sb_stemmer* stemmer) const;
  };
  explicit SnowballStemmer(sb_stemmer* stemmer) : stemmer_(stemmer) {}

  std::unique_ptr<sb_stemmer, Deleter> stemmer_;
  std::string utf8_;  // reused between words
};

}  // namespace qm::text
