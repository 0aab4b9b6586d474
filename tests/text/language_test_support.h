// Helpers shared by the language tests: fixture paths, tab-separated tables,
// the failure text of a call, and a language folder in a scratch directory.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "support/test_support.h"

namespace qm::test {

// tests/text/fixtures/ + relative.
std::string FixturePath(const std::string& relative);
// data/Language/ of the source tree.
std::string ShippedLanguageFolder();

// The tab-separated fields of every non-empty line that does not start with "#".
std::vector<std::vector<std::string>> ReadTable(const std::string& path);

inline bool Contains(const std::string& text, const std::string& part) {
  return text.find(part) != std::string::npos;
}

// The full message chain of the engine exception body raises, or "" if none.
std::string FailureText(const std::function<void()>& body);

// A language folder below a scratch directory holding the shipped character
// table in General/ and one language folder per Write call.
class LanguageFolder {
 public:
  LanguageFolder();
  const std::string& Path() const { return dir_.Path(); }
  // Writes folder/file with these bytes (folder "General" for tables).
  void Write(const std::string& folder, const std::string& file, const std::string& bytes);
  // Writes UTF-16LE text with a byte-order mark.
  void WriteUtf16(const std::string& folder, const std::string& file, const std::u16string& text);
  // info.txt, lang.txt and stop.txt (empty lists) for a folder.
  void WriteMinimal(const std::string& folder, int phonetic_mode = 1);

 private:
  ScratchDir dir_;
};

}  // namespace qm::test
