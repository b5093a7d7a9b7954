#include "platform/DispatchQueue.h"

#include <gtest/gtest.h>
#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <thread>
#include <vector>

#include "platform/Exception.h"
#include "platform/RunLoop.h"
#include "tests/platform/TestEnvironment.h"

namespace platform {
namespace {

TEST(DispatchQueue, serialBlocksRunOneAfterTheOtherInOrder) {
  const auto queue = DispatchQueue::serial("serial");
  std::vector<int> order;
  for (int i = 0; i < 200; ++i) {
    queue->async([&order, i] { order.push_back(i); });
  }
  queue->sync([] {});
  ASSERT_EQ(order.size(), 200U);
  for (int i = 0; i < 200; ++i) {
    EXPECT_EQ(order[static_cast<size_t>(i)], i);
  }
  EXPECT_EQ(queue->label(), "serial");
}

TEST(DispatchQueue, aSerialQueueMayRunAtBackgroundPriority) {
  int normal = -100;
  int background = -100;
  const auto priority = [] { return ::getpriority(PRIO_PROCESS, static_cast<id_t>(::gettid())); };
  DispatchQueue::serial("normal")->sync([&] { normal = priority(); });
  const auto queue = DispatchQueue::serial("background", ThreadPriority::background);
  std::vector<int> order;
  for (int i = 0; i < 50; ++i) {
    queue->async([&order, i] { order.push_back(i); });
  }
  queue->sync([&] { background = priority(); });
  // More where the whole process was started with more.
  EXPECT_EQ(background, std::max(normal, 10));
  EXPECT_TRUE(std::is_sorted(order.begin(), order.end()));
  EXPECT_EQ(order.size(), 50U);
}

TEST(DispatchQueue, concurrentBlocksOverlap) {
  const auto queue = DispatchQueue::concurrent("concurrent");
  DispatchSemaphore first(0);
  DispatchSemaphore second(0);
  DispatchSemaphore done(0);
  queue->async([&] {
    first.signal();
    second.wait();
    done.signal();
  });
  queue->async([&] {
    second.signal();
    first.wait();
    done.signal();
  });
  done.wait();
  done.wait();
}

TEST(DispatchQueue, aBarrierRunsAlone) {
  const auto queue = DispatchQueue::concurrent("table");
  std::atomic<int> readers = 0;
  std::atomic<bool> writing = false;
  std::atomic<bool> overlapped = false;
  for (int i = 0; i < 300; ++i) {
    if (i % 10 == 0) {
      queue->barrierAsync([&] {
        writing = true;
        overlapped = overlapped || readers != 0;
        std::this_thread::yield();
        overlapped = overlapped || readers != 0;
        writing = false;
      });
    } else {
      queue->async([&] {
        ++readers;
        overlapped = overlapped || writing;
        --readers;
      });
    }
  }
  queue->barrierSync([] {});
  EXPECT_FALSE(overlapped);
}

TEST(DispatchQueue, barrierSyncSeesAllThatWasSubmittedBefore) {
  const auto queue = DispatchQueue::concurrent("table");
  std::atomic<int> count = 0;
  for (int i = 0; i < 50; ++i) {
    queue->async([&] { ++count; });
  }
  int seen = 0;
  queue->barrierSync([&] { seen = count; });
  EXPECT_EQ(seen, 50);
}

TEST(DispatchQueue, aSynchronousBlockThrowsToItsSubmitter) {
  const auto queue = DispatchQueue::serial("serial");
  EXPECT_THROW(queue->sync([] { throw Exception("Name", "reason"); }), Exception);
  bool ran = false;
  queue->sync([&] { ran = true; });
  EXPECT_TRUE(ran);
}

TEST(DispatchQueue, anAsynchronousExceptionIsLoggedAndTheQueueGoesOn) {
  tests::TestEnvironment environment;
  const auto queue = DispatchQueue::serial("serial");
  queue->async([] { throw Exception("Name", "reason"); });
  queue->sync([] {});
  EXPECT_EQ(environment.log().messages(0), (std::vector<std::string>{"reason"}));
}

TEST(DispatchQueue, aDroppedQueueRunsWhatItWasGiven) {
  DispatchSemaphore done(0);
  DispatchSemaphore release(0);
  {
    const auto queue = DispatchQueue::serial("short-lived");
    queue->async([&] { release.wait(); });
    queue->async([&] { done.signal(); });
  }
  release.signal();
  done.wait();
}

TEST(DispatchQueue, mainQueueRunsOnTheMainRunLoop) {
  bool onMain = false;
  std::thread thread([&] {
    DispatchQueue::main()->async([&] {
      onMain = isMainThread();
      RunLoop::main()->stop();
    });
  });
  RunLoop::main()->run();
  thread.join();
  EXPECT_TRUE(onMain);
}

TEST(DispatchSemaphore, timedWaitEndsWithTheClock) {
  tests::TestEnvironment environment;
  DispatchSemaphore semaphore(0);
  EXPECT_FALSE(semaphore.wait(Seconds(0)));
  bool taken = true;
  std::thread waiter([&] { taken = semaphore.wait(Seconds(5)); });
  environment.clock().waitForSleepers(1);
  environment.clock().advance(Seconds(4.5));
  // It looks at the clock, and goes on waiting.
  environment.clock().waitForSleepOf(waiter.get_id(), 2);
  environment.clock().advance(Seconds(0.5));
  waiter.join();
  EXPECT_FALSE(taken);
}

TEST(DispatchSemaphore, signalsAreCounted) {
  DispatchSemaphore semaphore(1);
  semaphore.signal();
  semaphore.wait();
  EXPECT_TRUE(semaphore.wait(Seconds(0)));
}

TEST(DispatchSemaphore, oneSignalReleasesOneWaiter) {
  tests::TestEnvironment environment;
  DispatchSemaphore semaphore(0);
  std::atomic<int> released = 0;
  std::vector<std::thread> waiters;
  for (int i = 0; i < 3; ++i) {
    waiters.emplace_back([&] {
      semaphore.wait();
      ++released;
    });
  }
  semaphore.signal();
  while (released == 0) {
    std::this_thread::yield();
  }
  EXPECT_EQ(released, 1);
  semaphore.signal();
  semaphore.signal();
  for (std::thread& waiter : waiters) {
    waiter.join();
  }
}

}  // namespace
}  // namespace platform
