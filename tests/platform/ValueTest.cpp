#include "platform/Value.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <thread>

namespace platform {
namespace {

TEST(Value, isAbsentByDefault) {
  const Value value;
  EXPECT_TRUE(value.isAbsent());
  EXPECT_FALSE(value.boolValue());
  EXPECT_EQ(value.integerValue(), 0);
  EXPECT_EQ(value.doubleValue(), 0);
  EXPECT_EQ(value.stringIf(), nullptr);
  EXPECT_FALSE(value.stringValue());
  EXPECT_EQ(value, Value());
}

TEST(Value, numbersConvert) {
  EXPECT_TRUE(Value(true).boolValue());
  EXPECT_EQ(Value(true).integerValue(), 1);
  EXPECT_TRUE(Value(-3).boolValue());
  EXPECT_EQ(Value(-3).doubleValue(), -3.0);
  EXPECT_EQ(Value(-3).unsignedValue(), 0U);
  EXPECT_EQ(Value(2.9).integerValue(), 2);
  EXPECT_FALSE(Value(0.0).boolValue());
  EXPECT_EQ(Value('a').kind(), Value::Kind::integer);
}

TEST(Value, stringsAreNoNumbers) {
  EXPECT_FALSE(Value("1").boolValue());
  EXPECT_EQ(Value("17").integerValue(), 0);
  EXPECT_FALSE(Value("YES").isNumber());
}

TEST(Value, integersKeepTheWholeUnsignedRange) {
  const uint64_t large = std::numeric_limits<uint64_t>::max() - 2;
  const Value value(large);
  EXPECT_TRUE(value.isAboveSignedRange());
  EXPECT_EQ(value.unsignedValue(), large);
  EXPECT_EQ(value.integerValue(), std::numeric_limits<int64_t>::max());
  EXPECT_FALSE(value == Value(static_cast<int64_t>(large)));
  EXPECT_EQ(Value(5U), Value(5L));
}

TEST(Value, realsBeyondTheIntegersAreClamped) {
  EXPECT_EQ(Value(1e300).integerValue(), std::numeric_limits<int64_t>::max());
  EXPECT_EQ(Value(-1e300).integerValue(), std::numeric_limits<int64_t>::min());
  EXPECT_EQ(Value(std::nan("")).integerValue(), 0);
  EXPECT_EQ(Value(1e300).unsignedValue(), std::numeric_limits<uint64_t>::max());
  EXPECT_EQ(Value(std::nan("")).unsignedValue(), 0U);
}

TEST(Value, contentIsThereForItsKindOnly) {
  EXPECT_EQ(*Value("x").stringIf(), "x");
  EXPECT_EQ(Value("x").dataIf(), nullptr);
  EXPECT_EQ(Value(Data::copy("d")).dataIf()->view(), "d");
  EXPECT_EQ(Value(URL::fileURLWithPath("/a")).urlIf()->path(), "/a");
  EXPECT_EQ(Value(Date{12.5}).dateIf()->secondsSinceReference, 12.5);
  EXPECT_EQ(Value(UID{7}).uidIf()->index, 7U);
  EXPECT_EQ(Value(Value::Array{1, 2}).arrayIf()->size(), 2U);
  EXPECT_EQ(Value(1).uidIf(), nullptr);
}

TEST(Value, keysOfADictionary) {
  const Value value(Value::Dictionary{{"a", 1}, {"b", "two"}});
  EXPECT_EQ(value["a"].integerValue(), 1);
  EXPECT_EQ(*value["b"].stringIf(), "two");
  EXPECT_TRUE(value["c"].isAbsent());
  EXPECT_TRUE(Value(1)["a"].isAbsent());
}

TEST(Value, datesCountFromTheReference) {
  const auto time = std::chrono::system_clock::time_point(std::chrono::seconds(978307201));
  EXPECT_EQ(Date::fromTimePoint(time).secondsSinceReference, 1.0);
}

TEST(Value, copiesAreOneObjectEqualValuesNeedNotBe) {
  const Value a("text");
  const Value copy = a;
  const Value other("text");
  EXPECT_EQ(a.identity(), copy.identity());
  EXPECT_NE(a.identity(), other.identity());
  EXPECT_EQ(a, other);
  EXPECT_EQ(Value(1).identity(), nullptr);
}

TEST(Value, assignmentAndMoveKeepTheContent) {
  Value a("text");
  Value b = std::move(a);
  EXPECT_EQ(*b.stringIf(), "text");
  a = 2.5;
  b = a;
  EXPECT_EQ(b.doubleValue(), 2.5);
  b = *&b;
  EXPECT_EQ(b.doubleValue(), 2.5);
  Value date(Date{3});
  date = Value(UID{9});
  EXPECT_EQ(date.uidIf()->index, 9U);
}

TEST(Value, equalityComparesKindAndContent) {
  EXPECT_FALSE(Value(1) == Value(1.0));
  EXPECT_FALSE(Value(true) == Value(1));
  EXPECT_EQ(Value(std::nan("")), Value(std::nan("")));
  EXPECT_EQ(Value(Value::Array{1, "a", Value()}), Value(Value::Array{1, "a", Value()}));
  EXPECT_FALSE(Value(Value::Array{1}) == Value(Value::Array{2}));
  EXPECT_FALSE(Value(Value::Array{1}) == Value(Value::Array{1, 1}));
  EXPECT_EQ(Value(Value::Dictionary{{"a", 1}}), Value(Value::Dictionary{{"a", 1}}));
  EXPECT_FALSE(Value(Value::Dictionary{{"a", 1}}) == Value(Value::Dictionary{{"b", 1}}));
  EXPECT_FALSE(Value(Value::Dictionary{{"a", 1}}) == Value(Value::Dictionary{{"a", 2}}));
}

/// A graph of `depth` nodes in which 2^depth paths lead to the leaf.
Value doubledGraph(int depth, const Value& leaf) {
  Value value = leaf;
  for (int i = 0; i < depth; ++i) {
    value = Value(Value::Array{value, value});
  }
  return value;
}

TEST(Value, sharedGraphsCompareInLinearTime) {
  EXPECT_EQ(doubledGraph(2000, 1), doubledGraph(2000, 1));
  EXPECT_FALSE(doubledGraph(2000, 1) == doubledGraph(2000, 2));
  EXPECT_FALSE(doubledGraph(2000, 1) == doubledGraph(1999, 1));
}

TEST(Value, sharedAndUnsharedGraphsOfTheSameContentAreEqual) {
  const Value leaf(Value::Dictionary{{"k", "v"}});
  const Value shared(Value::Array{leaf, leaf});
  const Value unshared(
      Value::Array{Value(Value::Dictionary{{"k", "v"}}), Value(Value::Dictionary{{"k", "v"}})});
  EXPECT_EQ(shared, unshared);
}

TEST(Value, deepNestingNeedsNoStack) {
  Value a = 1;
  Value b = 1;
  for (int i = 0; i < 200000; ++i) {
    a = Value(Value::Array{std::move(a)});
    b = i % 2 == 0 ? Value(Value::Array{std::move(b)}) : Value(Value::Array{std::move(b)});
  }
  EXPECT_EQ(a, b);
  const Value copy = a;
  a = Value();
  EXPECT_FALSE(copy == Value(1));
}

TEST(Value, deepDictionariesAreFreedWithoutStack) {
  Value value = 1;
  for (int i = 0; i < 300000; ++i) {
    value = Value(Value::Dictionary{{"next", std::move(value)}});
  }
}

TEST(Value, copiesMayBeUsedFromSeveralThreads) {
  Value value(Value::Array{"a", Value(Value::Dictionary{{"k", "v"}})});
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([value] {
      for (int i = 0; i < 1000; ++i) {
        const Value copy = value;
        const Value element = (*copy.arrayIf())[1];
        ASSERT_EQ(*element["k"].stringIf(), "v");
      }
    });
  }
  value = Value();
  for (std::thread& thread : threads) {
    thread.join();
  }
}

}  // namespace
}  // namespace platform
