// Downloads one remote book as the plug-in does and exits: a host process for tests to kill.
//   download_once CACHES CATALOGUE BOOKID STEP
// At the step of that number (0: none) it kills itself: steps are taken before, in the middle of
// and after each write of a file. Exits with 0 when the book has its index and nothing counts as
// being downloaded any more, with 3 otherwise.
#include <unistd.h>

#include <atomic>
#include <csignal>
#include <cstdlib>
#include <fstream>
#include <memory>
#include <string>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/DistributedNotificationCenter.h"
#include "platform/Environment.h"
#include "platform/RunLoop.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBIndex.h"
#include "plugin/shelf/ZEBIndexshelf.h"
#include "tests/plugin/HelpIndexWorld.h"

namespace {

std::atomic<int> steps{0};
int lastStep = 0;

void takeStep() {
  if (++steps == lastStep) {
    ::kill(::getpid(), SIGKILL);
    while (true) {
      ::pause();
    }
  }
}

class SteppingFiles : public platform::FileManager {
 public:
  std::optional<platform::Error> writeAtomically(const std::string& path,
                                                 const platform::Data& data) const override {
    takeStep();
    if (steps + 1 == lastStep) {
      // What a process leaves that ends while it writes.
      std::ofstream(platform::stringByDeletingLastPathComponent(path) + "/." +
                        platform::lastPathComponent(path) + "." + std::to_string(::getpid()) +
                        ".99.tmp",
                    std::ios::binary)
          << data.view().substr(0, data.length() / 2);
    }
    takeStep();
    auto error = FileManager::writeAtomically(path, data);
    takeStep();
    return error;
  }
};

class Owner : public tests::BookOwner {
 public:
  explicit Owner(std::string caches) : _caches(std::move(caches)) {}
  bool userLoggedIn() const override { return true; }
  std::optional<std::string> userHelpCachesDirectoryPath() const override { return _caches; }

 private:
  const std::string _caches;
};

}  // namespace

int main(int argc, char** argv) {
  if (argc != 5) {
    return 2;
  }
  const std::string caches = argv[1];
  lastStep = std::atoi(argv[4]);
  platform::Environment environment = platform::Environment::system();
  environment.files = std::make_shared<SteppingFiles>();
  environment.cachesDirectory = caches;
  environment.notificationCenter = platform::localNotificationCenter();
  const platform::EnvironmentOverride inForce(std::move(environment));

  const auto owner = std::make_shared<Owner>(caches + "/" + ZEBDaemonBundleID);
  const auto book = owner->addBook(argv[3], ZEBHelpBookType4);
  book->setLocalization("en");
  book->setCatalogueURL(platform::URL::URLWithString(argv[2]));
  const auto shelf = ZEBIndexshelf::initWithOwner(owner);
  shelf->setUserLoggedIn(true);
  (void)shelf->indicesForBook(book);
  while (shelf->isIndexDownloadingForBook(book) ||
         shelf->indexDownloadQueue()->operationCount() > 0) {
    platform::RunLoop::main()->runFor(platform::Seconds(0.001));
  }
  platform::RunLoop::main()->runPending();
  const auto records = shelf->indicesForBook(book);
  const bool isThere = records.size() == 1 && !records.front()->isDownloading();
  std::_Exit(isThere ? 0 : 3);
}
