#include "platform/Base64.h"

#include <gtest/gtest.h>

namespace platform {
namespace {

TEST(Base64, writesTheExamplesOfTheStandard) {
  EXPECT_EQ(base64FromBytes(""), "");
  EXPECT_EQ(base64FromBytes("f"), "Zg==");
  EXPECT_EQ(base64FromBytes("fo"), "Zm8=");
  EXPECT_EQ(base64FromBytes("foo"), "Zm9v");
  EXPECT_EQ(base64FromBytes("foob"), "Zm9vYg==");
  EXPECT_EQ(base64FromBytes("fooba"), "Zm9vYmE=");
  EXPECT_EQ(base64FromBytes("foobar"), "Zm9vYmFy");
}

TEST(Base64, readsBackEveryByteAtEveryPlace) {
  std::string bytes;
  for (int i = 0; i < 256; ++i) {
    bytes += static_cast<char>(i);
    EXPECT_EQ(bytesFromBase64(base64FromBytes(bytes)), bytes);
  }
}

TEST(Base64, takesBlanksAnywhere) {
  EXPECT_EQ(bytesFromBase64(" Z\tm9\r\nv Y g = = \n"), "foob");
  EXPECT_EQ(bytesFromBase64("  \n"), "");
}

TEST(Base64, refusesWhatIsNotInTheAlphabet) {
  EXPECT_EQ(bytesFromBase64("Zm9-"), std::nullopt);
  EXPECT_EQ(bytesFromBase64(std::string_view("Zm9\0", 4)), std::nullopt);
  EXPECT_EQ(bytesFromBase64("Zm9\xC3"), std::nullopt);
}

TEST(Base64, refusesIncompleteGroupsAndStrayPadding) {
  for (const char* text :
       {"Z", "Zg", "Zg=", "Zg===", "Zm8", "Zm8==", "=", "====", "Zm9v=", "Zg==Zg=="}) {
    EXPECT_EQ(bytesFromBase64(text), std::nullopt) << text;
  }
}

}  // namespace
}  // namespace platform
