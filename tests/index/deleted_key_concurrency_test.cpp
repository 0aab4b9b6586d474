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

// The file a list of keys makes: the count, then the keys, 32-bit little-endian.
std::string Encoded(const std::set<int32_t>& keys) {
  std::string bytes;
  auto put = [&](uint32_t v) {
    for (int i = 0; i < 4; ++i) bytes += static_cast<char>(v >> (8 * i));
  };
  put(static_cast<uint32_t>(keys.size()));
  for (int32_t k : keys) put(static_cast<uint32_t>(k));
  return bytes;
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
  EXPECT_EQ(test::ReadFile(home.Data() + "Groups/PUBLIC/Indexes/BOOKS.del"), Encoded(expected));
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
