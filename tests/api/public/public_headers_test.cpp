// Built with nothing but include/ on the include path and linked against the
// shared library alone: the public headers stand by themselves, and a host
// that sees only them can create and drive the command and search objects.
#include <gtest/gtest.h>

#include "quillmere/api_command.h"
#include "quillmere/api_enums.h"
#include "quillmere/api_search.h"
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

TEST(PublicHeaders, AHostThatSeesOnlyThemDrivesTheSearchObject) {
  qm::APISearch search;
  int32_t total = -1;
  // No result set yet: a failure result and the error information, no exception.
  EXPECT_EQ(search.GetTotal(&total), qm::DISP_E_EXCEPTION);
  EXPECT_EQ(total, -1);
  qm::ErrorInfo info;
  ASSERT_TRUE(qm::GetErrorInfo(info));
  EXPECT_EQ(info.Source, u"QuillmereAPI.APISearch.1");
}

}  // namespace
