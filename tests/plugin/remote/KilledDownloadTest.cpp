// The host is killed while it downloads, at moments that it or its server comes to. ZEB_KILLS=n
// begins n such downloads instead of one of each kind.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <memory>
#include <sstream>
#include <string>
#include <vector>

#include "host/Zebrine/ZEBConstants.h"
#include "platform/Digest.h"
#include "platform/PropertyList.h"
#include "platform/ThreadSafety.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "tests/plugin/HelpIndexWorld.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/Latch.h"
#include "tests/support/ScriptedServer.h"

using tests::httpAnswer;
using tests::ScriptedConnection;
using tests::ScriptedRequest;

namespace {

constexpr int killed = 128 + 9;

std::string contents(const std::string& path) {
  std::ostringstream bytes;
  bytes << std::ifstream(path, std::ios::binary).rdbuf();
  return bytes.str();
}

/// Two editions of one book.
struct Edition {
  explicit Edition(const std::string& word)
      : index(std::string(
            platform::classicArchiveWithRootObject(
                platform::Value::Dictionary{
                    {"SKI_INDEX_DATA", tests::keywordIndex({tests::page("/a.html", "A", word)})}})
                .view())),
        list(std::string(
            platform::dataFromPropertyList(platform::Value::Dictionary{{word, "anchor"}},
                                           platform::PropertyListFormat::xml)
                .view())),
        catalogue(R"({"format": 1, "books": [{"identifier": "org.book", "version": ")" + word +
                  R"(", "locale": "en", "searchIndex": {"url": ")" + word +
                  R"(.index", "sha256": ")" + platform::sha256Digest(index) +
                  R"("}, "exactMatch": {"url": ")" + word + R"(.list", "sha256": ")" +
                  platform::sha256Digest(list) + R"("}}]})") {}

  const std::string index;
  const std::string list;
  const std::string catalogue;
};

class KilledDownload : public testing::Test {
 protected:
  /// Where the server lets the client die: which of the three files, and how much of it was sent.
  struct Moment {
    std::string path;
    double share;
  };

  KilledDownload()
      : _server([this](const ScriptedRequest& request, ScriptedConnection& connection) {
          _answer(request, connection);
        }) {}

  /// Runs a host until its end, or until the moment that is set; its exit status.
  int run(int step) {
    // As a host does from time to time, for servers to be asked.
    std::filesystem::remove(_folder.path("caches/org.zeb.zebd/HelpindexCache.plist"));
    const std::string output = _folder.path("output");
    tests::ChildProcess host(
        DOWNLOAD_ONCE_PROGRAM,
        {_folder.path("caches"), _server.URL("/catalogue.json"), "org.book", std::to_string(step)},
        output);
    if (const auto reached = _round().reached) {
      EXPECT_TRUE(reached->wait()) << contents(output);
      host.kill();
    }
    return host.wait();
  }

  static std::optional<int> roundsAskedFor() {
    // Read before any thread runs that could change it; none does.
    const char* const asked = std::getenv("ZEB_KILLS");  // NOLINT(concurrency-mt-unsafe)
    return asked == nullptr ? std::nullopt : std::optional(std::atoi(asked));
  }

  void beginRound(int round, std::optional<Moment> moment) {
    const platform::MutexLock lock(_mutex);
    _state.edition = &_editions[static_cast<size_t>(round) % 2];
    _state.moment = std::move(moment);
    _state.reached = _state.moment ? std::make_shared<tests::Latch>() : nullptr;
  }

  std::string kept(const std::string& extension) const {
    return _folder.path("caches/org.zeb.zebd/GeneratedIndexes/org.book/en." + extension);
  }

  void expectNothingTorn() const {
    const std::string index = contents(kept("helpindex"));
    EXPECT_TRUE(index.empty() || index == _editions[0].index || index == _editions[1].index);
    const std::string list = contents(kept("exactmatch.plist"));
    EXPECT_TRUE(list.empty() || list == _editions[0].list || list == _editions[1].list);
    if (!index.empty()) {
      EXPECT_NE(ZEBHelpindexIndex::initWithPath(kept("helpindex")), nullptr);
    }
  }

  /// The next start brings the current edition, whatever was left behind.
  void expectNextStartCompletes() {
    {
      const platform::MutexLock lock(_mutex);
      _state.moment.reset();
      _state.reached.reset();
    }
    EXPECT_EQ(run(0), 0) << contents(_folder.path("output"));
    EXPECT_EQ(contents(kept("helpindex")), _round().edition->index);
    EXPECT_EQ(contents(kept("exactmatch.plist")), _round().edition->list);
    EXPECT_THAT(temporaryFiles(), testing::IsEmpty());
  }

  /// What writers have left anywhere in the caches folder.
  std::vector<std::string> temporaryFiles() const {
    std::vector<std::string> found;
    std::filesystem::create_directories(_folder.path("caches"));
    for (const auto& entry :
         std::filesystem::recursive_directory_iterator(_folder.path("caches"))) {
      if (entry.path().extension() == ".tmp") {
        found.push_back(entry.path());
      }
    }
    return found;
  }

 private:
  /// What the server is to do now.
  struct Round {
    const Edition* edition = nullptr;
    std::optional<Moment> moment;
    /// Opened at that moment.
    std::shared_ptr<tests::Latch> reached;
  };

  Round _round() const {
    const platform::MutexLock lock(_mutex);
    return _state;
  }

  void _answer(const ScriptedRequest& request, ScriptedConnection& connection) const {
    const Round round = _round();
    const std::string kind = request.target.substr(request.target.rfind('.'));
    const std::string& body = kind == ".json"    ? round.edition->catalogue
                              : kind == ".index" ? round.edition->index
                                                 : round.edition->list;
    const std::string answer = httpAnswer(200, body, {"Cache-Control: no-cache"});
    if (!round.moment || round.moment->path != kind) {
      connection.send(answer);
      return;
    }
    connection.send(std::string_view(answer).substr(
        0, static_cast<size_t>(static_cast<double>(answer.size()) * round.moment->share)));
    round.reached->open();
    connection.waitUntilClientIsGone();
  }

  const tests::TemporaryFolder _folder;
  const std::vector<Edition> _editions = {Edition("applet"), Edition("gadget")};
  mutable platform::Mutex _mutex;
  Round _state GUARDED_BY(_mutex);
  // Last: its threads use all of the above.
  tests::ScriptedServer _server;
};

TEST_F(KilledDownload, leavesNothingTornAndTheNextStartCompletes) {
  std::vector<Moment> moments;
  for (const char* path : {".json", ".index", ".list"}) {
    for (const double share : {0.0, 0.1, 0.5, 0.9, 1.0}) {
      moments.push_back({path, share});
    }
  }
  // Before, in the middle of and after each of the files that a host writes: those of the URL
  // cache, index, list and known indices. Some hosts end before they come to the last of them.
  constexpr int lastStep = 21;
  const int kinds = static_cast<int>(moments.size()) + lastStep;
  const int rounds = roundsAskedFor().value_or(kinds);
  int killedCount = 0;
  int leftCount = 0;
  for (int round = 0; round < rounds && !HasFailure(); ++round) {
    const size_t kind = static_cast<size_t>(round % kinds);
    int step = 0;
    if (kind < moments.size()) {
      beginRound(round, moments[kind]);
    } else {
      beginRound(round, std::nullopt);
      step = static_cast<int>(kind - moments.size()) + 1;
    }
    const int status = run(step);
    killedCount += status == killed ? 1 : 0;
    leftCount += temporaryFiles().empty() ? 0 : 1;
    EXPECT_TRUE(status == killed || (step > 0 && status == 0)) << status << " in round " << round;
    expectNothingTorn();
    expectNextStartCompletes();
  }
  // Most of them did get to where they were to die, and some of these in the midst of a file.
  EXPECT_GT(killedCount, rounds * 3 / 4);
  EXPECT_GE(leftCount, rounds / kinds);
}

}  // namespace
