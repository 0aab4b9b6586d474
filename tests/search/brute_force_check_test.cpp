// An independent check of the whole search path: for a generated corpus the
// keys of random word, AND, OR, NOT and phrase conditions must be exactly the
// rows a plain scan of the source text selects.
#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <random>
#include <set>
#include <string>
#include <vector>

#include "search/search_fixture.h"

namespace qm {
namespace {

constexpr int32_t kRows = 3000;

// A row as the scan sees it: sentences of upper-case words.
using Sentences = std::vector<std::vector<std::string>>;

class BruteForceCheckTest : public test::SearchFixture {
 protected:
  void SetUp() override {
    SearchFixture::SetUp();
    // Word frequencies from common to rare, so conditions meet both.
    for (int i = 0; i < 80; ++i) vocabulary_.push_back("w" + std::to_string(i));
    std::mt19937 random(20261206);
    std::vector<std::string> statements{"create table corpus (id integer, body varchar(400))"};
    std::geometric_distribution<int> pick(0.06);
    std::uniform_int_distribution<int> length(1, 14);
    std::uniform_int_distribution<int> sentence_end(0, 6);
    std::string values;
    for (int32_t id = 1; id <= kRows; ++id) {
      std::string body;
      Sentences sentences(1);
      const int words = length(random);
      for (int w = 0; w < words; ++w) {
        const std::string& word =
            vocabulary_[static_cast<std::size_t>(pick(random)) % vocabulary_.size()];
        body += (body.empty() ? "" : " ") + word;
        sentences.back().push_back(Upper(word));
        if (sentence_end(random) == 0 && w + 1 < words) {
          body += ".";
          sentences.emplace_back();
        }
      }
      rows_.push_back(sentences);
      values += (values.empty() ? "(" : ",(") + std::to_string(id) + ", '" + body + "')";
      if (id % 200 == 0 || id == kRows) {
        statements.push_back("insert into corpus values " + values);
        values.clear();
      }
    }
    Sql(statements);
    Options(false, true);
    ASSERT_EQ(Run("CREATE FINDEX Corpus ON TABLE corpus COLUMNS body KEY id"), "");
  }

  static std::string Upper(std::string word) {
    for (char& c : word) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
    return word;
  }

  bool Has(const Sentences& row, const std::string& word) const {
    for (const auto& sentence : row) {
      for (const auto& w : sentence) {
        if (w == word) return true;
      }
    }
    return false;
  }
  bool HasPhrase(const Sentences& row, const std::vector<std::string>& phrase) const {
    for (const auto& sentence : row) {
      for (std::size_t at = 0; at + phrase.size() <= sentence.size(); ++at) {
        if (std::equal(phrase.begin(), phrase.end(),
                       sentence.begin() + static_cast<std::ptrdiff_t>(at))) {
          return true;
        }
      }
    }
    return false;
  }

  template <class Select>
  std::vector<int32_t> Scan(Select&& select) const {
    std::vector<int32_t> keys;
    for (int32_t id = 1; id <= kRows; ++id) {
      if (select(rows_[static_cast<std::size_t>(id - 1)])) keys.push_back(id);
    }
    return keys;
  }

  std::vector<std::string> vocabulary_;
  std::vector<Sentences> rows_;
};

TEST_F(BruteForceCheckTest, RandomConditionsFindTheRowsAScanFinds) {
  std::mt19937 random(7);
  std::geometric_distribution<int> pick(0.08);
  auto word = [&] {
    return vocabulary_[static_cast<std::size_t>(pick(random)) % vocabulary_.size()];
  };
  int checked = 0;
  int non_empty = 0;
  for (int round = 0; round < 60; ++round) {
    const std::string a = word();
    const std::string b = word();
    const std::string c = word();
    const std::string A = Upper(a), B = Upper(b), C = Upper(c);
    struct Query {
      std::string condition;
      std::vector<int32_t> expected;
    };
    const std::vector<Query> queries = {
        {"CORPUS='" + a + "'", Scan([&](const Sentences& r) { return Has(r, A); })},
        {"CORPUS='" + a + "' AND CORPUS='" + b + "'",
         Scan([&](const Sentences& r) { return Has(r, A) && Has(r, B); })},
        {"CORPUS='" + a + "' OR CORPUS='" + b + "' OR CORPUS='" + c + "'",
         Scan([&](const Sentences& r) { return Has(r, A) || Has(r, B) || Has(r, C); })},
        {"CORPUS='" + a + "' AND NOT CORPUS='" + b + "'",
         Scan([&](const Sentences& r) { return Has(r, A) && !Has(r, B); })},
        {"NOT CORPUS='" + a + "'", Scan([&](const Sentences& r) { return !Has(r, A); })},
        {"(CORPUS='" + a + "' OR CORPUS='" + b + "') AND CORPUS='" + c + "'",
         Scan([&](const Sentences& r) { return (Has(r, A) || Has(r, B)) && Has(r, C); })},
        {"CORPUS='" + a + " " + b + "'", Scan([&](const Sentences& r) {
           return HasPhrase(r, {A, B});
         })},
        {"CORPUS='" + a + " " + b + " " + c + "'", Scan([&](const Sentences& r) {
           return HasPhrase(r, {A, B, C});
         })},
    };
    for (const Query& q : queries) {
      SCOPED_TRACE(q.condition);
      const test::SearchOutcome found = Search(q.condition);
      ASSERT_EQ(found.error, "");
      EXPECT_EQ(found.keys, q.expected);
      ++checked;
      if (!q.expected.empty()) ++non_empty;
    }
  }
  // The corpus is meant to give most conditions something to find.
  EXPECT_GT(non_empty, checked / 2);
}

}  // namespace
}  // namespace qm
