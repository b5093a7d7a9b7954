#include "platform/Environment.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <map>
#include <thread>
#include <utility>

#include "platform/DistributedNotificationCenter.h"
#include "platform/Processes.h"
#include "platform/UserDefaults.h"
#include "tests/platform/TemporaryFolder.h"

namespace platform {
namespace {

/// Sets environment variables for one test; an absent value removes the variable.
class Variables {
 public:
  explicit Variables(const std::map<std::string, std::optional<std::string>>& values) {
    for (const auto& entry : values) {
      const char* former = std::getenv(entry.first.c_str());
      _former[entry.first] = former == nullptr ? std::nullopt : std::optional<std::string>(former);
      _set(entry.first, entry.second);
    }
  }
  ~Variables() {
    for (const auto& entry : _former) {
      _set(entry.first, entry.second);
    }
  }
  Variables(const Variables&) = delete;
  Variables& operator=(const Variables&) = delete;

 private:
  static void _set(const std::string& name, const std::optional<std::string>& value) {
    if (value) {
      ::setenv(name.c_str(), value->c_str(), 1);
    } else {
      ::unsetenv(name.c_str());
    }
  }

  std::map<std::string, std::optional<std::string>> _former;
};

TEST(Environment, preferredLanguagesComeFromTheLanguageListFirst) {
  const Variables variables({{"LANGUAGE", "pt_BR:de::pt_BR"},
                             {"LC_ALL", std::nullopt},
                             {"LC_MESSAGES", "fr_FR.UTF-8"},
                             {"LANG", "it_IT.UTF-8"}});
  EXPECT_EQ(Environment::system().preferredLanguages,
            (std::vector<std::string>{"pt-BR", "de", "fr-FR"}));
}

TEST(Environment, localeNamesLoseEncodingAndModifier) {
  const Variables variables({{"LANGUAGE", std::nullopt},
                             {"LC_ALL", "ca_ES.UTF-8@valencia"},
                             {"LC_MESSAGES", std::nullopt},
                             {"LANG", "de_DE"}});
  EXPECT_EQ(Environment::system().preferredLanguages, (std::vector<std::string>{"ca-ES"}));
}

TEST(Environment, withoutALanguageEnglishIsPreferred) {
  const Variables variables({{"LANGUAGE", std::nullopt},
                             {"LC_ALL", "C.UTF-8"},
                             {"LC_MESSAGES", std::nullopt},
                             {"LANG", std::nullopt}});
  EXPECT_EQ(Environment::system().preferredLanguages, (std::vector<std::string>{"en"}));
}

TEST(Environment, cachesDirectoryFollowsTheBaseDirectoryConvention) {
  const Variables variables({{"XDG_CACHE_HOME", "/var/tmp/caches"}, {"HOME", "/home/ada"}});
  EXPECT_EQ(Environment::system().cachesDirectory, "/var/tmp/caches");
}

TEST(Environment, relativeCachesDirectoryIsIgnored) {
  const Variables variables({{"XDG_CACHE_HOME", "caches"}, {"HOME", "/home/ada"}});
  EXPECT_EQ(Environment::system().cachesDirectory, "/home/ada/.cache");
}

TEST(Environment, withoutVariablesTheUserDatabaseKnowsTheHomeFolder) {
  const Variables variables({{"XDG_CACHE_HOME", std::nullopt}, {"HOME", std::nullopt}});
  const auto directory = Environment::system().cachesDirectory;
  if (directory) {
    EXPECT_TRUE(directory->ends_with("/.cache")) << *directory;
  }
}

TEST(Environment, dataDirectoriesFollowTheBaseDirectoryConventionAndEachIsThereOnce) {
  const Variables variables({{"XDG_DATA_HOME", "/home/ada/data"},
                             {"XDG_DATA_DIRS", "/opt/share/:relative::/usr/share:/opt/share"}});
  EXPECT_EQ(
      Environment::system().dataDirectories,
      (std::vector<std::string>{"/home/ada/data", "/home/ada/data/flatpak/exports/share",
                                "/opt/share", "/usr/share", "/var/lib/flatpak/exports/share"}));
}

TEST(Environment, withoutVariablesDataLieInTheHomeFolderAndInTheUsualPlaces) {
  const Variables variables(
      {{"XDG_DATA_HOME", std::nullopt}, {"XDG_DATA_DIRS", std::nullopt}, {"HOME", "/home/ada"}});
  EXPECT_EQ(Environment::system().dataDirectories,
            (std::vector<std::string>{
                "/home/ada/.local/share", "/home/ada/.local/share/flatpak/exports/share",
                "/usr/local/share", "/usr/share", "/var/lib/flatpak/exports/share"}));
}

TEST(Environment, theRealOneHasEveryService) {
  const Environment environment = Environment::system();
  EXPECT_NE(environment.clock, nullptr);
  EXPECT_NE(environment.files, nullptr);
  EXPECT_NE(environment.log, nullptr);
  EXPECT_EQ(environment.processLauncher, systemProcessLauncher());
  EXPECT_EQ(environment.processTable, systemProcessTable());
  EXPECT_NE(environment.userDefaults, nullptr);
  EXPECT_NE(environment.notificationCenter, nullptr);
}

TEST(Environment, settingsFollowTheBaseDirectoryConvention) {
  const tests::TemporaryFolder folder;
  const std::string settings =
      "<plist version=\"1.0\"><dict><key>LogLevel</key><integer>3</integer></dict></plist>";
  folder.write("config/zeb/settings.plist", settings);
  folder.write("home/.config/zeb/settings.plist",
               "<plist version=\"1.0\"><dict><key>LogLevel</key><integer>4</integer></dict>"
               "</plist>");
  const auto level = [] { return Environment::system().userDefaults->integerForKey("LogLevel"); };
  {
    const Variables variables(
        {{"XDG_CONFIG_HOME", folder.path("config")}, {"HOME", folder.path("home")}});
    EXPECT_EQ(level(), 3);
  }
  {
    const Variables variables({{"XDG_CONFIG_HOME", std::nullopt}, {"HOME", folder.path("home")}});
    EXPECT_EQ(level(), 4);
  }
  {
    const Variables variables({{"XDG_CONFIG_HOME", folder.path("none")}, {"HOME", std::nullopt}});
    EXPECT_EQ(level(), 0);
  }
}

TEST(Environment, printsToStandardOutput) {
  ::testing::internal::CaptureStdout();
  Environment::system().standardOutput("--file\n");
  Environment::system().standardOutput(std::string("a\0b", 3));
  EXPECT_EQ(::testing::internal::GetCapturedStdout(), std::string("--file\na\0b", 10));
}

TEST(Environment, countsAtLeastOneProcessor) {
  EXPECT_GE(Environment::system().processorCount(), 1);
}

TEST(Environment, eachRealOneHasANotificationCenterOfItsOwn) {
  // Not on the session bus: who wants that says so.
  EXPECT_NE(Environment::system().notificationCenter, Environment::system().notificationCenter);
}

TEST(EnvironmentOverride, replacesTheEnvironmentForItsLifetime) {
  const auto before = Environment::current();
  {
    Environment replacement = Environment::system();
    replacement.clock = std::make_shared<SimulatedClock>();
    const EnvironmentOverride override(replacement);
    EXPECT_EQ(Environment::current()->clock, replacement.clock);
  }
  EXPECT_EQ(Environment::current(), before);
}

TEST(EnvironmentOverride, whatGoesWithAnEnvironmentMayAskForTheOneThatFollows) {
  const auto before = Environment::current();
  std::shared_ptr<const Environment> atTheEnd;
  {
    // As a thread of a part does that is waited for.
    std::shared_ptr<void> part(nullptr, [&](const void* /*nothing*/) {
      std::thread([&] { atTheEnd = Environment::current(); }).join();
    });
    Environment replacement = Environment::system();
    replacement.standardOutput = [part = std::move(part)](const std::string&) {};
    const EnvironmentOverride override(std::move(replacement));
  }
  EXPECT_EQ(atTheEnd, before);
}

}  // namespace
}  // namespace platform
