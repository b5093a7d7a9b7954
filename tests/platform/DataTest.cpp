#include "platform/Data.h"

#include <gtest/gtest.h>

#include "platform/Exception.h"

namespace platform {
namespace {

TEST(Data, isEmptyByDefault) {
  EXPECT_TRUE(Data().empty());
  EXPECT_EQ(Data().length(), 0U);
  EXPECT_EQ(Data(), Data::copy(""));
}

TEST(Data, copyIsIndependentOfItsSource) {
  std::string source = "help";
  const Data data = Data::copy(source);
  source[0] = 'k';
  EXPECT_EQ(data.view(), "help");
}

TEST(Data, adoptTakesTheBufferOver) {
  EXPECT_EQ(Data::adopt(std::string("help")).view(), "help");
  EXPECT_EQ(Data::adopt(std::vector<uint8_t>{'h', 'i'}).view(), "hi");
}

TEST(Data, sliceSharesTheBytes) {
  const Data data = Data::copy("print queue");
  const Data word = data.slice(6, 5);
  EXPECT_EQ(word.view(), "queue");
  EXPECT_EQ(word.bytes(), data.bytes() + 6);
}

TEST(Data, sliceOutlivesTheDataItWasCutFrom) {
  Data slice;
  {
    const Data data = Data::copy("a text long enough for a buffer of its own");
    slice = data.slice(2, 4);
  }
  EXPECT_EQ(slice.view(), "text");
}

TEST(Data, keepAliveIsReleasedWithTheLastSlice) {
  auto owner = std::make_shared<const std::string>("bytes");
  const std::weak_ptr<const std::string> watcher = owner;
  Data slice;
  {
    const Data data = Data::wrap(owner->data(), owner->size(), owner);
    owner.reset();
    slice = data.slice(1, 2);
  }
  EXPECT_FALSE(watcher.expired());
  slice = Data();
  EXPECT_TRUE(watcher.expired());
}

TEST(Data, sliceOutsideTheBytesThrows) {
  const Data data = Data::copy("abc");
  EXPECT_EQ(data.slice(3, 0).length(), 0U);
  EXPECT_THROW(data.slice(4, 0), Exception);
  EXPECT_THROW(data.slice(0, 4), Exception);
  EXPECT_THROW(data.slice(2, SIZE_MAX), Exception);
  try {
    data.slice(1, 3);
    FAIL();
  } catch (const Exception& exception) {
    EXPECT_EQ(exception.name(), "RangeException");
    EXPECT_EQ(exception.reason(), "slice of 3 bytes at 1 is outside data of 3 bytes");
  }
}

TEST(Data, equalityComparesBytes) {
  EXPECT_EQ(Data::copy("a"), Data::copy("a"));
  EXPECT_FALSE(Data::copy("a") == Data::copy("b"));
  EXPECT_FALSE(Data::copy("a") == Data::copy("aa"));
}

}  // namespace
}  // namespace platform
