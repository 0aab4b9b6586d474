// The other processes of the deleted-key tests.
//
//   deleted_key_worker DATA_DIR GROUP FINDEX delete FIRST STEP COUNT
//     deletes FIRST + i x STEP for i = COUNT-1 down to 0.
//   deleted_key_worker DATA_DIR GROUP FINDEX read STOP_FILE
//     reads the list in a loop until STOP_FILE exists, then once more; each
//     time through ReadDeletedKeys and as raw bytes under its own kind 1 reader
//     lock, checked here without the engine's decoder: the size matches the
//     count, keys ascend strictly, and no key read before ever disappears.
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
#include <fstream>
#include <iostream>
#include <iterator>
#include <set>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "build/deleted_keys.h"
#include "locks/lock_manager.h"
#include "shared/exception.h"
#include "shared/global_defs.h"

namespace {

constexpr long kMaxReads = 100000;

int Fail(const std::string& why) {
  std::cout << why << std::endl;
  return 1;
}

std::vector<int32_t> RawKeys(const std::string& path, std::string& fault) {
  std::ifstream in(path, std::ios::binary);
  const std::string bytes((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
  if (!in.is_open() && !std::filesystem::exists(path)) return {};
  auto word = [&](std::size_t at) {
    uint32_t v = 0;
    for (int i = 3; i >= 0; --i) v = (v << 8) | static_cast<unsigned char>(bytes[at + i]);
    return static_cast<int32_t>(v);
  };
  std::vector<int32_t> keys;
  if (bytes.size() < 4 || word(0) < 0 || bytes.size() != 4 + 4 * std::size_t(word(0))) {
    fault = "torn file of " + std::to_string(bytes.size()) + " bytes";
    return keys;
  }
  for (std::size_t at = 4; at < bytes.size(); at += 4) {
    if (!keys.empty() && word(at) <= keys.back()) fault = "keys out of order";
    keys.push_back(word(at));
  }
  return keys;
}

int Read(const qm::CGlobalDefs& defs, const std::string& findex, const std::string& stop) {
  const std::string path = qm::DeletedKeysPath(defs, findex);
  std::set<int32_t> seen;
  long reads = 0;
  for (bool last = false; !last;) {
    last = std::filesystem::exists(stop);
    if (reads == kMaxReads) return Fail("no stop file after " + std::to_string(reads) + " reads");
    // Leaves the deleters room to take every reader unit now and then.
    if (reads > 0) std::this_thread::sleep_for(std::chrono::microseconds(200));
    std::string fault;
    std::vector<int32_t> raw;
    {
      qm::CLockManager lock(defs.GetGroup(), findex, qm::kLockDeletedKeys);
      lock.LockReader();
      raw = RawKeys(path, fault);
    }
    if (!fault.empty()) return Fail(fault);
    const std::vector<int32_t> keys = qm::ReadDeletedKeys(defs, findex);
    ++reads;
    // Deletes only add: whatever was seen before must still be there.
    for (const std::vector<int32_t>* list : {&std::as_const(raw), &keys}) {
      const std::set<int32_t> now(list->begin(), list->end());
      for (int32_t k : seen) {
        if (!now.count(k)) return Fail("key " + std::to_string(k) + " disappeared");
      }
    }
    seen.insert(keys.begin(), keys.end());
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
