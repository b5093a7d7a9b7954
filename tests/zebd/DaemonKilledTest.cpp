// However a daemon ends, the next one serves, with nothing torn and nothing left lying about.
#include <gmock/gmock.h>

#include <random>

#include "tests/support/NginxServer.h"
#include "tests/zebd/DaemonWorld.h"

namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::StartsWith;
using tests::contents;
using tests::NginxServer;

namespace fs = std::filesystem;

/// So slow that a download is under way for a while.
constexpr const char* slowly = "limit_rate 100k; limit_rate_after 4k;";

class DaemonKilledTest : public testing::Test, protected tests::DaemonWorld {
 protected:
  static int rounds() {
    const char* asked = std::getenv("ZEB_KILLS");
    return asked == nullptr ? 8 : std::atoi(asked);
  }
  std::string text(size_t words) {
    std::string text;
    for (size_t i = 0; i < words; ++i) {
      text += "word" + std::to_string(_random() % 5000) + " ";
    }
    return text;
  }
  void pause(unsigned atMost, unsigned atLeast = 0) {
    std::this_thread::sleep_for(
        std::chrono::milliseconds(atLeast + _random() % (atMost - atLeast)));
  }
  void kill() const {
    const pid_t process = daemonProcess();
    ASSERT_GT(process, 0);
    ASSERT_EQ(::kill(process, SIGKILL), 0);
    EXPECT_TRUE(waitUntilGone(process));
  }
  /// Whatever was being done, what there was is found, as soon as it is indexed again.
  void expectToServe() const {
    EXPECT_THAT(zeb({"search", "spring"}), AllOf(StartsWith("0\n"), HasSubstr("Roses")));
  }
  std::vector<std::string> indexes() const {
    std::vector<std::string> paths;
    for (const auto& entry : fs::recursive_directory_iterator(folder.path("cache"))) {
      if (entry.path().extension() == ".helpindex") {
        paths.push_back(entry.path().string());
      }
    }
    return paths;
  }
  void expectSoundIndexes() const {
    for (const std::string& path : indexes()) {
      const std::string output = folder.path("check");
      tests::ChildProcess check(ZEB_TOOL, {"--check", path}, output);
      EXPECT_EQ(check.wait(), 0) << contents(output);
    }
  }

 private:
  std::mt19937 _random{11};
};

TEST_F(DaemonKilledTest, NextDaemonServesWhateverThisOneWasDoing) {
  const NginxServer server(slowly);
  for (int i = 0; i < 4; ++i) {
    folder.write("published/index.html", "<title>Applets</title><p>" + text(4000));
    ASSERT_THAT(zeb({"publish", folder.path("published"), "--site", server.folder(), "--book-id",
                     "org.applets" + std::to_string(i), "--language", "en"},
                    false),
                StartsWith("0\n"));
  }
  ASSERT_THAT(zeb({"scan"}), StartsWith("0\n"));
  const std::vector<std::string> force = {"org.zeb.Help1.Scan", "@as []", "{'force': <true>}"};
  for (int i = 0; i < rounds(); ++i) {
    SCOPED_TRACE(i);
    expectToServe();
    switch (i % 4) {
      case 0:  // While books are indexed.
        page("round" + std::to_string(i), "Round", text(2000));
        fs::remove_all(folder.path("share/help/en/round" + std::to_string(i - 8)));
        pause(400);
        break;
      case 1:  // While all is registered anew, and the list of known indexes written.
        EXPECT_THAT(gdbus(force), HasSubstr("changed"));
        pause(300);
        break;
      case 2:  // While models are built: a second after the last change of an index.
        page("changing", "Changing", text(3000));
        EXPECT_THAT(gdbus(force), HasSubstr("changed"));
        pause(1800, 900);
        break;
      default:  // While indexes are fetched.
        EXPECT_THAT(gdbus({"org.zeb.Help1.RemoveRemote", server.URL("/catalogue.json")}),
                    StartsWith(i == 3 ? "Error" : "(["));
        EXPECT_THAT(gdbus({"org.zeb.Help1.AddRemote", server.URL("/catalogue.json"), "[]", "[]"}),
                    HasSubstr("org.applets0"));
        pause(300);
        break;
    }
    kill();
  }
  EXPECT_THAT(zeb({"scan"}), StartsWith("0\n"));
  EXPECT_THAT(zeb({"books"}), testing::Not(HasSubstr("not indexed")));
  expectToServe();
  EXPECT_THAT(zeb({"search", "applets"}), StartsWith("0\n"));
  EXPECT_TRUE(waitFor([this] { return temporaryFiles().empty(); }))
      << testing::PrintToString(temporaryFiles());
  expectSoundIndexes();
}

}  // namespace
