#include "platform/FileLock.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <utility>

#include "tests/platform/TemporaryFolder.h"

namespace platform {
namespace {

TEST(FileLock, isHeldByOneAtATime) {
  const tests::TemporaryFolder folder;
  std::optional<FileLock> first = FileLock::tryLock(folder.path("lock"));
  ASSERT_TRUE(first);
  EXPECT_FALSE(FileLock::tryLock(folder.path("lock")));
  EXPECT_TRUE(FileLock::tryLock(folder.path("other")));
  const FileLock moved = std::move(*first);
  first.reset();
  EXPECT_FALSE(FileLock::tryLock(folder.path("lock")));
}

TEST(FileLock, endsWithTheObject) {
  const tests::TemporaryFolder folder;
  { const auto lock = FileLock::lock(folder.path("lock")); }
  EXPECT_TRUE(FileLock::tryLock(folder.path("lock")));
  EXPECT_TRUE(std::filesystem::exists(folder.path("lock")));
}

TEST(FileLock, endsWithTheProcessThatHoldsIt) {
  const tests::TemporaryFolder folder;
  int ready[2];
  ASSERT_EQ(::pipe(ready), 0);
  const pid_t child = ::fork();
  if (child == 0) {
    const auto lock = FileLock::tryLock(folder.path("lock"));
    const char answer = lock ? 'y' : 'n';
    (void)!::write(ready[1], &answer, 1);
    while (true) {
      ::pause();
    }
  }
  char answer = 0;
  ASSERT_EQ(::read(ready[0], &answer, 1), 1);
  EXPECT_EQ(answer, 'y');
  EXPECT_FALSE(FileLock::tryLock(folder.path("lock")));
  ::kill(child, SIGKILL);
  ::waitpid(child, nullptr, 0);
  EXPECT_TRUE(FileLock::lock(folder.path("lock")));
  ::close(ready[0]);
  ::close(ready[1]);
}

TEST(FileLock, tellsALockThatSomebodyHasFromOneThatNobodyCanHave) {
  const tests::TemporaryFolder folder;
  bool isHeld = true;
  const auto lock = FileLock::tryLock(folder.path("lock"), &isHeld);
  EXPECT_TRUE(lock);
  EXPECT_FALSE(isHeld);
  EXPECT_FALSE(FileLock::tryLock(folder.path("lock"), &isHeld));
  EXPECT_TRUE(isHeld);
  EXPECT_FALSE(FileLock::tryLock(folder.path("none/lock"), &isHeld));
  EXPECT_FALSE(isHeld);
}

TEST(FileLock, isAbsentWhereTheFileCannotBeOpened) {
  const tests::TemporaryFolder folder;
  EXPECT_FALSE(FileLock::tryLock(folder.path("none/lock")));
  EXPECT_FALSE(FileLock::lock(folder.path("none/lock")));
}

}  // namespace
}  // namespace platform
