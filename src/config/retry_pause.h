// The wait between attempts of a retried file or process operation. Tests
// replace the wait with a hook that records it, so retry counts and delays are
// checked without sleeping; the delays themselves never change.
#pragma once

#include <chrono>
#include <functional>

namespace qm {

void PauseBeforeRetry(std::chrono::milliseconds delay);

using RetryPauseHook = std::function<void(std::chrono::milliseconds)>;
// Test hook: called instead of sleeping; an empty hook restores sleeping.
void SetRetryPauseHookForTesting(RetryPauseHook hook);

}  // namespace qm
