#include "platform/Environment.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <map>

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

}  // namespace
}  // namespace platform
