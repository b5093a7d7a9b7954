// Commands that the daemon carries out, beside the same commands without it.
#include <gmock/gmock.h>

#include <algorithm>
#include <regex>
#include <sstream>

#include "tests/support/NginxServer.h"
#include "tests/zebd/DaemonWorld.h"

namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;
using tests::contents;
using tests::DaemonWorld;
using tests::NginxServer;

namespace fs = std::filesystem;

/// What was said, with the names of temporary folders left out, and in one order: books are told of
/// when their indexes come.
std::string comparable(std::string output, const DaemonWorld& world) {
  const std::string path = world.folder.path("");
  for (size_t at = output.find(path); at != std::string::npos; at = output.find(path, at)) {
    output.replace(at, path.size(), "@/");
  }
  std::istringstream lines(output);
  std::vector<std::string> sorted;
  for (std::string line; std::getline(lines, line);) {
    sorted.push_back(line);
  }
  std::sort(sorted.begin(), sorted.end());
  std::string joined;
  for (const std::string& line : sorted) {
    joined += line + "\n";
  }
  return joined;
}

class DaemonCommandsTest : public testing::Test, protected DaemonWorld {
 protected:
  /// A server with a book.
  void publish(const NginxServer& server, const std::string& bookID) const {
    folder.write("published/index.html",
                 "<title>Applets</title><h1>Applets</h1><p>Applets come from afar.</p>");
    const std::string run = zeb({"publish", folder.path("published"), "--site", server.folder(),
                                 "--book-id", bookID, "--language", "en"},
                                false);
    ASSERT_THAT(run, StartsWith("0\n"));
  }
  fs::path indexesOf(const std::string& bookID) const {
    return folder.path("cache/org.zeb.zebd/GeneratedIndexes/" + bookID);
  }
};

/// The same commands on two computers side by side, one of them with a daemon.
TEST_F(DaemonCommandsTest, CommandsThatChangeBooksSayTheSameWithTheDaemonAsWithoutIt) {
  const NginxServer server;
  publish(server, "org.applets");
  const std::vector<std::vector<std::string>> lines = {
      {"scan", "--force"},
      {"books"},
      {"index", "@extra", "@second/extra"},
      {"index", "--book-id", "org.named", "@extra"},
      {"index", "@nowhere"},
      {"index", "--book-id", "one", "--book-id", "two", "@extra"},
      {"scan", "--no-system", "--force", "@extra", "@nowhere"},
      {"books"},
      {"remove", "org.named"},
      {"remove", "nobody"},
      {"add", "no address"},
      {"add", server.URL("/none.json")},
      {"add", server.URL("/catalogue.json"), "--book", "org.other"},
      {"add", server.URL("/catalogue.json")},
      {"books"},
      {"search", "afar"},
      {"remove", server.URL("/catalogue.json")},
      {"search", "--book", "garden", "spring"}};
  const DaemonWorld with;
  const DaemonWorld without;
  std::vector<std::string> answers;
  for (const std::vector<std::string>& line : lines) {
    std::vector<std::unique_ptr<tests::ChildProcess>> programs;
    for (const DaemonWorld* world : {&with, &without}) {
      for (const char* name : {"extra", "second/extra"}) {
        world->folder.write(std::string(name) + "/index.html",
                            "<title>Extra</title><h1>Extra</h1><p>More of it.</p>");
      }
      std::vector<std::string> words = line;
      for (std::string& word : words) {
        word = word.starts_with('@') ? world->folder.path(word.substr(1)) : word;
      }
      world->enter();
      programs.push_back(world->startZeb(words, world == &with));
    }
    answers.push_back(comparable(with.endOf(*programs[0]), with));
    EXPECT_EQ(answers.back(), comparable(without.endOf(*programs[1]), without))
        << testing::PrintToString(line);
    EXPECT_TRUE(with.isThere()) << testing::PrintToString(line);
  }
  EXPECT_FALSE(without.isThere());
  EXPECT_THAT(answers[0], HasSubstr("2 indexed, 0 unchanged, 0 forgotten, 0 failed"));
  EXPECT_THAT(answers[2], HasSubstr("there is another book \"extra\""));
  EXPECT_THAT(answers[6], HasSubstr("4 indexed, 0 unchanged, 0 forgotten, 1 failed"));
  EXPECT_THAT(answers[13], HasSubstr("org.applets  en  Applets"));
  EXPECT_THAT(answers[15], HasSubstr("Applets"));
}

TEST_F(DaemonCommandsTest, ScanIndexesBooksThatTheDaemonHasJustFound) {
  EXPECT_THAT(zeb({"scan"}), StartsWith("0\n"));
  const std::string books = zeb({"books"}, false);
  EXPECT_THAT(books,
              AllOf(HasSubstr("garden"), HasSubstr("kitchen"), Not(HasSubstr("not indexed"))));
}

TEST_F(DaemonCommandsTest, RemoteBooksComeAndGoOverTheBus) {
  const NginxServer server;
  publish(server, "org.applets");
  EXPECT_THAT(gdbus({"org.zeb.Help1.AddRemote", server.URL("/catalogue.json"), "[]", "[]"}),
              AllOf(HasSubstr("'id': <'org.applets'>"), HasSubstr("'title': <'Applets'>")));
  EXPECT_TRUE(waitFor([&] { return fs::exists(indexesOf("org.applets")); }));
  EXPECT_THAT(zeb({"search", "afar"}), HasSubstr(server.URL("/books/org.applets")));
  EXPECT_THAT(gdbus({"org.zeb.Help1.RemoveRemote", "org.applets"}), "(['org.applets'],)\n");
  EXPECT_TRUE(waitFor([&] { return !fs::exists(indexesOf("org.applets")); }));
  EXPECT_THAT(zeb({"search", "afar"}), StartsWith("1\n"));
}

TEST_F(DaemonCommandsTest, NewEditionOfARemoteBookComesWithAScan) {
  const NginxServer server;
  publish(server, "org.applets");
  EXPECT_THAT(zeb({"add", server.URL("/catalogue.json")}), StartsWith("0\n"));
  folder.write("published/index.html",
               "<title>Applets</title><h1>Applets</h1><p>Applets come from nearby.</p>");
  ASSERT_THAT(zeb({"publish", folder.path("published"), "--site", server.folder(), "--book-id",
                   "org.applets", "--language", "en"},
                  false),
              StartsWith("0\n"));
  server.setModified("catalogue.json", 1'700'000'000);
  // What the daemon knows of a catalogue, it takes for true for a minute: the next one does not.
  ASSERT_EQ(::kill(daemonProcess(), SIGTERM), 0);
  EXPECT_TRUE(waitFor([this] { return !isThere(); }));
  EXPECT_THAT(zeb({"scan"}), HasSubstr("1 on servers"));
  EXPECT_TRUE(waitFor([this] { return zeb({"search", "nearby"}).starts_with("0\n"); }));
}

TEST_F(DaemonCommandsTest, RequestsThatCannotBeMetAreErrors) {
  const NginxServer server;
  const auto answer = [this](const std::vector<std::string>& line) { return gdbus(line); };
  EXPECT_THAT(answer({"org.zeb.Help1.AddRemote", "no address", "[]", "[]"}),
              HasSubstr("is no address of a web server"));
  EXPECT_THAT(answer({"org.zeb.Help1.AddRemote", server.URL("/none.json"), "[]", "[]"}),
              HasSubstr("org.zeb.Help1.Error.Unreachable"));
  EXPECT_THAT(answer({"org.zeb.Help1.AddRemote", server.URL("/c"), "['../..']", "[]"}),
              HasSubstr("cannot be a book's identifier"));
  EXPECT_THAT(answer({"org.zeb.Help1.AddRemote", std::string(5000, 'a'), "[]", "[]"}),
              HasSubstr("org.zeb.Help1.Error.BadRequest"));
  EXPECT_THAT(answer({"org.zeb.Help1.RemoveRemote", "nobody"}),
              HasSubstr("org.zeb.Help1.Error.UnknownBook"));
  EXPECT_THAT(answer({"org.zeb.Help1.Scan", "['relative']", "{}"}),
              HasSubstr("has to begin with a slash"));
  EXPECT_THAT(answer({"org.zeb.Help1.Scan", "['/a']", "{'books': <['a', 'b']>}"}),
              HasSubstr("there has to be one book a folder"));
  EXPECT_THAT(answer({"org.zeb.Help1.Scan", "['/a']", "{'books': <['../a']>}"}),
              HasSubstr("cannot be a book's identifier"));
  EXPECT_THAT(answer({"org.zeb.Help1.Scan", "@as []", "{'color': <'red'>}"}),
              HasSubstr("there is no option \"color\""));
  EXPECT_THAT(answer({"org.zeb.Help1.Scan", "['/nowhere']", "{}"}),
              HasSubstr("('/nowhere', 'there is no such folder')"));
}

TEST_F(DaemonCommandsTest, BookOnThisComputerIsNotRemovedAsARemoteOne) {
  EXPECT_THAT(zeb({"scan"}), StartsWith("0\n"));
  EXPECT_THAT(gdbus({"org.zeb.Help1.RemoveRemote", "garden"}),
              HasSubstr("org.zeb.Help1.Error.UnknownBook"));
  EXPECT_THAT(zeb({"search", "spring"}), StartsWith("0\n"));
}

TEST_F(DaemonCommandsTest, TerminalShowsWhatAPipeGetsWithTheDaemonAndWithoutIt) {
  ASSERT_THAT(zeb({"scan"}), StartsWith("0\n"));
  const std::string expected = zeb({"search", "spring"});
  EXPECT_THAT(expected, HasSubstr("Roses"));
  for (const bool hasBus : {true, false}) {
    const tests::Variable address("DBUS_SESSION_BUS_ADDRESS",
                                  hasBus ? bus.address() : "unix:path=" + folder.path("none"));
    const std::string output = folder.path("shown");
    tests::ChildProcess terminal("/usr/bin/script",
                                 {"-qec", ZEB_PROGRAM " search spring", "/dev/null"}, output);
    const int code = terminal.wait();
    const std::string shown = contents(output);
    EXPECT_THAT(shown, HasSubstr("\033[1m")) << "colours are for terminals";
    // Colours, progress that is wiped away, and the returns of a terminal's lines.
    const std::regex ofTerminals("\033\\[[0-9;]*[A-Za-z]|\r|[^\n]*\033\\[K");
    EXPECT_EQ(std::to_string(code) + "\n" + std::regex_replace(shown, ofTerminals, ""), expected);
    fs::remove(output);
  }
}

TEST_F(DaemonCommandsTest, StatusTellsOfBooksAndTheDaemonAndStartsNone) {
  EXPECT_THAT(zeb({"status"}), AllOf(HasSubstr("books   0, 0 indexed"),
                                     HasSubstr("does not run; it starts when it is needed")));
  EXPECT_FALSE(isThere());
  EXPECT_THAT(zeb({"status"}, false), HasSubstr("there is none; commands do the work"));
  EXPECT_THAT(zeb({"scan"}), StartsWith("0\n"));
  EXPECT_THAT(zeb({"status"}), AllOf(StartsWith("0\n"), HasSubstr("books   2, 2 indexed"),
                                     HasSubstr("garden   en  made on this computer  Roses"),
                                     HasSubstr("process " + std::to_string(daemonProcess()))));
  EXPECT_THAT(zeb({"status", "--json"}),
              AllOf(HasSubstr("\"origin\": \"generated\""),
                    HasSubstr("\"process\": " + std::to_string(daemonProcess()))));
  EXPECT_THAT(zeb({"status", "--json"}, false), HasSubstr("\"daemon\": null"));
}

TEST_F(DaemonCommandsTest, StatusTellsWhereIndexesCameFrom) {
  const NginxServer server;
  publish(server, "org.applets");
  EXPECT_THAT(zeb({"add", server.URL("/catalogue.json")}), StartsWith("0\n"));
  EXPECT_THAT(zeb({"status"}), HasSubstr("fetched from a server"));
}

TEST_F(DaemonCommandsTest, WhatTheBusCannotCarryIsDoneWithoutTheDaemon) {
  EXPECT_THAT(zeb({"scan"}), StartsWith("0\n"));
  EXPECT_THAT(zeb({"search", std::string(5000, 'a')}),
              AllOf(StartsWith("1\n"), HasSubstr("nothing found")));
  EXPECT_THAT(zeb({"anchor", "caf\xE9"}), AllOf(StartsWith("1\n"), HasSubstr("nothing found")));
  folder.write("caf\xE9/index.html", "<title>Coffee</title><h1>Coffee</h1>");
  EXPECT_THAT(zeb({"index", folder.path("caf\xE9")}),
              AllOf(StartsWith("0\n"), HasSubstr("  Coffee\n")));
}

TEST_F(DaemonCommandsTest, ScansAreWaitedForThoughIndexesAreNot) {
  EXPECT_THAT(zeb({"scan", "--wait", "0"}), AllOf(StartsWith("0\n"), HasSubstr("unchanged")));
}

}  // namespace
