// Deletes of one findex from several processes at once, with other processes
// reading the list the way searches do: no key is lost or doubled, and no
// reader ever sees a torn list or a key vanish.
#include <gtest/gtest.h>

#include <cstdint>
#include <filesystem>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "support/test_support.h"

namespace qm {
namespace {

namespace fs = std::filesystem;

// The file's keys, decoded here; fails the test on a size that disagrees with
// the count.
std::vector<int32_t> DecodeKeys(const std::string& bytes) {
  auto word = [&](std::size_t at) {
    uint32_t v = 0;
    for (int i = 3; i >= 0; --i) v = (v << 8) | static_cast<unsigned char>(bytes[at + i]);
    return static_cast<int32_t>(v);
  };
  EXPECT_GE(bytes.size(), 4u);
  if (bytes.size() < 4) return {};
  EXPECT_EQ(bytes.size(), 4 + 4 * static_cast<std::size_t>(word(0)));
  std::vector<int32_t> keys;
  for (std::size_t at = 4; at + 4 <= bytes.size(); at += 4) keys.push_back(word(at));
  return keys;
}

TEST(DeletedKeyConcurrency, ParallelDeletesKeepEveryKeyOnceWhileReadersSeeWholeLists) {
  constexpr int kDeleters = 4;
  constexpr int kKeysEach = 100;
  constexpr int kReaders = 2;
  test::ConfiguredHome home;
  fs::create_directories(home.Data() + "Groups/PUBLIC/Indexes");
  const std::string stop = home.Data() + "stop";
  const std::string worker = test::HelperPath("deleted_key_worker");

  // Deleter p takes the keys p+1, p+1+kDeleters, ...; one more repeats deleter
  // 0's keys, so the same key arrives twice at the same time.
  std::vector<std::vector<std::string>> deleters;
  std::set<int32_t> expected;
  for (int p = 0; p < kDeleters; ++p) {
    deleters.push_back({worker, home.Data(), "public", "books", "delete", std::to_string(p + 1),
                        std::to_string(kDeleters), std::to_string(kKeysEach)});
    for (int i = 0; i < kKeysEach; ++i) expected.insert(p + 1 + i * kDeleters);
  }
  deleters.push_back(deleters.front());

  std::vector<std::string> reader_out(kReaders), deleter_out(deleters.size());
  std::vector<int> reader_status(kReaders, -1), deleter_status(deleters.size(), -1);
  std::vector<std::thread> readers;
  for (int r = 0; r < kReaders; ++r) {
    readers.emplace_back([&, r] {
      reader_status[r] = test::RunProgram({worker, home.Data(), "public", "books", "read", stop},
                                          &reader_out[r]);
    });
  }
  {
    std::vector<std::thread> running;
    for (std::size_t d = 0; d < deleters.size(); ++d) {
      running.emplace_back(
          [&, d] { deleter_status[d] = test::RunProgram(deleters[d], &deleter_out[d]); });
    }
    for (auto& t : running) t.join();
  }
  test::WriteFile(stop, "");
  for (auto& t : readers) t.join();

  for (std::size_t d = 0; d < deleters.size(); ++d) {
    EXPECT_EQ(deleter_status[d], 0) << deleter_out[d];
  }
  const std::vector<int32_t> keys =
      DecodeKeys(test::ReadFile(home.Data() + "Groups/PUBLIC/Indexes/BOOKS.del"));
  EXPECT_EQ(keys, std::vector<int32_t>(expected.begin(), expected.end()));
  for (int r = 0; r < kReaders; ++r) {
    EXPECT_EQ(reader_status[r], 0) << reader_out[r];
    // Its last read came after every delete had ended.
    EXPECT_NE(reader_out[r].find(" final " + std::to_string(expected.size()) + "\n"),
              std::string::npos)
        << reader_out[r];
  }
  // Nothing but the list is left in the folder.
  std::vector<std::string> files;
  for (const auto& e : fs::directory_iterator(home.Data() + "Groups/PUBLIC/Indexes")) {
    files.push_back(e.path().filename().string());
  }
  EXPECT_EQ(files, std::vector<std::string>{"BOOKS.del"});
}

}  // namespace
}  // namespace qm
