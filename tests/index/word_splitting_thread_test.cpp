// The text of a findex build split on a thread of its own: the entries it
// hands to the sorting queue are byte for byte those one thread writes by
// splitting the same values in order, over many batches; a stop of the
// sorting side reaches the reader; a reader that gives up does not hang.
#include "index/word_splitting_thread.h"

#include <gtest/gtest.h>

#include <random>
#include <string>
#include <variant>
#include <vector>

#include "format/column_set.h"
#include "format/sort_entry.h"
#include "index/entry_block_queue.h"
#include "platform/text_encoding.h"
#include "support/sorted_file_reader.h"
#include "text/word_pipeline.h"

namespace qm {
namespace {

// One indexed value: none (null), UTF-8 or UTF-16 text.
using Value = std::variant<std::monostate, std::string, std::u16string>;
struct Row {
  int32_t key;
  std::vector<Value> values;
};

WordPipelineOptions PlainOptions() {
  WordPipelineOptions options;
  options.language_flags = 0;  // no language files: words as cut
  options.general_flags = WordPipelineOptions::kAddDefaultSeparators;
  return options;
}

// Rows of three columns with nulls, ASCII and non-ASCII words, words longer
// than a word may be, sentence ends, and both encodings; more text than
// several batches hold.
std::vector<Row> RandomRows(int count) {
  std::mt19937 random(1234);
  const char* const kWords[] = {"alpha", "Beta", "gamma.", "d\xC3\xA9j\xC3\xA0", "x", "end. ",
                                "\xE2\x82\xAC" "100", "\xF0\x9F\x98\x80smile", "zz;", "a-b"};
  std::vector<Row> rows;
  for (int r = 0; r < count; ++r) {
    Row row{static_cast<int32_t>(random() % 5000) - 100, {}};
    for (int c = 0; c < 3; ++c) {
      const unsigned pick = random() % 6;
      if (pick == 0) {
        row.values.emplace_back(std::monostate{});
        continue;
      }
      std::string text;
      for (int w = 0, n = static_cast<int>(random() % 40); w < n; ++w) {
        text += kWords[random() % std::size(kWords)];
        text += ' ';
      }
      if (r % 97 == 0) text += std::string(300, 'q') + " tail";
      if (pick == 1) {
        row.values.emplace_back(Utf8ToUtf16(text));
      } else {
        row.values.emplace_back(text);
      }
    }
    rows.push_back(std::move(row));
  }
  return rows;
}

// What one thread writes: the values split in order, each word encoded by
// the layout after its item row.
std::string ExpectedEntries(const std::vector<Row>& rows, const SortEntryLayout& layout,
                            const CColumnSet& set, const std::vector<int32_t>& weights) {
  CWordPipeline pipeline(std::string("/nonexistent/"), PlainOptions());
  std::string out;
  std::vector<int32_t> item(static_cast<std::size_t>(set.Width()), 0);
  std::vector<uint8_t> entry;
  const auto visit = [&](const SplitWord& word) {
    if (set.p != 0) item[static_cast<std::size_t>(set.PositionColumn())] = word.position;
    entry.clear();
    SortEntryLayout::AppendRow(entry, item);
    layout.AppendText(entry, word.form);
    out.append(entry.begin(), entry.end());
  };
  for (const Row& row : rows) {
    item[0] = row.key;
    int32_t position = 0;
    for (std::size_t i = 0; i < row.values.size(); ++i) {
      if (i > 0) ++position;
      if (set.s != 0) item[static_cast<std::size_t>(set.ScoreColumn())] = weights[i];
      if (const auto* narrow = std::get_if<std::string>(&row.values[i])) {
        pipeline.WrittenWords(std::string_view(*narrow), position, visit);
      } else if (const auto* wide = std::get_if<std::u16string>(&row.values[i])) {
        pipeline.WrittenWords(std::u16string_view(*wide), position, visit);
      }
    }
  }
  return out;
}

void Feed(WordSplittingThread& splitting, const Row& row) {
  splitting.StartRow(row.key);
  for (const Value& value : row.values) {
    if (const auto* narrow = std::get_if<std::string>(&value)) {
      splitting.Narrow(*narrow);
    } else if (const auto* wide = std::get_if<std::u16string>(&value)) {
      splitting.Wide(*wide);
    } else {
      splitting.Null();
    }
  }
  splitting.EndRow();
}

TEST(WordSplittingThread, EntriesAreThoseOneThreadWritesInTheSameOrder) {
  test::SortHome home;
  const std::vector<Row> rows = RandomRows(3000);
  std::size_t text_bytes = 0;
  for (const Row& row : rows) {
    for (const Value& value : row.values) {
      if (const auto* narrow = std::get_if<std::string>(&value)) text_bytes += narrow->size();
      if (const auto* wide = std::get_if<std::u16string>(&value)) text_bytes += 2 * wide->size();
    }
  }
  // Text for several batches (handed over at 256 KB).
  ASSERT_GT(text_bytes, 3u * 256 * 1024);
  const std::vector<int32_t> weights = {1, 7, 3};
  struct Case {
    VALUE_TYPE type;
    int32_t general_flags;  // which of weight and position the item row holds
  };
  const Case cases[] = {{VALUE_TYPE::AsciiString, 3}, {VALUE_TYPE::UnicodeString, 3},
                        {VALUE_TYPE::AsciiString, 0}, {VALUE_TYPE::UnicodeString, 1}};
  for (const Case& c : cases) {
    SCOPED_TRACE(testing::Message() << static_cast<int>(c.type) << " flags " << c.general_flags);
    const CColumnSet set = CColumnSet::FromGeneralFlags(c.general_flags);
    const SortEntryLayout layout(set.Width(), c.type);
    // Room for every entry, so nothing needs to take them while they come.
    EntryBlockQueue queue(64 * 1024, 4096);
    int64_t entries = 0;
    {
      WordSplittingThread splitting(home.Defs(), PlainOptions(), queue, layout, set, weights);
      for (const Row& row : rows) Feed(splitting, row);
      entries = splitting.Finish();
    }
    queue.Close();
    std::string got;
    std::vector<uint8_t> block;
    while (queue.Pop(block)) got.append(block.begin(), block.end());
    const std::string expected = ExpectedEntries(rows, layout, set, weights);
    EXPECT_TRUE(got == expected) << "the entries differ (" << got.size() << " bytes, expected "
                                 << expected.size() << ")";
    int64_t counted = 0;
    for (std::size_t at = 0; at < got.size(); at += layout.SizeOf(
                                                   reinterpret_cast<const uint8_t*>(got.data() + at))) {
      ++counted;
    }
    EXPECT_EQ(entries, counted);
  }
}

TEST(WordSplittingThread, AStoppedSortingQueueEndsTheReaderAndAGivenUpReaderDoesNotHang) {
  test::SortHome home;
  const CColumnSet set = CColumnSet::FromGeneralFlags(14);
  const SortEntryLayout layout(set.Width(), VALUE_TYPE::AsciiString);
  const std::string words = [] {
    std::string s;
    for (int i = 0; i < 20000; ++i) s += "word ";
    return s;
  }();
  {
    // The sorting side failed: the reader learns it at a hand-over or at
    // Finish, never later.
    EntryBlockQueue queue(16 * 1024, 2);
    queue.Abort();
    WordSplittingThread splitting(home.Defs(), PlainOptions(), queue, layout, set, {1});
    bool stopped = false;
    try {
      for (int r = 0; r < 100; ++r) {
        splitting.StartRow(r);
        splitting.Narrow(words);
        splitting.EndRow();
      }
      splitting.Finish();
    } catch (const EntryBlockQueue::Stopped&) {
      stopped = true;
    }
    EXPECT_TRUE(stopped);
  }
  {
    // Nobody takes the entries and the reader gives up: the splitting thread
    // waits for room in a full queue, and is stopped all the same.
    EntryBlockQueue queue(16 * 1024, 2);
    {
      WordSplittingThread splitting(home.Defs(), PlainOptions(), queue, layout, set, {1});
      for (int r = 0; r < 8; ++r) {
        splitting.StartRow(r);
        splitting.Narrow(words);
        splitting.EndRow();
      }
    }
    EXPECT_TRUE(queue.Aborted());
  }
}

}  // namespace
}  // namespace qm
