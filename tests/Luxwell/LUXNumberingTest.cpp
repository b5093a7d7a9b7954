#include "host/Luxwell/LUXNumbering.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

TEST(LUXStringNumbering, StringsAreNumberedInTheOrderInWhichTheyCome) {
  LUXStringNumbering numbering;
  EXPECT_EQ(numbering.find("a"), LUXStringNumbering::none);
  EXPECT_EQ(numbering.numberOf("b"), 0U);
  EXPECT_EQ(numbering.numberOf("a"), 1U);
  EXPECT_EQ(numbering.numberOf("b"), 0U);
  EXPECT_EQ(numbering.numberOf(""), 2U);
  EXPECT_EQ(numbering.numberOf(std::string_view("a\0", 2)), 3U);
  EXPECT_EQ(numbering.size(), 4U);
  EXPECT_EQ(numbering[1], "a");
  EXPECT_EQ(numbering[2], "");
  EXPECT_EQ(numbering.find("a"), 1U);
  EXPECT_EQ(numbering.find("c"), LUXStringNumbering::none);
}

TEST(LUXStringNumbering, ManyStringsKeepTheirNumbers) {
  LUXStringNumbering numbering;
  for (uint32_t i = 0; i < 50000; ++i) {
    ASSERT_EQ(numbering.numberOf(std::to_string(i)), i);
  }
  for (uint32_t i = 0; i < 50000; i += 7) {
    ASSERT_EQ(numbering.find(std::to_string(i)), i);
    ASSERT_EQ(numbering[i], std::to_string(i));
  }
}

TEST(LUXPairNumbering, PairsAreNumberedInTheOrderInWhichTheyCome) {
  LUXPairNumbering numbering;
  EXPECT_EQ(numbering.numberOf({1, 2}), 0U);
  EXPECT_EQ(numbering.numberOf({2, 1}), 1U);
  EXPECT_EQ(numbering.numberOf({1, 2}), 0U);
  for (uint32_t i = 0; i < 300; ++i) {
    for (uint32_t j = 0; j < 100; ++j) {
      numbering.numberOf({i, j});
    }
  }
  EXPECT_EQ(numbering.size(), 30000U);
  EXPECT_EQ(numbering[0].second, 2U);
  EXPECT_EQ(numbering.numberOf({2, 1}), 1U);
}

TEST(LUXStringNumbering, StringsOfAllLengthsThatAreNearlyAlikeAreToldApart) {
  LUXStringNumbering numbering;
  std::vector<std::string> strings;
  for (size_t length = 0; length < 40; ++length) {
    for (size_t changed = 0; changed <= length; ++changed) {
      std::string string(length, 'a');
      if (changed < length) {
        string[changed] = '\0';
      }
      strings.push_back(string);
    }
  }
  for (uint32_t number = 0; number < strings.size(); ++number) {
    EXPECT_EQ(numbering.numberOf(strings[number]), number);
  }
  for (uint32_t number = 0; number < strings.size(); ++number) {
    EXPECT_EQ(numbering.find(strings[number]), number);
    EXPECT_EQ(numbering[number], strings[number]);
  }
}
