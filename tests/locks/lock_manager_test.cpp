// Cross-process behaviour of the index locks: other processes are lock_holder
// helpers that take one lock and keep it until their stdin closes.
#include "locks/lock_manager.h"
#include "platform/named_lock.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <memory>
#include <thread>
#include <vector>

#include "platform/text_encoding.h"
#include "base/exception_family.h"
#include "support/test_support.h"

namespace qm {
namespace {

namespace fs = std::filesystem;

constexpr double kShort = 0.002;  // writer 100 ms, reader unit 20 ms
const std::string kName = "MORVIL_2__ARTICLES";
// The lock folder's root: each test points MORVIL_LOCKDIR at a folder of its own.
const std::string kScope;

class OtherProcess {
 public:
  OtherProcess(double scale, const char* mode, const std::string& name = kName) {
    int in[2], out[2];
    if (pipe2(in, O_CLOEXEC) != 0 || pipe2(out, O_CLOEXEC) != 0) std::abort();
    const std::string path = test::HelperPath("lock_holder"), s = std::to_string(scale);
    pid_ = fork();
    if (pid_ == 0) {
      dup2(in[0], 0);
      dup2(out[1], 1);
      execl(path.c_str(), path.c_str(), s.c_str(), mode, name.c_str(), nullptr);
      _exit(127);
    }
    close(in[0]);
    close(out[1]);
    to_child_ = in[1];
    from_child_ = out[0];
  }
  ~OtherProcess() {
    Kill();
    close(from_child_);
  }
  std::string ReadLine() {
    std::string line;
    char c;
    while (read(from_child_, &c, 1) == 1 && c != '\n') line += c;
    return line;
  }
  // "held" or "failed <message>".
  std::string Outcome() {
    std::string line = ReadLine();
    return line == "trying" ? ReadLine() : line;
  }
  int Release() {  // closing stdin tells the holder to let go
    if (to_child_ >= 0) close(to_child_);
    to_child_ = -1;
    int status = 0;
    if (pid_ > 0) waitpid(pid_, &status, 0);
    pid_ = -1;
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  }
  void Kill() {
    if (pid_ > 0) kill(pid_, SIGKILL);
    Release();
  }
  pid_t Pid() const { return pid_; }

 private:
  pid_t pid_ = -1;
  int to_child_ = -1, from_child_ = -1;
};

std::string Msg(const std::string& text, const std::string& method) {
  return text + " (Module:LockManager,Method:" + method + ")";
}
std::string Timeout(const std::string& what, const std::string& method) {
  return Msg("Timeout waiting for " + what + " access to an index. Lock name: " + kName, method);
}
const std::string kSingleRead = Timeout("single read", "LockReader");
const std::string kAllRead = Timeout("all read", "LockAllReaders");
const std::string kWrite = Timeout("write", "LockWriter");

template <class Op>
std::string FailureOf(Op op) {
  try {
    op();
  } catch (const CLockManagerException& e) {
    return Utf16ToUtf8(e.GetCurrentEntry().text);
  }
  return "no failure";
}

// n more objects of one name, each holding one reader unit.
std::vector<std::unique_ptr<CLockManager>> TakeReaders(int n) {
  std::vector<std::unique_ptr<CLockManager>> readers;
  for (int i = 0; i < n; ++i) {
    readers.push_back(std::make_unique<CLockManager>(kScope, kName));
    readers.back()->LockReader();
  }
  return readers;
}

class LockManagerTest : public ::testing::Test {
 protected:
  void SetUp() override {
    // Not created beforehand: the first lock creates the folder.
    lock_dir_ = scratch_.Path() + "locks/";
    setenv("MORVIL_LOCKDIR", lock_dir_.c_str(), 1);
    CLockManager::ScaleTimeoutsForTesting(kShort);
  }
  void TearDown() override {
    CLockManager::ScaleTimeoutsForTesting(1.0);
    if (saved_dir_ != nullptr) {
      setenv("MORVIL_LOCKDIR", saved_dir_->c_str(), 1);
    } else {
      unsetenv("MORVIL_LOCKDIR");
    }
  }
  test::ScratchDir scratch_{"locks"};
  std::string lock_dir_;
  std::unique_ptr<std::string> saved_dir_ =
      getenv("MORVIL_LOCKDIR") ? std::make_unique<std::string>(getenv("MORVIL_LOCKDIR")) : nullptr;
};

TEST_F(LockManagerTest, LockNames) {
  CLockManager findex(kScope, "", "articles", kLockFindex);
  EXPECT_EQ(findex.GetLockName(), kName);
  EXPECT_EQ(CLockManager(kScope, "public", "Orders", kLockOrder).GetLockName(), "MORVIL_3_PUBLIC_ORDERS");
  findex.SetName("Public", "généralités", kLockDeletedKeys, 3);
  EXPECT_EQ(findex.GetLockName(), "MORVIL_1_PUBLIC_GÉNÉRALITÉS");
}

TEST_F(LockManagerTest, LockFilesAreOpenToEveryAccountAndNotInherited) {
  const mode_t old_umask = umask(077);
  CLockManager lock(kScope, "", "articles", kLockFindex);
  lock.LockExclusive();
  umask(old_umask);
  struct stat st {};
  ASSERT_EQ(stat((lock_dir_ + kName).c_str(), &st), 0);
  EXPECT_EQ(st.st_mode & 07777, 0666u);
  ASSERT_EQ(stat(lock_dir_.c_str(), &st), 0);
  EXPECT_EQ(st.st_mode & 07777, 01777u);

  // A child started while the lock is held must not carry its descriptors.
  OtherProcess child(kShort, "writer", "MORVIL_2__OTHER");
  ASSERT_EQ(child.Outcome(), "held");
  const std::string fd_dir = "/proc/" + std::to_string(child.Pid()) + "/fd/";
  int fds = 0;
  for (const auto& fd : fs::directory_iterator(fd_dir)) {
    std::error_code gone;  // a descriptor may close while the folder is read
    EXPECT_NE(fs::read_symlink(fd.path(), gone), lock_dir_ + kName);
    ++fds;
  }
  EXPECT_GE(fds, 3);
}

TEST_F(LockManagerTest, NamesThatCannotStandAsFileNamesAreDistinctLocks) {
  const std::vector<std::string> names = {"", "..", "a/b", "a%2Fb", std::string(300, 'x') + "1",
                                          std::string(300, 'x') + "2"};
  std::vector<std::unique_ptr<CLockManager>> held;
  for (const auto& name : names) {
    held.push_back(std::make_unique<CLockManager>(kScope, name));
    ASSERT_NO_THROW(held.back()->LockWriter()) << name;
  }
  for (const auto& name : names) {
    CLockManager again(kScope, name);
    EXPECT_EQ(FailureOf([&] { again.LockWriter(); }).rfind("Timeout waiting for write", 0), 0u)
        << name;
  }
  // One plain file per name, directly in the folder.
  std::size_t files = 0;
  for (const auto& file : fs::directory_iterator(lock_dir_)) {
    EXPECT_TRUE(file.is_regular_file()) << file.path();
    ++files;
  }
  EXPECT_EQ(files, names.size());
}

TEST_F(LockManagerTest, ReadersAndWritersExcludeEachOtherAcrossProcesses) {
  {
    OtherProcess builder(kShort, "exclusive");
    ASSERT_EQ(builder.Outcome(), "held");
    CLockManager search(kScope, kName);
    EXPECT_EQ(FailureOf([&] { search.LockReader(); }), kSingleRead);
    EXPECT_EQ(FailureOf([&] { search.LockWriter(); }), kWrite);
    EXPECT_EQ(builder.Release(), 0);
    EXPECT_NO_THROW(search.LockExclusive());
  }
  {
    OtherProcess search(kShort, "reader");
    ASSERT_EQ(search.Outcome(), "held");
    CLockManager builder(kScope, kName);
    EXPECT_EQ(FailureOf([&] { builder.LockExclusive(); }), kAllRead);
  }
  {
    // The writer alone keeps out writers, not readers.
    OtherProcess sync(kShort, "writer");
    ASSERT_EQ(sync.Outcome(), "held");
    CLockManager search(kScope, kName);
    EXPECT_NO_THROW(search.LockReader());
    OtherProcess second_sync(kShort, "writer");
    EXPECT_EQ(second_sync.Outcome(), "failed " + kWrite);
  }
}

TEST_F(LockManagerTest, HundredReaderUnits) {
  OtherProcess first(kShort, "reader");
  ASSERT_EQ(first.Outcome(), "held");
  const auto readers = TakeReaders(99);
  CLockManager extra(kScope, kName);
  EXPECT_EQ(FailureOf([&] { extra.LockReader(); }), kSingleRead);
  OtherProcess builder(kShort, "all");
  EXPECT_EQ(builder.Outcome(), "failed " + kAllRead);
  EXPECT_EQ(first.Release(), 0);
  EXPECT_NO_THROW(extra.LockReader());
}

TEST_F(LockManagerTest, KilledHolderReleasesAtOnce) {
  OtherProcess builder(kShort, "exclusive");
  ASSERT_EQ(builder.Outcome(), "held");
  builder.Kill();
  CLockManager next(kScope, kName);
  EXPECT_NO_THROW(next.LockExclusive());
  EXPECT_TRUE(next.HoldsWriter());
  EXPECT_EQ(next.ReaderCount(), 100);
}

TEST_F(LockManagerTest, SameNameObjectsInOneProcess) {
  CLockManager first(kScope, kName), second(kScope, kName), third(kScope, kName);
  first.LockReader();
  second.LockReader();
  EXPECT_EQ(FailureOf([&] { third.LockExclusive(); }), kAllRead);

  EXPECT_EQ(FailureOf([&] { first.LockReader(); }),
            Msg("Reader lock manager already in use", "LockReader"));
  second.UnlockReaders();
  EXPECT_EQ(FailureOf([&] { third.LockExclusive(); }), kAllRead);  // first's unit is still out

  first.UnlockAll();
  third.LockExclusive();
  EXPECT_EQ(FailureOf([&] { third.LockWriter(); }),
            Msg("Writer lock manager already in use", "LockWriter"));
}

TEST_F(LockManagerTest, FailedExclusiveLockLeavesNothingHeld) {
  OtherProcess search(kShort, "reader");
  ASSERT_EQ(search.Outcome(), "held");
  CLockManager builder(kScope, kName);
  EXPECT_EQ(FailureOf([&] { builder.LockExclusive(); }), kAllRead);
  {
    OtherProcess writer(kShort, "writer");
    EXPECT_EQ(writer.Outcome(), "held");
  }
  EXPECT_NO_THROW(TakeReaders(99));  // the units it took are back
  EXPECT_EQ(search.Release(), 0);
  EXPECT_NO_THROW(builder.LockExclusive());
}

TEST_F(LockManagerTest, WaitersTakeTheLockOnceReleased) {
  OtherProcess builder(kShort, "exclusive");
  ASSERT_EQ(builder.Outcome(), "held");
  OtherProcess search(1.0, "reader");  // may wait 10 s
  ASSERT_EQ(search.ReadLine(), "trying");
  std::this_thread::sleep_for(std::chrono::milliseconds(50));  // most likely polling by now
  EXPECT_EQ(builder.Release(), 0);
  EXPECT_EQ(search.ReadLine(), "held");
  OtherProcess next_builder(0.2, "exclusive");  // may wait 10 s per step
  ASSERT_EQ(next_builder.ReadLine(), "trying");
  std::this_thread::sleep_for(std::chrono::milliseconds(50));
  EXPECT_EQ(search.Release(), 0);
  EXPECT_EQ(next_builder.ReadLine(), "held");
}

TEST_F(LockManagerTest, ReleasesAreExplicitAndSeparate) {
  auto lock = std::make_unique<CLockManager>(kScope, "", "articles", kLockFindex);
  lock->LockExclusive();
  // A forked copy of the descriptors must not keep a released lock alive.
  int gate[2];
  ASSERT_EQ(pipe(gate), 0);
  const pid_t copy = fork();
  if (copy == 0) {
    char c;
    close(gate[1]);
    (void)!read(gate[0], &c, 1);
    _exit(0);
  }
  close(gate[0]);
  // Giving back the readers keeps the writer.
  lock->UnlockReaders();
  EXPECT_EQ(FailureOf([] { CLockManager(kScope, kName).LockWriter(); }), kWrite);
  EXPECT_NO_THROW(CLockManager(kScope, kName).LockAllReaders());
  lock->LockAllReaders();
  lock->SetName("", "orders", kLockOrder);
  EXPECT_FALSE(lock->HoldsWriter());
  EXPECT_EQ(lock->ReaderCount(), 0);
  EXPECT_NO_THROW(CLockManager(kScope, kName).LockExclusive());
  close(gate[1]);
  waitpid(copy, nullptr, 0);
  lock->LockExclusive();
  lock.reset();
  EXPECT_NO_THROW(CLockManager(kScope, "MORVIL_3__ORDERS").LockExclusive());
}

// Locks are scoped by data directory: a builder in one directory never waits
// for a lock of the same name in another, and every path to one directory
// (a symbolic link, a trailing slash) shares its locks.
TEST_F(LockManagerTest, DataDirectoriesScopeTheirLocks) {
  const std::string first = scratch_.Path() + "first", second = scratch_.Path() + "second";
  fs::create_directories(first);
  fs::create_directories(second);
  fs::create_directory_symlink(first, scratch_.Path() + "link");
  CLockManager holder(first, "PUBLIC", "Docs", kLockFindex);
  holder.LockExclusive();
  EXPECT_NO_THROW(CLockManager(second, "PUBLIC", "Docs", kLockFindex).LockExclusive());
  for (const std::string& same : {first + "/", scratch_.Path() + "link"}) {
    CLockManager other(same, "PUBLIC", "Docs", kLockFindex);
    EXPECT_EQ(FailureOf([&] { other.LockWriter(); }),
              Msg("Timeout waiting for write access to an index. Lock name: MORVIL_2_PUBLIC_DOCS",
                  "LockWriter"))
        << same;
  }
  EXPECT_NE(platform::NamedLock::LockFolder(first), platform::NamedLock::LockFolder(second));
  EXPECT_EQ(platform::NamedLock::LockFolder(first).rfind(lock_dir_, 0), 0u);
}

TEST_F(LockManagerTest, CreationFailuresNameTheLock) {
  test::WriteFile(scratch_.Path() + "plain", "not a folder");
  setenv("MORVIL_LOCKDIR", (scratch_.Path() + "plain/locks").c_str(), 1);
  CLockManager lock(kScope, "", "articles", kLockFindex);
  EXPECT_EQ(FailureOf([&] { lock.LockExclusive(); }),
            Msg("Error creating mutex: " + kName, "CreateWriterMutex"));
  EXPECT_EQ(FailureOf([&] { lock.LockReader(); }),
            Msg("Error creating semaphore: " + kName + ", Error Code: " + std::to_string(ENOTDIR),
                "CreateReaderSemaphore"));
}

}  // namespace
}  // namespace qm
