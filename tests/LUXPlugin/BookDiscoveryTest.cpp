// Which books a model may be made of.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>

#include "platform/PropertyList.h"
#include "tests/LUXPlugin/LUXWorld.h"

using platform::Value;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;
using tests::LogEntry;
using tests::LUXWorld;

namespace {

using BookTable = LUXSearchController::BookTable;

class BookDiscovery : public testing::Test {
 protected:
  /// An application bundle; absent values leave their keys out.
  std::string makeApplication(const std::string& name, const Value& identifiers,
                              const Value& folders) const {
    Value::Dictionary information{{"BundleIdentifier", "org.example." + name}};
    if (!identifiers.isAbsent()) {
      information[ZEBCFBundleHelpBookID] = identifiers;
    }
    if (!folders.isAbsent()) {
      information[ZEBCFBundleHelpBookFolder] = folders;
    }
    writeList(name + "/Info.plist", std::move(information));
    return world.folder.path(name);
  }
  /// A book folder among an application's resources, in a language folder or outside all.
  void makeBook(const std::string& application, const std::string& folder,
                const std::string& bookID, const std::string& language = {}) const {
    const std::string base =
        application + "/Resources/" + (language.empty() ? "" : language + ".lproj/") + folder;
    writeList(base + "/Info.plist", {{"ZEBBookIdentifier", bookID}});
  }
  void writeList(const std::string& name, Value::Dictionary list) const {
    world.folder.write(
        name,
        platform::dataFromPropertyList(std::move(list), platform::PropertyListFormat::xml).view());
  }
  std::vector<std::string> add(const std::vector<std::string>& applications,
                               const std::string& language = "English") {
    LUXSearchController::_addBooksToTableFromAppPaths(table, applications, language);
    std::vector<std::string> identifiers;
    for (const auto& entry : table) {
      identifiers.push_back(entry.first);
    }
    return identifiers;
  }

  LUXWorld world;
  BookTable table;
};

TEST_F(BookDiscovery, ofABuildIsWhatTheHostKnows) {
  EXPECT_THAT(world.controller->_copyAllBooksForLanguage("English"), IsEmpty());
  const auto book = world.addBook("org.one", tests::kitchenPages());
  world.addBook("org.two", tests::kitchenPages());
  auto books = world.controller->_copyAllBooksForLanguage("Klingon");
  EXPECT_THAT(books, SizeIs(2));
  EXPECT_EQ(books.at("org.one"), book);
  books.clear();
  EXPECT_THAT(world.owner->knownBooks(), SizeIs(2));
  EXPECT_THAT(world.controller->_copyAllBooksForLanguage("English"), SizeIs(2));
}

TEST_F(BookDiscovery, ofAllApplicationsChangesNothing) {
  makeApplication("data/applications/App", "org.one", "Help");
  ::setenv("XDG_DATA_HOME", world.folder.path("data").c_str(), 1);  // NOLINT(concurrency-mt-unsafe)
  LUXSearchController::_addBooksToTableFromAllApps(table, "English");
  EXPECT_THAT(table, IsEmpty());
  table["org.known"] = ZEBHelpBook::bookWithID("org.known", ZEBHelpBookType1, "/nowhere");
  LUXSearchController::_addBooksToTableFromAllApps(table, "English");
  EXPECT_THAT(table, SizeIs(1));
  EXPECT_THAT(world.log->entries(), IsEmpty());
  ::unsetenv("XDG_DATA_HOME");  // NOLINT(concurrency-mt-unsafe)
}

TEST_F(BookDiscovery, takesTheBookOfAnApplication) {
  const auto app = makeApplication("App", "org.one", "Help");
  makeBook("App", "Help", "org.one");
  EXPECT_THAT(add({app}), ElementsAre("org.one"));
  EXPECT_EQ(table.at("org.one")->path(), app + "/Resources/Help");
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST_F(BookDiscovery, takesOneStringAndAListOfOneForTheSame) {
  makeBook("App", "Help", "org.one");
  const Value list = Value::Array{Value("Help")};
  EXPECT_THAT(add({makeApplication("App", "org.one", list)}), ElementsAre("org.one"));
  table.clear();
  EXPECT_THAT(add({makeApplication("App", Value::Array{Value("org.one")}, "Help")}),
              ElementsAre("org.one"));
}

TEST_F(BookDiscovery, takesEachBookOfAListFromTheFolderOfTheSamePlace) {
  makeBook("App", "First", "org.one");
  makeBook("App", "Second", "org.two");
  const auto app =
      makeApplication("App", Value::Array{"org.one", "org.two"}, Value::Array{"First", "Second"});
  EXPECT_THAT(add({app}), ElementsAre("org.one", "org.two"));
  EXPECT_EQ(table.at("org.two")->path(), app + "/Resources/Second");
}

TEST_F(BookDiscovery, takesTheFolderOfALaterBookWhereAnEarlierOneIsKnown) {
  makeBook("App", "First", "org.one");
  makeBook("App", "Second", "org.two");
  const auto known = ZEBHelpBook::bookWithID("org.one", ZEBHelpBookType1, "/known");
  table["org.one"] = known;
  EXPECT_THAT(add({makeApplication("App", Value::Array{"org.one", "org.two"},
                                   Value::Array{"Missing", "Second"})}),
              ElementsAre("org.one", "org.two"));
  EXPECT_EQ(table.at("org.one"), known);
  // The folder of a book that is known is not even looked for.
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST_F(BookDiscovery, prefersTheFolderOfTheLanguage) {
  makeBook("App", "Help", "org.plain");
  makeBook("App", "Help", "org.german", "German");
  const auto app = makeApplication("App", "org.asked", "Help");
  EXPECT_THAT(add({app}, "German"), ElementsAre("org.german"));
  table.clear();
  EXPECT_THAT(add({app}, "French"), ElementsAre("org.plain"));
}

TEST_F(BookDiscovery, filesABookUnderItsOwnName) {
  makeBook("App", "Help", "org.one*2.0");
  EXPECT_THAT(add({makeApplication("App", "org.one", "Help")}), ElementsAre("org.one*2.0"));
}

TEST_F(BookDiscovery, keepsTheBookThatHasTheNameAlready) {
  makeBook("App", "Help", "org.known");
  const auto known = ZEBHelpBook::bookWithID("org.known", ZEBHelpBookType1, "/known");
  table["org.known"] = known;
  EXPECT_THAT(add({makeApplication("App", "org.other", "Help")}), ElementsAre("org.known"));
  EXPECT_EQ(table.at("org.known"), known);
}

TEST_F(BookDiscovery, takesTheFirstOfTwoApplicationsWithTheSameBook) {
  makeBook("First", "Help", "org.one");
  const auto first = makeApplication("First", "org.one", "Help");
  // Its folder is missing, which nobody notices.
  const auto second = makeApplication("Second", "org.one", "Help");
  EXPECT_THAT(add({first, second}), ElementsAre("org.one"));
  EXPECT_EQ(table.at("org.one")->path(), first + "/Resources/Help");
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST_F(BookDiscovery, passesOverWhatDeclaresNoBooks) {
  makeBook("App", "Help", "org.one");
  const Value list = Value::Array{Value("org.one"), Value("org.two")};
  EXPECT_THAT(
      add({world.folder.path("nothing"), makeApplication("A", {}, {}),
           makeApplication("B", "org.one", {}), makeApplication("C", {}, "Help"),
           makeApplication("D", list, "Help"), makeApplication("E", "org.one", Value::Array{}),
           makeApplication("F", 7, "Help"), makeApplication("G", "org.one", true),
           makeApplication("H", Value::Dictionary{{"a", "org.one"}}, "Help")}),
      IsEmpty());
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST_F(BookDiscovery, tellsOfAFolderThatIsNoBookAndGoesOn) {
  makeBook("App", "Help", "org.two");
  world.folder.write("App/Resources/Broken/readme.txt", "no book");
  const auto app =
      makeApplication("App", Value::Array{"org.one", "org.two"}, Value::Array{"Broken", "Help"});
  EXPECT_THAT(add({app}), ElementsAre("org.two"));
  EXPECT_THAT(world.log->entries(),
              ElementsAre(LogEntry{
                  1, "ERROR: Unable to create help book from " + app + "/Resources/Broken"}));
}

TEST_F(BookDiscovery, tellsOfAFolderThatIsNotThere) {
  EXPECT_THAT(add({makeApplication("App", "org.one", "Help")}), IsEmpty());
  EXPECT_THAT(world.log->entries(),
              ElementsAre(LogEntry{1, "ERROR: Unable to create help book from (null)"}));
}

TEST_F(BookDiscovery, looksForNoFolderOutsideTheApplication) {
  makeBook("Elsewhere", "Help", "org.one");
  EXPECT_THAT(add({makeApplication("App", "org.one", "../../Elsewhere/Resources/Help")}),
              IsEmpty());
  EXPECT_THAT(world.log->entries(), SizeIs(1));
}

}  // namespace
