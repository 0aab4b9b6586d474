// The other process of the temporary-file tests: a build that dies. It
// creates and holds the given temporary files as a build does, writes into
// them, and is then killed (SIGKILL), so nothing of it can clean up.
//
//   killed_temp_writer PATH...
//
// Dies of SIGKILL, or exits 1 when a file cannot be created.
#include <csignal>
#include <iostream>
#include <optional>
#include <vector>

#include "config/temp_file_claim.h"
#include "platform/file_io.h"

int main(int argc, char** argv) {
  std::vector<qm::TempFileClaim> held;
  for (int i = 1; i < argc; ++i) {
    std::optional<qm::TempFileClaim> claim = qm::TempFileClaim::Create(argv[i]);
    if (!claim || !qm::platform::WriteAll(claim->Get(), "partial", 7)) {
      std::cerr << "cannot create " << argv[i] << "\n";
      return 1;
    }
    held.push_back(std::move(*claim));
  }
  std::raise(SIGKILL);
  return 0;
}
