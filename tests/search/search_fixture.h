// Searches over findexes that the test builds through the command object
// from its own SQLite database: statements are parsed into a command and
// evaluated into a result set, as the search facade does.
#pragma once

#include <gtest/gtest.h>

#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "api/command_fixture.h"
#include "base/exception.h"
#include "platform/text_encoding.h"
#include "search/cmd_tree.h"
#include "search/gi_tree_rowset.h"

namespace qm::test {

// What one search found: keys in result order, their scores (when the
// findex keeps them), and the result set's state.
struct SearchOutcome {
  std::vector<int32_t> keys;
  std::vector<int32_t> scores;
  int32_t total = 0;
  bool truncated = false;
  std::string error;  // the failure's text, when the search failed
};

class SearchFixture : public CommandFixture {
 protected:
  void SetUp() override {
    CommandFixture::SetUp();
    UseShippedLanguages();
    UseSqlite();
  }

  // Index options for the next builds: scores and phrases as asked, no
  // language step (every word indexed as written).
  void Options(bool scores, bool phrases) {
    ASSERT_EQ(
        command_->SetIndexGeneralOptions(scores ? -1 : 0, phrases ? -1 : 0, 0, nullptr, -1, -1),
        S_OK);
    ASSERT_EQ(command_->SetIndexLanguageOptions(2, 0, 0, 0, 0, 0), S_OK);
  }

  // Runs the condition (the text inside the brackets) on a fresh result set.
  SearchOutcome Search(const std::string& condition, int32_t cache_size = 0) {
    CGlobalDefs defs = Defs();
    CGiTreeRowset rowset(defs);
    rowset.SetCacheSize(cache_size);
    SearchOutcome found;
    try {
      rowset.Commands()
          .Add(std::make_unique<CGiCmdTree>(defs))
          .SplitSqlW(Utf8ToUtf16("SELECT ID FROM T WHERE [" + condition + "]"));
      rowset.StartRowset(1, false);
    } catch (const CExceptionBase& e) {
      found.error = Utf16ToUtf8(e.GetFullText(100));
      return found;
    }
    const CItems& result = rowset.Result();
    for (int32_t i = 1; i < result.Count(); ++i) {
      found.keys.push_back(result.Key(i));
      if (result.Columns().s != 0) found.scores.push_back(result.Row(i)[1]);
    }
    found.total = rowset.GetTotal();
    found.truncated = rowset.IsTruncated();
    return found;
  }

  std::vector<int32_t> Keys(const std::string& condition) {
    const SearchOutcome found = Search(condition);
    EXPECT_EQ(found.error, "") << condition;
    return found.keys;
  }
};

}  // namespace qm::test
