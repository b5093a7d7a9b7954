#include "platform/UserDefaults.h"

#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <limits>
#include <thread>

#include "platform/Environment.h"
#include "platform/PropertyList.h"
#include "tests/platform/TemporaryFolder.h"

namespace platform {
namespace {

using tests::TemporaryFolder;

std::string list(const std::string& entries) {
  return "<?xml version=\"1.0\" encoding=\"UTF-8\"?><plist version=\"1.0\"><dict>" + entries +
         "</dict></plist>";
}

std::string logLevel(int level) {
  return list("<key>LogLevel</key><integer>" + std::to_string(level) + "</integer>");
}

int64_t integerOf(Value value) {
  return userDefaultsFromDictionary({{"key", std::move(value)}})->integerForKey("key");
}

TEST(UserDefaults, aMissingFileHoldsNoSettings) {
  const TemporaryFolder folder;
  const auto defaults = userDefaultsFromFile(folder.path("settings.plist"));
  EXPECT_TRUE(defaults->valueForKey("LogLevel").isAbsent());
  EXPECT_EQ(defaults->integerForKey("LogLevel"), 0);
}

TEST(UserDefaults, readsBothFormsOfPropertyLists) {
  const TemporaryFolder folder;
  const std::string xml = folder.write("xml.plist", logLevel(2));
  EXPECT_EQ(userDefaultsFromFile(xml)->integerForKey("LogLevel"), 2);
  const Data binary = dataFromPropertyList(Value(Value::Dictionary{{"LogLevel", Value(3)}}),
                                           PropertyListFormat::binary);
  const std::string file = folder.write("binary.plist", binary.view());
  EXPECT_EQ(userDefaultsFromFile(file)->integerForKey("LogLevel"), 3);
}

TEST(UserDefaults, aFileThatAppearsChangesAndGoesIsFollowed) {
  const TemporaryFolder folder;
  const std::string path = folder.path("settings.plist");
  const auto defaults = userDefaultsFromFile(path);
  EXPECT_EQ(defaults->integerForKey("LogLevel"), 0);
  for (int level = 1; level < 20; ++level) {
    folder.write("settings.plist", logLevel(level));
    EXPECT_EQ(defaults->integerForKey("LogLevel"), level);
  }
  std::filesystem::remove(path);
  EXPECT_EQ(defaults->integerForKey("LogLevel"), 0);
  folder.write("settings.plist", logLevel(7));
  EXPECT_EQ(defaults->integerForKey("LogLevel"), 7);
}

TEST(UserDefaults, twoChangesOfTheSameDateAreBothSeen) {
  const TemporaryFolder folder;
  const std::string path = folder.write("settings.plist", logLevel(1));
  const auto date = std::filesystem::last_write_time(path);
  const auto defaults = userDefaultsFromFile(path);
  EXPECT_EQ(defaults->integerForKey("LogLevel"), 1);
  folder.write("settings.plist", logLevel(2));
  std::filesystem::last_write_time(path, date);
  EXPECT_EQ(defaults->integerForKey("LogLevel"), 2);
}

TEST(UserDefaults, aFileThatHasRestedIsReadOnlyWhenItsDateChanges) {
  const TemporaryFolder folder;
  const std::string path = folder.write("settings.plist", logLevel(1));
  const auto date = std::filesystem::last_write_time(path) - std::chrono::hours(1);
  std::filesystem::last_write_time(path, date);
  const auto defaults = userDefaultsFromFile(path);
  EXPECT_EQ(defaults->integerForKey("LogLevel"), 1);
  folder.write("settings.plist", logLevel(2));
  std::filesystem::last_write_time(path, date);
  EXPECT_EQ(defaults->integerForKey("LogLevel"), 1) << "nothing tells that it is another";
  std::filesystem::last_write_time(path, date - std::chrono::minutes(1));
  EXPECT_EQ(defaults->integerForKey("LogLevel"), 2) << "older is a change as well";
}

TEST(UserDefaults, aFileThatIsNoListHoldsNoSettings) {
  const TemporaryFolder folder;
  for (const std::string& garbage :
       {std::string(), std::string("garbage"), std::string("bplist00\xFF\xFF"),
        std::string("<plist><array/></plist>"), list("<key>LogLevel</key>"),
        logLevel(5).substr(0, 90), std::string(4096, '\0')}) {
    const auto defaults = userDefaultsFromFile(folder.write("settings.plist", garbage));
    EXPECT_EQ(defaults->integerForKey("LogLevel"), 0);
    EXPECT_TRUE(defaults->valueForKey("LogLevel").isAbsent());
  }
  std::filesystem::create_directory(folder.path("folder.plist"));
  EXPECT_EQ(userDefaultsFromFile(folder.path("folder.plist"))->integerForKey("LogLevel"), 0);
}

TEST(UserDefaults, garbageThatIsMendedIsReadAgain) {
  const TemporaryFolder folder;
  const std::string path = folder.write("settings.plist", "garbage");
  const auto defaults = userDefaultsFromFile(path);
  EXPECT_EQ(defaults->integerForKey("LogLevel"), 0);
  folder.write("settings.plist", logLevel(4));
  EXPECT_EQ(defaults->integerForKey("LogLevel"), 4);
}

TEST(UserDefaults, aFileThatCannotBeReadHoldsNoSettings) {
  const TemporaryFolder folder;
  const std::string path = folder.write("settings.plist", logLevel(4));
  Environment environment = Environment::system();
  const auto files = std::make_shared<FailingFileManager>();
  environment.files = files;
  const EnvironmentOverride override(environment);
  files->fail(FailingFileManager::Operation::read, EACCES);
  EXPECT_EQ(userDefaultsFromFile(path)->integerForKey("LogLevel"), 0);
  files->recover();
  files->fail(FailingFileManager::Operation::modificationDate, EIO);
  EXPECT_EQ(userDefaultsFromFile(path)->integerForKey("LogLevel"), 0);
}

TEST(UserDefaults, integersStayWhatTheyAre) {
  EXPECT_EQ(integerOf(Value(2)), 2);
  EXPECT_EQ(integerOf(Value(-3)), -3);
  EXPECT_EQ(integerOf(Value(std::numeric_limits<int64_t>::min())),
            std::numeric_limits<int64_t>::min());
  EXPECT_EQ(integerOf(Value(2.9)), 2);
  EXPECT_EQ(integerOf(Value(true)), 1);
}

TEST(UserDefaults, stringsGiveTheNumberTheyBeginWith) {
  EXPECT_EQ(integerOf(Value("2")), 2);
  EXPECT_EQ(integerOf(Value("-3")), -3);
  EXPECT_EQ(integerOf(Value("+4")), 4);
  EXPECT_EQ(integerOf(Value(" \t5 books")), 5);
  EXPECT_EQ(integerOf(Value("007")), 7);
  EXPECT_EQ(integerOf(Value("2.9")), 2);
}

TEST(UserDefaults, stringsOutOfRangeGiveTheNearestNumber) {
  EXPECT_EQ(integerOf(Value("99999999999999999999")), std::numeric_limits<int64_t>::max());
  EXPECT_EQ(integerOf(Value("-99999999999999999999")), std::numeric_limits<int64_t>::min());
}

TEST(UserDefaults, whatIsNoNumberIsZero) {
  for (const char* text : {"", " ", "many", "-", "+", "+-3", "--3", "0x10", "٣"}) {
    EXPECT_EQ(integerOf(Value(text)), 0) << text;
  }
  EXPECT_EQ(integerOf(Value()), 0);
  EXPECT_EQ(integerOf(Value(Value::Array{Value(1)})), 0);
  EXPECT_EQ(integerOf(Value(Value::Dictionary{{"key", Value(1)}})), 0);
  EXPECT_EQ(userDefaultsFromDictionary({})->integerForKey("key"), 0);
}

TEST(UserDefaults, manyThreadsMayAsk) {
  const TemporaryFolder folder;
  const auto defaults = userDefaultsFromFile(folder.write("settings.plist", logLevel(1)));
  std::vector<std::thread> threads;
  threads.reserve(4);
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([&, t] {
      for (int i = 0; i < 20; ++i) {
        if (t == 0) {
          folder.write("other", "");
          std::filesystem::rename(folder.write("new", logLevel(1 + i % 2)),
                                  folder.path("settings.plist"));
        }
        const int64_t level = defaults->integerForKey("LogLevel");
        EXPECT_TRUE(level == 1 || level == 2) << level;
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
}

}  // namespace
}  // namespace platform
