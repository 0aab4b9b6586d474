// Helpers for the file and settings tests: recorded retry pauses and the texts
// of raised exceptions.
#pragma once

#include <gtest/gtest.h>

#include <chrono>
#include <functional>
#include <string>
#include <vector>

#include "platform/text_encoding.h"
#include "shared/exception.h"
#include "shared/retry_pause.h"

namespace qm::test {

// Records every retry pause instead of sleeping; on_pause (if given) runs at
// each pause with its 1-based count, so a test can change the world between
// attempts.
class PauseRecorder {
 public:
  explicit PauseRecorder(std::function<void(std::size_t)> on_pause = {})
      : on_pause_(std::move(on_pause)) {
    SetRetryPauseHookForTesting([this](std::chrono::milliseconds d) {
      pauses_.push_back(d);
      if (on_pause_) on_pause_(pauses_.size());
    });
  }
  ~PauseRecorder() { SetRetryPauseHookForTesting({}); }
  PauseRecorder(const PauseRecorder&) = delete;
  PauseRecorder& operator=(const PauseRecorder&) = delete;

  const std::vector<std::chrono::milliseconds>& Pauses() const { return pauses_; }
  // True when there were count pauses, each of ms milliseconds.
  bool Were(std::size_t count, long ms) const {
    return pauses_ == std::vector<std::chrono::milliseconds>(count, std::chrono::milliseconds(ms));
  }

 private:
  std::function<void(std::size_t)> on_pause_;
  std::vector<std::chrono::milliseconds> pauses_;
};

// Runs body, expects an exception of type E and returns its chain's texts
// (empty, with a failure recorded, when anything else happens).
template <class E, class Body>
std::vector<std::string> RaisedChain(Body&& body) {
  try {
    body();
  } catch (const E& e) {
    std::vector<std::string> texts;
    for (const auto& entry : e.GetEntries()) texts.push_back(Utf16ToUtf8(entry.text));
    return texts;
  } catch (...) {
  }
  ADD_FAILURE() << "the expected exception was not raised";
  return {};
}

// The first (outermost) text of the raised chain.
template <class E, class Body>
std::string RaisedText(Body&& body) {
  const auto chain = RaisedChain<E>(std::forward<Body>(body));
  return chain.empty() ? std::string() : chain.front();
}

}  // namespace qm::test
