#include "plugin/records/AtomicProperty.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <thread>
#include <vector>

TEST(AtomicProperty, BeginsEmptyAndGivesWhatWasSetLast) {
  AtomicProperty<int> number;
  EXPECT_EQ(number.get(), 0);
  number.set(7);
  number.set(8);
  EXPECT_EQ(number.get(), 8);
}

TEST(AtomicProperty, FreesTheFormerValueOutsideItsLock) {
  // A value whose end reads the property: it would wait for itself if the lock were still held.
  AtomicProperty<std::shared_ptr<int>> property;
  bool freed = false;
  property.set(std::shared_ptr<int>(new int(1), [&](int* value) {
    freed = property.get() == nullptr;
    delete value;
  }));
  property.set(nullptr);
  EXPECT_TRUE(freed);
}

TEST(AtomicProperty, ReadersSeeWholeValues) {
  AtomicProperty<std::string> property;
  property.set(std::string(100, 'a'));
  std::vector<std::thread> threads;
  for (const char letter : {'a', 'b', 'c'}) {
    threads.emplace_back([&property, letter] {
      for (int i = 0; i < 500; ++i) {
        property.set(std::string(100, letter));
        const std::string seen = property.get();
        EXPECT_EQ(seen, std::string(100, seen.at(0)));
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
}
