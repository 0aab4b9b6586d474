// The benchmarks' real text: the machine's package database (or the file
// named by QM_BENCH_TEXT), one value per blank-line separated stanza.
#pragma once

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

namespace bench {

// program: named in the note on standard error when there is no text.
inline std::vector<std::string> PackageStanzas(const char* program) {
  const char* named = std::getenv("QM_BENCH_TEXT");
  const std::string path = named != nullptr ? named : "/var/lib/dpkg/status";
  std::ifstream in(path, std::ios::binary);
  std::stringstream all;
  all << in.rdbuf();
  const std::string text = all.str();
  std::vector<std::string> values;
  for (std::size_t pos = 0; pos < text.size();) {
    std::size_t end = text.find("\n\n", pos);
    if (end == std::string::npos) end = text.size();
    if (end > pos) values.push_back(text.substr(pos, end - pos));
    pos = end + 2;
  }
  if (values.empty()) std::fprintf(stderr, "%s: no text in %s\n", program, path.c_str());
  return values;
}

}  // namespace bench
