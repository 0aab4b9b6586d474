// The other processes of the deleted-key tests.
//
//   deleted_key_worker DATA_DIR GROUP FINDEX delete FIRST STEP COUNT
//     deletes FIRST + i x STEP for i = COUNT-1 down to 0.
//   deleted_key_worker DATA_DIR GROUP FINDEX read STOP_FILE
//     reads the list with ReadDeletedKeys in a loop until STOP_FILE exists,
//     then once more; a torn list raises, and no key read before may vanish.
//     Prints "reads N final K" (K keys at the last read). Gives up after
//     kMaxReads reads without a stop file.
//   deleted_key_worker DATA_DIR GROUP FINDEX delete-limited BYTES KEY
//     deletes KEY with files limited to BYTES bytes; prints the failure's text.
//
// Exits 0, or 1 with the reason on stdout.
#include <sys/resource.h>

#include <chrono>
#include <csignal>
#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <iostream>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "index/deleted_keys.h"
#include "base/exception.h"
#include "config/global_defs.h"

namespace {

constexpr long kMaxReads = 100000;

int Fail(const std::string& why) {
  std::cout << why << std::endl;
  return 1;
}

int Read(const qm::CGlobalDefs& defs, const std::string& findex, const std::string& stop) {
  std::set<int32_t> seen;
  long reads = 0;
  for (bool last = false; !last;) {
    last = std::filesystem::exists(stop);
    if (reads == kMaxReads) return Fail("no stop file after " + std::to_string(reads) + " reads");
    // Leaves the deleters room to take every reader unit now and then.
    if (reads > 0) std::this_thread::sleep_for(std::chrono::microseconds(200));
    const std::vector<int32_t> keys = qm::ReadDeletedKeys(defs, findex);
    ++reads;
    // Deletes only add: whatever was seen before must still be there.
    const std::set<int32_t> now(keys.begin(), keys.end());
    for (int32_t k : seen) {
      if (!now.count(k)) return Fail("key " + std::to_string(k) + " disappeared");
    }
    seen = now;
    if (last) std::cout << "reads " << reads << " final " << keys.size() << std::endl;
  }
  return 0;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc < 6) {
    std::cerr << "usage: deleted_key_worker DATA_DIR GROUP FINDEX MODE ARGS...\n";
    return 2;
  }
  qm::CGlobalDefs defs;
  defs.SetDataPath(argv[1]);
  defs.SetGroup(argv[2]);
  const std::string findex = argv[3], mode = argv[4];
  try {
    if (mode == "delete" && argc == 8) {
      const long first = std::atol(argv[5]), step = std::atol(argv[6]), count = std::atol(argv[7]);
      for (long i = count - 1; i >= 0; --i) {
        qm::DeleteKey(defs, findex, static_cast<int32_t>(first + i * step), true);
      }
      return 0;
    }
    if (mode == "read" && argc == 6) return Read(defs, findex, argv[5]);
    if (mode == "delete-limited" && argc == 7) {
      std::signal(SIGXFSZ, SIG_IGN);  // a write past the limit fails instead of killing
      const rlimit limit{static_cast<rlim_t>(std::atol(argv[5])),
                         static_cast<rlim_t>(std::atol(argv[5]))};
      if (setrlimit(RLIMIT_FSIZE, &limit) != 0) return Fail("setrlimit failed");
      qm::DeleteKey(defs, findex, static_cast<int32_t>(std::atol(argv[6])), true);
      return 0;
    }
  } catch (qm::CExceptionBase& e) {
    return Fail(e.GetFullTextUtf8(100));
  }
  std::cerr << "unknown mode or arguments\n";
  return 2;
}
