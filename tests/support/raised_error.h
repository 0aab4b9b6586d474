// What a failing call raised: the exception's number and outermost text.
#pragma once

#include <gtest/gtest.h>

#include <string>

#include "platform/text_encoding.h"
#include "base/exception.h"

namespace qm::test {

struct Raise {
  int32_t number = -1;
  std::string text;
};

// Runs body and describes the E it raises (number -1, with a failure
// recorded, when it raises nothing or something else).
template <class E, class Body>
Raise Raised(Body&& body) {
  try {
    body();
  } catch (const E& e) {
    return {e.GetErrorNumber(), Utf16ToUtf8(e.GetEntries().front().text)};
  } catch (...) {
  }
  ADD_FAILURE() << "the expected exception was not raised";
  return {};
}

}  // namespace qm::test
