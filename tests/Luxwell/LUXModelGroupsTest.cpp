#include "host/Luxwell/LUXModelGroups.h"

#include <gtest/gtest.h>

#include <string>

#include "platform/PropertyList.h"

using platform::Value;

namespace {

using Dictionary = Value::Dictionary;
using Names = std::vector<std::string>;
using Books = std::set<std::string>;

Value book(bool isSmoothingOnly, double weight = 0) {
  Dictionary properties;
  if (isSmoothingOnly) {
    properties.emplace("SmoothingOnly", true);
  }
  if (weight > 0) {
    properties.emplace("Weight", weight);
  }
  return properties;
}

Value groups(Dictionary content) { return Dictionary{{"Groups", Value(std::move(content))}}; }

Value group(Dictionary books) { return Dictionary{{"Books", Value(std::move(books))}}; }

}  // namespace

TEST(LUXModelGroups, WithoutAListThereIsTheDefaultGroupAlone) {
  const LUXModelGroups none;
  EXPECT_EQ(none.names(), Names{"Default"});
  EXPECT_EQ(none.groupOfBook("any"), "Default");
  EXPECT_EQ(none.booksOfGroup("Default", true), Books{});
}

TEST(LUXModelGroups, TheNamesAreThoseOfTheListWithTheDefaultGroupInOrder) {
  const LUXModelGroups list(Dictionary{
      {"DefaultGroup", "Middle"},
      {"Groups", Dictionary{{"Zoo", group({})}, {"Ant", group({})}, {"Middle", group({})}}}});
  EXPECT_EQ(list.names(), (Names{"Ant", "Middle", "Zoo"}));
  EXPECT_EQ(list.defaultGroup(), "Middle");
}

TEST(LUXModelGroups, OfSeveralGroupsTheFirstByNameHasABook) {
  const LUXModelGroups list(
      groups({{"B", group({{"book", book(false, 2)}})}, {"A", group({{"book", book(false, 3)}})}}));
  EXPECT_EQ(list.groupOfBook("book"), "A");
  EXPECT_EQ(list.weightOfBook("book"), 3);
}

TEST(LUXModelGroups, ABookBelongsWhereItIsNotForSmoothingOnly) {
  const LUXModelGroups list(
      groups({{"A", group({{"book", book(true, 5)}})}, {"B", group({{"book", book(false, 2)}})}}));
  EXPECT_EQ(list.groupOfBook("book"), "B");
  EXPECT_EQ(list.weightOfBook("book"), 2);
}

TEST(LUXModelGroups, ABookForSmoothingOnlyBelongsToTheFirstGroupThatNamesIt) {
  const LUXModelGroups list(
      groups({{"A", group({{"book", book(true)}})}, {"B", group({{"book", book(true)}})}}));
  EXPECT_EQ(list.groupOfBook("book"), "A");
}

TEST(LUXModelGroups, PropertiesAreThoseOfTheGroupThatIsAskedFor) {
  const LUXModelGroups list(groups({{"A", group({{"book", book(true)}})},
                                    {"B", group({{"book", book(false, 2)}, {"plain", 7}})}}));
  EXPECT_EQ(list.propertiesOfBook("book", "A"), book(true));
  EXPECT_EQ(list.propertiesOfBook("book", "B"), book(false, 2));
  EXPECT_EQ(list.propertiesOfBook("plain", "B"), Value(Dictionary{}));
  EXPECT_EQ(list.propertiesOfBook("book", "C"), Value(Dictionary{}));
  EXPECT_EQ(list.propertiesOfBook("nobody", "A"), Value(Dictionary{}));
}

TEST(LUXModelGroups, BooksForSmoothingAreListedWhenTheyAreWanted) {
  const LUXModelGroups list(
      groups({{"A", group({{"one", book(false)}, {"two", book(true)}, {"three", book(false)}})}}));
  EXPECT_EQ(list.booksOfGroup("A", false), (Books{"one", "three"}));
  EXPECT_EQ(list.booksOfGroup("A", true), (Books{"one", "three", "two"}));
  EXPECT_EQ(list.booksOfGroup("B", true), Books{});
}

TEST(LUXModelGroups, WhatIsNoGroupCountsAsNotThere) {
  const std::string tooLong(LUXModelGroups::maximumNameLength + 1, 'x');
  const LUXModelGroups list(groups({{"", group({{"book", book(false)}})},
                                    {tooLong, group({{"book", book(false)}})},
                                    {"Text", "text"},
                                    {"NoBooks", Dictionary{{"Books", 7}}},
                                    {"Good", group({{tooLong, book(false)}, {"", book(false)}})}}));
  EXPECT_EQ(list.names(), (Names{"Default", "Good", "NoBooks"}));
  EXPECT_EQ(list.groupOfBook("book"), "Default");
  EXPECT_EQ(list.booksOfGroup("Good", true), Books{});
}

TEST(LUXModelGroups, AnEmptyNameIsNoDefaultGroup) {
  EXPECT_EQ(LUXModelGroups(Dictionary{{"DefaultGroup", ""}}).defaultGroup(), "Default");
}

TEST(LUXModelGroups, GroupsAboveTheBoundCountAsNotThere) {
  Dictionary many;
  for (size_t i = 0; i < LUXModelGroups::maximumGroupCount + 5; ++i) {
    many.emplace(std::to_string(100000 + i), group({}));
  }
  EXPECT_EQ(LUXModelGroups(groups(std::move(many))).names().size(),
            LUXModelGroups::maximumGroupCount + 1);
}

TEST(LUXModelGroups, AListIsReadFromAPropertyListOfADictionary) {
  const Value list = groups({{"A", group({{"book", book(false)}})}});
  for (const auto format :
       {platform::PropertyListFormat::binary, platform::PropertyListFormat::xml}) {
    EXPECT_EQ(LUXModelGroups::listFromData(platform::dataFromPropertyList(list, format)), list);
    EXPECT_EQ(LUXModelGroups::listFromData(platform::dataFromPropertyList(Value("x"), format)),
              std::nullopt);
  }
  EXPECT_EQ(LUXModelGroups::listFromData(platform::Data::copy("no list")), std::nullopt);
  EXPECT_EQ(LUXModelGroups::listFromData({}), std::nullopt);
}
