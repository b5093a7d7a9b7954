#include "host/Zebrine/ZEBCheckClass.h"

#include <gtest/gtest.h>

namespace {

using platform::Value;

struct Base {
  virtual ~Base() = default;
};
struct Derived : Base {};
struct Other : Base {};

const Value string = "text";
const Value array = Value::Array{1, "two"};
const Value dictionary = Value::Dictionary{{"key", 1}};
const Value data = platform::Data::copy("bytes");
const Value url = *platform::URL::URLWithString("https://example.org/");

TEST(ZEBCheckClass, stringPassesAsStringOnly) {
  EXPECT_EQ(zebCheckClass<std::string>(string), "text");
  for (const Value& other : {Value(), array, dictionary, data, url, Value(1), Value(true)}) {
    EXPECT_EQ(zebCheckClass<std::string>(other), std::nullopt);
  }
}

TEST(ZEBCheckClass, containersPassAsTheirOwnKindOnly) {
  EXPECT_EQ(zebCheckClass<Value::Array>(array)->size(), 2U);
  EXPECT_FALSE(zebCheckClass<Value::Array>(dictionary));
  EXPECT_EQ(zebCheckClass<Value::Dictionary>(dictionary)->at("key"), Value(1));
  EXPECT_FALSE(zebCheckClass<Value::Dictionary>(array));
  EXPECT_FALSE(zebCheckClass<Value::Dictionary>(Value()));
}

TEST(ZEBCheckClass, dataAndURLPassAsTheirOwnKindOnly) {
  EXPECT_EQ(zebCheckClass<platform::Data>(data)->view(), "bytes");
  EXPECT_FALSE(zebCheckClass<platform::Data>(string));
  EXPECT_EQ(zebCheckClass<platform::URL>(url)->absoluteString(), "https://example.org/");
  EXPECT_FALSE(zebCheckClass<platform::URL>(string));
}

TEST(ZEBCheckClass, dateAndUIDPassAsTheirOwnKindOnly) {
  EXPECT_EQ(zebCheckClass<platform::Date>(platform::Date{5}), platform::Date{5});
  EXPECT_FALSE(zebCheckClass<platform::Date>(Value(5)));
  EXPECT_EQ(zebCheckClass<platform::UID>(platform::UID{5}), platform::UID{5});
  EXPECT_FALSE(zebCheckClass<platform::UID>(Value(5)));
}

TEST(ZEBCheckClass, booleansIntegersAndRealsAreAllNumbers) {
  EXPECT_EQ(zebCheckClass<bool>(Value(2)), true);
  EXPECT_EQ(zebCheckClass<bool>(Value(false)), false);
  EXPECT_EQ(zebCheckClass<int64_t>(Value(2.9)), 2);
  EXPECT_EQ(zebCheckClass<uint64_t>(Value(UINT64_MAX)), UINT64_MAX);
  EXPECT_EQ(zebCheckClass<double>(Value(true)), 1.0);
  EXPECT_EQ(zebCheckClass<float>(Value(0.5)), 0.5F);
}

TEST(ZEBCheckClass, whatIsNoNumberFailsAsOne) {
  for (const Value& other : {Value(), Value("1"), array}) {
    EXPECT_FALSE(zebCheckClass<bool>(other));
    EXPECT_FALSE(zebCheckClass<int64_t>(other));
    EXPECT_FALSE(zebCheckClass<double>(other));
  }
}

TEST(ZEBCheckClass, objectPassesAsItsClassAndItsBases) {
  const std::shared_ptr<Base> object = std::make_shared<Derived>();
  EXPECT_EQ(zebCheckClass<Derived>(object).get(), object.get());
  EXPECT_EQ(zebCheckClass<Base>(object), object);
  EXPECT_EQ(zebCheckClass<Other>(object), nullptr);
}

TEST(ZEBCheckClass, absentObjectStaysAbsent) {
  EXPECT_EQ(zebCheckClass<Derived>(std::shared_ptr<Base>()), nullptr);
}

}  // namespace
