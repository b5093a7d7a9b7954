#include "platform/WorkerThreads.h"

#include <gtest/gtest.h>
#include <pthread.h>
#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>

#include "platform/DispatchQueue.h"
#include "platform/Exception.h"
#include "tests/platform/TestEnvironment.h"

namespace platform {
namespace {

TEST(WorkerThreads, aBlockedTaskNeverHoldsUpAnother) {
  constexpr int count = 64;
  DispatchSemaphore release(0);
  DispatchSemaphore started(0);
  DispatchSemaphore ended(0);
  for (int i = 0; i < count; ++i) {
    runOnWorkerThread([&] {
      started.signal();
      release.wait();
      ended.signal();
    });
  }
  for (int i = 0; i < count; ++i) {
    started.wait();
  }
  for (int i = 0; i < count; ++i) {
    release.signal();
  }
  for (int i = 0; i < count; ++i) {
    ended.wait();
  }
}

TEST(WorkerThreads, anExceptionEndsTheTaskAndIsLogged) {
  tests::TestEnvironment environment;
  DispatchSemaphore thrown(0);
  runOnWorkerThread([&] {
    thrown.signal();
    throw Exception("Name", "the reason");
  });
  thrown.wait();
  while (environment.log().entries().empty()) {
    std::this_thread::yield();
  }
  EXPECT_EQ(environment.log().messages(0), (std::vector<std::string>{"the reason"}));
}

TEST(WorkerThreads, backgroundTasksRunAtLowerPriority) {
  DispatchSemaphore done(0);
  int normal = -100;
  int background = -100;
  runOnWorkerThread([&] {
    normal = ::getpriority(PRIO_PROCESS, static_cast<id_t>(::gettid()));
    done.signal();
  });
  runOnWorkerThread(
      [&] {
        background = ::getpriority(PRIO_PROCESS, static_cast<id_t>(::gettid()));
        done.signal();
      },
      ThreadPriority::background);
  done.wait();
  done.wait();
  // More where the whole process was started with more.
  EXPECT_EQ(background, std::max(normal, 10));
}

TEST(WorkerThreads, namedThreadKnowsItsName) {
  DispatchSemaphore done(0);
  std::string name;
  bool main = true;
  startNamedThread("book-preload", [&] {
    name = currentThreadName();
    main = isMainThread();
    done.signal();
  });
  done.wait();
  EXPECT_EQ(name, "book-preload");
  EXPECT_FALSE(main);
  EXPECT_TRUE(isMainThread());
  EXPECT_EQ(currentThreadName(), "");
}

TEST(WorkerThreads, aTaskMayNameItsThreadUntilItEnds) {
  // Workers are used again: enough tasks one after the other meet one that had a name.
  for (int i = 0; i < 20; ++i) {
    DispatchSemaphore done(0);
    std::string before;
    std::string during;
    char inTheKernel[16] = {};
    runOnWorkerThread([&] {
      before = currentThreadName();
      setCurrentThreadName("a name of more than fifteen bytes");
      during = currentThreadName();
      ::pthread_getname_np(::pthread_self(), inTheKernel, sizeof inTheKernel);
      done.signal();
    });
    done.wait();
    EXPECT_EQ(before, "");
    EXPECT_EQ(during, "a name of more than fifteen bytes");
    EXPECT_STREQ(inTheKernel, "a name of more ");
  }
}

TEST(WorkerThreads, anExceptionEndsANamedThreadNotTheProcess) {
  tests::TestEnvironment environment;
  startNamedThread("thrower", [] { throw 7; });
  while (environment.log().entries().empty()) {
    std::this_thread::yield();
  }
  EXPECT_EQ(environment.log().messages(0),
            (std::vector<std::string>{"an exception of unknown kind"}));
}

}  // namespace
}  // namespace platform
