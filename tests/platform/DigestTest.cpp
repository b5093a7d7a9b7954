#include "platform/Digest.h"

#include <gtest/gtest.h>

namespace {

TEST(Digest, isThatOfTheStandardsExamples) {
  EXPECT_EQ(platform::sha256Digest("abc"),
            "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad");
  EXPECT_EQ(platform::sha256Digest(""),
            "e3b0c44298fc1c149afbf4c8996fb92427ae41e4649b934ca495991b7852b855");
  EXPECT_EQ(platform::sha256Digest(std::string(1'000'000, 'a')),
            "cdc76e5c9914fb9281a1c7e284d73e67f1809a48a497200e046d39ccc7112cd0");
}

TEST(Digest, hasOneSpelling) {
  EXPECT_TRUE(platform::isSHA256Digest(platform::sha256Digest("")));
  EXPECT_FALSE(platform::isSHA256Digest(""));
  EXPECT_FALSE(platform::isSHA256Digest(std::string(63, 'a')));
  EXPECT_FALSE(platform::isSHA256Digest(std::string(65, 'a')));
  EXPECT_FALSE(platform::isSHA256Digest(std::string(64, 'A')));
  EXPECT_FALSE(platform::isSHA256Digest(std::string(64, 'g')));
}

}  // namespace
