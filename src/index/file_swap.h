// Putting a finished build's files in place of the ones it replaces: the
// renames of the swap, undone when one fails part-way, and the exclusive
// lock the swap waits for. Findexes and orders each choose the order of their
// renames and the message of a failure.
#pragma once

#include <functional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "config/temp_file_claim.h"
#include "locks/lock_manager.h"
#include "base/exception_family.h"

namespace qm::file_swap {

// The renames of one swap, remembered so that a failure can put every file
// back. Renames and deletes that fail on the way back are traced under
// error_tag, never raised.
class Renames {
 public:
  explicit Renames(const char* error_tag) : error_tag_(error_tag) {}

  // Renames target to backup when target exists; DropBackups deletes it.
  void SetAside(const std::string& target, const std::string& backup);
  // Renames from onto to. Raises the file system's refusal.
  void Move(const std::string& from, const std::string& to);
  // Every rename done, undone from the last one on.
  void Undo();
  // Deletes the files set aside, once the new ones are all in place.
  void DropBackups();

 private:
  const char* error_tag_;
  std::vector<std::pair<std::string, std::string>> done_;  // from, to
  std::vector<std::string> backups_;
  // The files set aside carry temporary names: locked until the swap ends,
  // so a sweep takes them only from a swap that died.
  std::vector<TempFileClaim> held_;
};

// Deletes path; a failure is traced under error_tag: the swap it belongs to
// is already whole.
void DropQuietly(const std::string& path, const char* error_tag);

inline constexpr int kExclusiveAttempts = 3;

void TraceNoExclusiveAccess(const char* error_tag, std::string_view what, std::string_view name,
                            int attempt);

// Takes lock exclusively, tried again after a time-out: a search may hold its
// reader unit for a while, and the finished build is worth the wait. The
// last time-out raises Error naming method ("Could not get exclusive access
// to findex BOOKS ..."); what: "findex" or "order".
template <class Error>
void LockExclusively(CLockManager& lock, std::string_view what, std::string_view name,
                     const char* method, const char* error_tag) {
  for (int attempt = 1;; ++attempt) {
    try {
      lock.LockExclusive();
      return;
    } catch (const CException& e) {
      TraceNoExclusiveAccess(error_tag, what, name, attempt);
      if (attempt == kExclusiveAttempts) {
        throw Error::Text("Could not get exclusive access to %s %s to put the new build in place",
                          method, &e, what, name);
      }
    }
  }
}

// Tests: hook runs before every rename onto a target; when it returns true
// the rename fails as if the file system refused it. An empty function
// removes the hook.
void SetRenameHookForTesting(std::function<bool(const std::string& target)> hook);

}  // namespace qm::file_swap
