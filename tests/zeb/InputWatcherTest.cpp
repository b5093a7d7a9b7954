#include "zeb/InputWatcher.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <chrono>
#include <semaphore>

namespace {

using zeb::InputWatcher;

class InputWatcherTest : public testing::Test {
 protected:
  void SetUp() override { ASSERT_EQ(::pipe(_ends.data()), 0); }
  void TearDown() override {
    ::close(_ends[0]);
    closeWriter();
  }

  int reader() const { return _ends[0]; }
  void type() const { ASSERT_EQ(::write(_ends[1], "k", 1), 1); }
  void readOne() const {
    char key = 0;
    ASSERT_EQ(::read(_ends[0], &key, 1), 1);
  }
  void closeWriter() {
    if (_ends[1] >= 0) {
      ::close(_ends[1]);
      _ends[1] = -1;
    }
  }

  void tell() {
    ++told;
    _told.release();
  }
  bool wasTold() { return _told.try_acquire_for(std::chrono::seconds(30)); }

  std::atomic<int> told{0};

 private:
  std::array<int, 2> _ends{-1, -1};
  std::counting_semaphore<100> _told{0};
};

TEST_F(InputWatcherTest, TellsOfInputThatComesAndOfInputThatIsThere) {
  const InputWatcher watcher(reader(), [this] { tell(); });
  type();
  EXPECT_TRUE(wasTold());
  const InputWatcher late(reader(), [this] { tell(); });
  EXPECT_TRUE(wasTold());
}

TEST_F(InputWatcherTest, TellsOnceUntilItIsResumed) {
  {
    InputWatcher watcher(reader(), [this] { tell(); });
    type();
    EXPECT_TRUE(wasTold());
    type();
    readOne();
    EXPECT_EQ(told, 1);
    watcher.resume();
    EXPECT_TRUE(wasTold());
    readOne();
    watcher.resume();
    type();
    EXPECT_TRUE(wasTold());
  }
  EXPECT_EQ(told, 3);
}

TEST_F(InputWatcherTest, TellsOfTheEnd) {
  const InputWatcher watcher(reader(), [this] { tell(); });
  closeWriter();
  EXPECT_TRUE(wasTold());
}

TEST_F(InputWatcherTest, EndsWithoutInput) {
  {
    const InputWatcher watcher(reader(), [this] { tell(); });
  }
  type();
  EXPECT_EQ(told, 0);
}

}  // namespace
