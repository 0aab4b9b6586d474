// The other process of the temporary-name tests: takes names from a group's
// generator and prints one a line.
//
//   temp_name_taker DATA_DIR GROUP CALLER COUNT
//
// Exits 0, or 1 with the error text on stderr.
#include <cstdlib>
#include <iostream>
#include <string>

#include "base/exception.h"
#include "config/global_defs.h"

int main(int argc, char** argv) {
  if (argc != 5) {
    std::cerr << "usage: temp_name_taker DATA_DIR GROUP CALLER COUNT\n";
    return 2;
  }
  qm::CGlobalDefs defs;
  defs.SetDataPath(argv[1]);
  defs.SetGroup(argv[2]);
  const int caller = std::atoi(argv[3]);
  const int count = std::atoi(argv[4]);
  try {
    std::string out;
    for (int i = 0; i < count; ++i) out += qm::SLGetTempFileName(defs, true, caller) + "\n";
    std::cout << out;
  } catch (qm::CExceptionBase& e) {
    std::cerr << e.GetFullTextUtf8(100);
    return 1;
  }
  return 0;
}
