// Built with nothing but include/ on the include path and linked against the
// shared library alone: the public headers stand by themselves, and a host
// that sees only them can create and drive the command object.
#include <gtest/gtest.h>

#include "quillmere/api_command.h"
#include "quillmere/api_enums.h"
#include "quillmere/automation.h"
#include "quillmere/converter_plugin.h"

namespace {

TEST(PublicHeaders, AHostThatSeesOnlyThemDrivesTheCommandObject) {
  qm::APICommand command;
  int32_t progress = -1;
  ASSERT_EQ(command.GetProgress(&progress), qm::S_OK);
  EXPECT_EQ(progress, 100) << "no job has run";
  // A failure comes back as the documented result, not as an exception.
  EXPECT_EQ(command.SetProcessRights(), qm::S_OK);
}

}  // namespace
