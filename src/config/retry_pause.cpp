#include "config/retry_pause.h"

#include <mutex>
#include <thread>

namespace qm {

namespace {

std::mutex g_hook_mutex;
RetryPauseHook g_hook;

}  // namespace

void PauseBeforeRetry(std::chrono::milliseconds delay) {
  RetryPauseHook hook;
  {
    std::lock_guard lock(g_hook_mutex);
    hook = g_hook;
  }
  if (hook) {
    hook(delay);
  } else {
    std::this_thread::sleep_for(delay);
  }
}

void SetRetryPauseHookForTesting(RetryPauseHook hook) {
  std::lock_guard lock(g_hook_mutex);
  g_hook = std::move(hook);
}

}  // namespace qm
