// Builds in a process of their own that is killed: at moments that the process itself comes to, and
// from outside as soon as it is seen to have got so far. Nothing here depends on how long a build
// takes.
#include <gtest/gtest.h>

#include <sys/mman.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <csignal>
#include <functional>
#include <new>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "host/Luxwell/HelpLUXModel.h"
#include "platform/Environment.h"
#include "tests/Luxwell/LUXModelWorld.h"
#include "tests/platform/TemporaryFolder.h"

namespace {

using Names = std::vector<std::string>;

constexpr unsigned pageCount = 12;

// The steps of a build: it has begun, each page is added, the file is about to be written, and then
// these.
constexpr unsigned fileIsWritten = pageCount + 3;
constexpr unsigned buildIsOver = pageCount + 4;

[[noreturn]] void dieHere() {
  ::kill(::getpid(), SIGKILL);
  // The signal may take a moment to arrive.
  while (true) {
    ::pause();
  }
}

/// Counts the steps of the process that is to be killed, in memory that it shares with the test,
/// and ends it at one of them.
class Steps {
 public:
  Steps() {
    void* const memory = ::mmap(nullptr, sizeof(std::atomic<unsigned>), PROT_READ | PROT_WRITE,
                                MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    _count = memory == MAP_FAILED ? nullptr : new (memory) std::atomic<unsigned>(0);
  }
  ~Steps() {
    if (_count != nullptr) {
      ::munmap(_count, sizeof(std::atomic<unsigned>));
    }
  }
  Steps(const Steps&) = delete;
  Steps& operator=(const Steps&) = delete;

  bool areShared() const { return _count != nullptr; }
  unsigned count() const { return _count->load(); }

  /// In the process that is to be killed.
  void dieAt(unsigned step) { _last = step; }
  void take() {
    if (_count->fetch_add(1) + 1 == _last) {
      dieHere();
    }
  }

 private:
  std::atomic<unsigned>* _count = nullptr;
  std::optional<unsigned> _last;
};

/// The real files, with a step before and after each file that is written.
class SteppingFiles : public platform::FileManager {
 public:
  explicit SteppingFiles(Steps& steps) : _steps(steps) {}

  std::optional<platform::Error> writeAtomically(const std::string& path,
                                                 const platform::Data& data) const override {
    _steps.take();
    auto error = FileManager::writeAtomically(path, data);
    _steps.take();
    return error;
  }

 private:
  Steps& _steps;
};

class HelpLUXModelKilled : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(steps.areShared());
    platform::Environment environment = platform::Environment::system();
    environment.files = std::make_shared<SteppingFiles>(steps);
    _override.emplace(std::move(environment));
    build("old");
    ASSERT_EQ(steps.count(), buildIsOver);
    ASSERT_EQ(savedBook(), "old");
  }

  std::string directory() const { return folder.path("a/model"); }

  std::shared_ptr<HelpLUXModel> open() const {
    return HelpLUXModel::initWithDirectoryPath(directory(), "English");
  }

  void build(const std::string& book) {
    const auto model = open();
    model->reset();
    model->addHelpbookID(book);
    steps.take();
    for (const tests::ModelPage& page : _pages) {
      tests::addPages(*model, {page});
      steps.take();
    }
    model->saveWithOptions({});
    steps.take();
  }

  /// Runs the body in another process until that is killed, by itself or, once it has taken so many
  /// steps, from here.
  void runUntilKilled(const std::function<void()>& body, std::optional<unsigned> killedAfter) {
    const unsigned before = steps.count();
    const pid_t child = ::fork();
    if (child == 0) {
      body();
      ::_exit(0);
    }
    ASSERT_GT(child, 0);
    int status = 0;
    if (killedAfter) {
      // A child that ends before it gets there is found out below.
      pid_t ended = 0;
      while (steps.count() - before < *killedAfter && ended == 0) {
        std::this_thread::yield();
        ended = ::waitpid(child, &status, WNOHANG);
      }
      ASSERT_EQ(ended, 0) << "the child ended by itself";
      ASSERT_EQ(::kill(child, SIGKILL), 0);
    }
    ASSERT_EQ(::waitpid(child, &status, 0), child);
    ASSERT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGKILL) << status;
  }

  /// The first book of the model that is there, which is a whole one.
  std::string savedBook() const {
    const auto model = open();
    EXPECT_FALSE(model->needsBuild());
    model->loadLSMMap();
    EXPECT_FALSE(model->needsBuild());
    const Names books = model->allHelpbookIDs();
    return books.empty() ? std::string() : books.front();
  }

  Names namesInDirectory() const {
    return platform::systemFileManager()->namesInDirectory(directory()).value_or(Names());
  }

  /// What the killed left is gone with the next build.
  void expectTidyAfterBuild() {
    build("last");
    EXPECT_EQ(savedBook(), "last");
    EXPECT_EQ(namesInDirectory(), Names{"LUXModel"});
  }

  tests::TemporaryFolder folder;
  Steps steps;

 private:
  const std::vector<tests::ModelPage> _pages = tests::randomModelPages(pageCount, 12, 1);
  std::optional<platform::EnvironmentOverride> _override;
};

}  // namespace

TEST_F(HelpLUXModelKilled, BeforeTheFileIsReplacedTheOldModelStaysAndAfterThatTheNewOneIsThere) {
  for (unsigned step = 1; step <= buildIsOver; ++step) {
    const std::string book = "new" + std::to_string(step);
    const std::string before = savedBook();
    const unsigned taken = steps.count();
    runUntilKilled(
        [&] {
          steps.dieAt(taken + step);
          build(book);
        },
        std::nullopt);
    EXPECT_EQ(steps.count() - taken, step);
    EXPECT_EQ(savedBook(), step < fileIsWritten ? before : book) << "step " << step;
  }
  expectTidyAfterBuild();
}

TEST_F(HelpLUXModelKilled, InTheMiddleOfTheFileTheOldModelStays) {
  const size_t size =
      platform::systemFileManager()->contentsAtPath(directory() + "/LUXModel")->length();
  constexpr size_t rounds = 23;
  for (size_t round = 0; round < rounds; ++round) {
    runUntilKilled(
        [&] {
          // The system writes as much as the limit allows, and then sends this signal.
          ::signal(SIGXFSZ, [](int) { dieHere(); });
          const rlim_t limit = size * round / rounds;
          const rlimit limits{limit, limit};
          ::setrlimit(RLIMIT_FSIZE, &limits);
          build("new");
        },
        std::nullopt);
    EXPECT_EQ(savedBook(), "old") << "round " << round;
    EXPECT_EQ(namesInDirectory().size(), 2U) << "the half and the old one, round " << round;
  }
  expectTidyAfterBuild();
}

TEST_F(HelpLUXModelKilled, AtAnyMomentAWholeModelIsThere) {
  for (unsigned round = 0; round < 61; ++round) {
    runUntilKilled(
        [&] {
          while (true) {
            build("new" + std::to_string(round));
          }
        },
        // Into the second build for some, so that moments after a save are among them.
        1 + round % (buildIsOver + 3));
    const std::string book = savedBook();
    EXPECT_TRUE(book == "old" || book.starts_with("new")) << book;
  }
  expectTidyAfterBuild();
}
