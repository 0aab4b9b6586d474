// What a failing call raised: the exception's outermost text, or its number.
#pragma once

#include <gtest/gtest.h>

#include <string>

#include "platform/text_encoding.h"
#include "shared/exception.h"

namespace qm::test {

// Runs body and returns the outermost text of the E it raises (empty, with a
// failure recorded, when it raises nothing or something else).
template <class E, class Body>
std::string RaisedText(Body&& body) {
  try {
    body();
  } catch (const E& e) {
    return e.GetEntries().empty() ? std::string() : Utf16ToUtf8(e.GetEntries().front().text);
  } catch (...) {
  }
  ADD_FAILURE() << "the expected exception was not raised";
  return {};
}

// The error number of the E that body raises (-1 when it raises nothing or
// something else).
template <class E, class Body>
int32_t RaisedNumber(Body&& body) {
  try {
    body();
  } catch (const E& e) {
    return e.GetErrorNumber();
  } catch (...) {
  }
  ADD_FAILURE() << "the expected exception was not raised";
  return -1;
}

}  // namespace qm::test
