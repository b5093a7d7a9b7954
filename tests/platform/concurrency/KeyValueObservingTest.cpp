#include "platform/KeyValueObserving.h"

#include <gtest/gtest.h>

namespace platform {
namespace {

class Counter : public KeyValueObservable {
 public:
  int count = 0;

  void increment() {
    willChangeValueForKey("count");
    ++count;
    didChangeValueForKey("count");
  }

  Value valueForKey(std::string_view key) const override {
    return key == "count" ? Value(count) : Value();
  }
};

class Recorder : public KeyValueObserver {
 public:
  explicit Recorder(std::vector<std::string>& record, std::string name = {})
      : _record(record), _name(std::move(name)) {}

  void observeValueForKeyPath(std::string_view keyPath, KeyValueObservable& object,
                              const KeyValueChange& change, void* context) override {
    const auto& counter = static_cast<Counter&>(object);
    _record.push_back(_name + (change.isPrior ? "will " : "did ") + std::string(keyPath) + " at " +
                      std::to_string(counter.count) +
                      (change.newValue.isAbsent()
                           ? ""
                           : " new " + std::to_string(change.newValue.integerValue())));
    lastContext = context;
  }

  void* lastContext = nullptr;

 private:
  std::vector<std::string>& _record;
  const std::string _name;
};

TEST(KeyValueObservable, announcesBeforeAndAfterTheChange) {
  Counter counter;
  std::vector<std::string> record;
  const auto observer = std::make_shared<Recorder>(record);
  int context = 0;
  counter.addObserver(observer, "count", keyValueObservingOptionNew | keyValueObservingOptionPrior,
                      &context);
  counter.increment();
  EXPECT_EQ(record, (std::vector<std::string>{"will count at 0", "did count at 1 new 1"}));
  EXPECT_EQ(observer->lastContext, &context);
}

TEST(KeyValueObservable, deliversNoValueThatWasNotAskedFor) {
  Counter counter;
  std::vector<std::string> record;
  const auto observer = std::make_shared<Recorder>(record);
  counter.addObserver(observer, "count");
  counter.increment();
  EXPECT_EQ(record, (std::vector<std::string>{"did count at 1"}));
}

TEST(KeyValueObservable, observersAreCalledInTheOrderAddedOncePerAddition) {
  Counter counter;
  std::vector<std::string> record;
  const auto first = std::make_shared<Recorder>(record, "first ");
  const auto second = std::make_shared<Recorder>(record, "second ");
  counter.addObserver(first, "count");
  counter.addObserver(second, "count");
  counter.addObserver(first, "count");
  counter.increment();
  EXPECT_EQ(record, (std::vector<std::string>{"first did count at 1", "second did count at 1",
                                              "first did count at 1"}));
}

TEST(KeyValueObservable, removalTakesBackOneAddition) {
  Counter counter;
  std::vector<std::string> record;
  const auto observer = std::make_shared<Recorder>(record);
  counter.addObserver(observer, "count");
  counter.addObserver(observer, "count");
  counter.removeObserver(observer.get(), "count");
  counter.removeObserver(observer.get(), "other");
  counter.increment();
  EXPECT_EQ(record.size(), 1U);
  counter.removeObserver(observer.get(), "count");
  counter.removeObserver(observer.get(), "count");
  counter.increment();
  EXPECT_EQ(record.size(), 1U);
}

TEST(KeyValueObservable, otherKeysAndDeadObserversHearNothing) {
  Counter counter;
  std::vector<std::string> record;
  const auto observer = std::make_shared<Recorder>(record);
  counter.addObserver(observer, "other");
  counter.addObserver(std::make_shared<Recorder>(record), "count");
  counter.addObserver(nullptr, "count");
  counter.increment();
  EXPECT_TRUE(record.empty());
}

}  // namespace
}  // namespace platform
