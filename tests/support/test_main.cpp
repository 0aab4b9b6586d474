// The main of every test program. Before any test runs, the process gets a
// scratch root and a lock folder of its own, so tests that ctest runs side by
// side never share a lock, a file or a temporary name, whatever names they use.
#include <gtest/gtest.h>

#include "support/test_support.h"

int main(int argc, char** argv) {
  ::testing::InitGoogleTest(&argc, argv);
  const qm::test::ProcessIsolation isolation;
  return RUN_ALL_TESTS();
}
