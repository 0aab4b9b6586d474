// Findexes built through the command object from the test's SQLite database,
// and lookups on them through the catalogue view: what keys a word, range,
// pattern or similarity search brings back.
#pragma once

#include <gtest/gtest.h>

#include <set>
#include <string>
#include <vector>

#include "api/command_fixture.h"
#include "base/exception.h"
#include "base/exception_family.h"
#include "format/column_set.h"
#include "format/items.h"
#include "search/findex_check.h"
#include "search/gi_findex.h"
#include "search/gi_repository.h"
#include "search/item_runs.h"
#include "search/word_search.h"

namespace qm::test {

struct Found {
  std::vector<int32_t> keys;  // item keys in array order, count rows left out
  int32_t runs = 0;
  int32_t rows = 0;           // count rows included
  bool found = false;
  bool truncated = false;
  std::string error;          // the failure's text, when the lookup failed
};

class LookupFixture : public CommandFixture {
 protected:
  void SetUp() override {
    CommandFixture::SetUp();
    UseSqlite();
    // Every word is indexed as written: no stop words, stems or accents.
    ASSERT_EQ(command_->SetIndexLanguageOptions(2, VARIANT_FALSE, VARIANT_FALSE, VARIANT_FALSE,
                                                VARIANT_FALSE, VARIANT_FALSE),
              S_OK);
    // Settings made after the trace level file, so the lookup's lines are written.
    defs_ = CGlobalDefs();
    defs_.SetDataPath(home_.Data());
  }

  // A table of (id integer, <column>) with rows, and a findex over the column.
  void Build(const std::string& findex, const std::string& column_type,
             const std::vector<std::string>& rows) {
    const std::string table = "t_" + findex;
    std::vector<std::string> statements{"create table " + table + " (id integer, v " +
                                        column_type + ")"};
    // Batches of rows per statement: one commit each.
    std::string values;
    for (std::size_t i = 0; i < rows.size(); ++i) {
      values += (values.empty() ? "(" : ",(") + rows[i] + ")";
      if ((i + 1) % 250 == 0 || i + 1 == rows.size()) {
        statements.push_back("insert into " + table + " values " + values);
        values.clear();
      }
    }
    Sql(statements);
    ASSERT_EQ(Run("CREATE FINDEX " + findex + " ON TABLE " + table + " COLUMNS v KEY id"), "");
    // Every findex a build writes passes the check that operators run.
    EXPECT_EQ(CheckFindexFiles(defs_, findex), std::vector<std::string>{});
  }

  // Looks word up in every findex of the view of name, as one key-sorted array.
  Found Lookup(const std::string& name, const CWordSearch& word, int32_t flags = 0,
               int32_t modifier = -1, int64_t limit = 0) {
    Found out;
    try {
      CGiRepository view(defs_);
      view.OpenRepository(name);
      CItems items(CColumnSet::FromGeneralFlags(view.Header().GeneralFlags));
      for (int32_t i = 0; i < view.GetFindexCount(); ++i) {
        const CLookupResult r = view.GetFindex(i).GetItems(items, word, flags, modifier, limit, i > 0);
        out.runs += r.runs;
        out.found = out.found || r.found;
        out.truncated = out.truncated || r.truncated;
      }
      out.rows = items.Count();
      MergeRuns(items);
      Collect(items, out);
    } catch (const CExceptionBase& e) {
      out.error = e.GetFullTextUtf8(kLevelGeneral);
    }
    return out;
  }

  // The keys of a merged array (one count row first).
  static void Collect(const CItems& items, Found& out) {
    for (int32_t i = 1; i < items.Count(); ++i) out.keys.push_back(items.Key(i));
  }

  Found Text(const std::string& name, const std::u16string& word, int32_t flags = 0,
             int32_t modifier = -1, int64_t limit = 0, int32_t type = 2) {
    return Lookup(name, CWordSearch::ForText(word, type), flags, modifier, limit);
  }

  CGlobalDefs defs_;
};

}  // namespace qm::test
