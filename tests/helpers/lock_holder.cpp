// The other process of the lock tests: takes one lock and holds it until told
// to let go.
//
//   lock_holder SCALE MODE LOCK_NAME      MODE: reader | all | writer | exclusive
//
// Prints "trying" before the attempt, then "held" or "failed <text>", each on
// one line; holds until a line arrives on stdin or stdin closes; then releases
// and exits (0 held, 1 failed, 2 usage).
#include <cstdlib>
#include <iostream>
#include <string>

#include "locks/lock_manager.h"
#include "platform/text_encoding.h"
#include "base/exception.h"

int main(int argc, char** argv) {
  if (argc != 4) {
    std::cerr << "usage: lock_holder SCALE MODE LOCK_NAME\n";
    return 2;
  }
  qm::CLockManager::ScaleTimeoutsForTesting(std::atof(argv[1]));
  const std::string mode = argv[2];
  qm::CLockManager lock("", argv[3]);  // the lock folder's root
  std::cout << "trying" << std::endl;
  try {
    if (mode == "reader") {
      lock.LockReader();
    } else if (mode == "all") {
      lock.LockAllReaders();
    } else if (mode == "writer") {
      lock.LockWriter();
    } else if (mode == "exclusive") {
      lock.LockExclusive();
    } else {
      std::cerr << "unknown mode " << mode << "\n";
      return 2;
    }
  } catch (qm::CException& e) {
    std::cout << "failed " << qm::Utf16ToUtf8(e.GetCurrentEntry().text) << std::endl;
    return 1;
  }
  std::cout << "held" << std::endl;
  std::string line;
  std::getline(std::cin, line);
  lock.UnlockAll();
  return 0;
}
