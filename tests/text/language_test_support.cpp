#include "text/language_test_support.h"

#include <sys/stat.h>

#include <sstream>

#include "base/exception.h"

namespace qm::test {

std::string FixturePath(const std::string& relative) {
  return std::string(QM_TEST_SOURCE_DIR) + "text/fixtures/" + relative;
}

std::string ShippedLanguageFolder() { return std::string(QM_SOURCE_DATA_DIR) + "Language/"; }

std::vector<std::vector<std::string>> ReadTable(const std::string& path) {
  std::vector<std::vector<std::string>> rows;
  std::istringstream in(ReadFile(path));
  std::string line;
  while (std::getline(in, line)) {
    if (line.empty() || line[0] == '#') continue;
    std::vector<std::string> fields;
    std::size_t start = 0;
    for (;;) {
      const std::size_t tab = line.find('\t', start);
      fields.push_back(line.substr(start, tab == std::string::npos ? std::string::npos : tab - start));
      if (tab == std::string::npos) break;
      start = tab + 1;
    }
    rows.push_back(std::move(fields));
  }
  return rows;
}

std::string FailureText(const std::function<void()>& body) {
  try {
    body();
  } catch (CExceptionBase& e) {
    return e.GetFullTextUtf8(1000);
  }
  return {};
}

LanguageFolder::LanguageFolder() : dir_("language") {
  Write("General", "latin1.tbl", ReadFile(ShippedLanguageFolder() + "General/latin1.tbl"));
}

void LanguageFolder::Write(const std::string& folder, const std::string& file,
                           const std::string& bytes) {
  ::mkdir((Path() + folder).c_str(), 0777);
  WriteFile(Path() + folder + "/" + file, bytes);
}

void LanguageFolder::WriteUtf16(const std::string& folder, const std::string& file,
                                const std::u16string& text) {
  Write(folder, file, Utf16LeFile(text));
}

void LanguageFolder::WriteMinimal(const std::string& folder, int phonetic_mode) {
  Write(folder, "info.txt", "latin1.tbl " + std::to_string(phonetic_mode) + "\n");
  WriteUtf16(folder, "lang.txt", u"");
  WriteUtf16(folder, "stop.txt", u"");
}

}  // namespace qm::test
