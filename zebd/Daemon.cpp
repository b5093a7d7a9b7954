#include "zebd/Daemon.h"

#include <malloc.h>
#include <pthread.h>

#include <CLI/CLI.hpp>
#include <csignal>
#include <memory>
#include <ostream>
#include <utility>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBLog.h"
#include "platform/DistributedNotificationCenter.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/Log.h"
#include "platform/Processes.h"
#include "platform/RunLoop.h"
#include "platform/WorkerThreads.h"
#include "zebd/BusService.h"
#include "zebd/HelpService.h"
#include "zebd/IdleExit.h"
#include "zebd/SystemLoad.h"

#ifndef ZEB_VERSION
#define ZEB_VERSION "0"
#endif

namespace zebd {

namespace {

using platform::stringByAppendingPathComponent;

/// How often the daemon looks whether the computer is busy.
constexpr platform::Seconds loadPace{60};
/// How often memory that is free is given back to the system, as long as there is work. What
/// searches and models have freed stays with the allocator otherwise: more than is in use.
constexpr platform::Seconds memoryPace{10};
/// Requests that the bus had delivered before it heard that the daemon leaves arrive within this.
constexpr platform::Seconds lastRequests{0.1};

platform::Environment environmentOfDaemon(const DaemonOptions& options,
                                          const Installation& installation) {
  platform::Environment environment = *platform::Environment::current();
  environment.log = platform::standardErrorLogSink(2 + options.verbosity);
  environment.standardOutput = [log = environment.log](const std::string& text) {
    log->write(5, text);
  };
  if (auto center = platform::busNotificationCenter()) {
    environment.notificationCenter = std::move(center);
  }
  if (options.cacheFolder) {
    environment.cachesDirectory = *options.cacheFolder;
  }
  if (!installation.indexingToolPath.empty()) {
    environment.processLauncher =
        platform::substitutingProcessLauncher("/usr/bin/bvmake", installation.indexingToolPath);
  }
  return environment;
}

/// Has SIGTERM and SIGINT end the main loop, and no thread. To be called before there are others.
void endMainLoopOnSignals() {
  sigset_t signals;
  sigemptyset(&signals);
  sigaddset(&signals, SIGTERM);
  sigaddset(&signals, SIGINT);
  pthread_sigmask(SIG_BLOCK, &signals, nullptr);
  platform::startNamedThread("signals", [signals] {
    int signal = 0;
    while (sigwait(&signals, &signal) != 0) {
    }
    platform::RunLoop::main()->perform([] { platform::RunLoop::main()->stop(); });
  });
}

/// The service with all that decides on its life.
class Daemon {
 public:
  Daemon(std::unique_ptr<BusService> bus, std::unique_ptr<HelpService> service,
         platform::Seconds idleDelay)
      : _bus(std::move(bus)),
        _service(std::move(service)),
        _idleExit(
            platform::RunLoop::main(), _service->owner(), idleDelay,
            [this] { return _service->isInUse(); }, [this] { _leaveIfNobodyAsks(); }),
        _loadTimer(
            platform::RunLoop::main()->scheduleRepeatingTimer(loadPace, [this] { _lookAtLoad(); })),
        _memoryTimer(platform::RunLoop::main()->scheduleRepeatingTimer(
            memoryPace, [this] { _giveMemoryBack(); })) {}
  ~Daemon() {
    _loadTimer->invalidate();
    _memoryTimer->invalidate();
  }
  Daemon(const Daemon&) = delete;
  Daemon& operator=(const Daemon&) = delete;

  bool run(platform::Error& error) {
    const bool serves = _bus->serve(*_service,
                                    {[this] {
                                       _wasAsked = true;
                                       _hasWorked = true;
                                       _idleExit.noteActivity();
                                     },
                                     [] { platform::RunLoop::main()->stop(); }},
                                    error);
    if (serves) {
      _service->begin();
      platform::RunLoop::main()->run();
      ZEBLog(3, "The daemon leaves");
    }
    return serves;
  }

 private:
  /// What was asked for while the daemon gave its name back is still done.
  void _leaveIfNobodyAsks() {
    _wasAsked = false;
    _bus->releaseName();
    platform::RunLoop::main()->performAfterDelay(lastRequests, [this] {
      if (!_wasAsked) {
        platform::RunLoop::main()->stop();
      } else {
        // Where the next daemon has the name already, this one still does what it was asked for,
        // and leaves after that.
        (void)_bus->requestName();
      }
    });
  }

  /// The plug-in may change the flag as well; only news of the computer's state do so here.
  void _lookAtLoad() {
    const bool shouldBeLazy =
        computerShouldBeLazy(platform::Environment::current()->processorCount());
    if (std::exchange(_wasBusy, shouldBeLazy) != shouldBeLazy) {
      _service->owner().setShouldBeLazy(shouldBeLazy);
    }
  }

  void _giveMemoryBack() {
    if (_hasWorked) {
      ::malloc_trim(0);
    }
    _hasWorked = _service->isInUse() || _service->owner().shutdownGuardCount() != 0;
  }

  const std::unique_ptr<BusService> _bus;
  const std::unique_ptr<HelpService> _service;
  bool _wasAsked = false;
  bool _hasWorked = true;
  bool _wasBusy = _service->owner().shouldBeLazy();
  IdleExit _idleExit;
  const std::shared_ptr<platform::Timer> _loadTimer;
  const std::shared_ptr<platform::Timer> _memoryTimer;
};

}  // namespace

std::optional<DaemonOptions> parseDaemonOptions(const std::vector<std::string>& arguments,
                                                std::ostream& out, std::ostream& err,
                                                int& exitCode) {
  DaemonOptions options;
  CLI::App app{"Serves searches in the help books of this computer on the session bus.", "zebd"};
  app.add_option("--idle", options.idleDelay, "Leave after this long without work (60)")
      ->check(CLI::Range(0.1, 1e9).description(""))
      ->check([](const std::string& seconds) {
        return seconds.find_first_of("nN") == std::string::npos ? "" : "not a number";
      })
      ->option_text("SECONDS");
  app.add_option("--cache-dir", options.cacheFolder, "Folder for indexes and the list of books")
      ->option_text("DIR");
  app.add_flag("-v,--verbose", options.verbosity, "Log more; may be repeated");
  app.set_version_flag("--version", std::string("zebd ") + ZEB_VERSION);
  try {
    app.parse(std::vector<std::string>(arguments.rbegin(), arguments.rend()));
  } catch (const CLI::ParseError& error) {
    exitCode = app.exit(error, out, err) == 0 ? 0 : 2;
    return std::nullopt;
  }
  if (options.cacheFolder && !options.cacheFolder->starts_with('/')) {
    err << "zebd: --cache-dir: the path has to begin with a slash\n";
    exitCode = 2;
    return std::nullopt;
  }
  return options;
}

int runDaemon(const DaemonOptions& options, const Installation& installation) {
  endMainLoopOnSignals();
  const platform::EnvironmentOverride override(environmentOfDaemon(options, installation));
  const auto environment = platform::Environment::current();
  if (!environment->cachesDirectory) {
    ZEBLog(1, "There is no caches folder");
    return 1;
  }
  const Catalogue catalogue(stringByAppendingPathComponent(
      options.cacheFolder ? *options.cacheFolder
                          : stringByAppendingPathComponent(*environment->cachesDirectory, "zeb"),
      "books"));
  platform::Error error;
  auto bus = BusService::connect({}, error);
  OwnerSettings settings;
  settings.shouldBeLazy = computerShouldBeLazy(environment->processorCount());
  settings.userHelpCachesDirectoryPath =
      stringByAppendingPathComponent(*environment->cachesDirectory, ZEBDaemonBundleID);
  if (bus != nullptr) {
    std::vector<CatalogueEntry> entries = catalogue.entries();
    followLanguages(catalogue, entries);
    forgetKnownIndicesWhenDue(entries);
  }
  auto host = bus == nullptr
                  ? nullptr
                  : Host::start(installation.pluginBundlePath, std::move(settings), error);
  if (host == nullptr) {
    ZEBLog(1, "%@", error.description);
    return 1;
  }
  BookKeeper::Settings books;
  books.dataFolders = environment->dataDirectories;
  books.languages = environment->preferredLanguages;
  books.catalogueFolder = catalogue.folder();
  const auto listener = bus->listener();
  Daemon daemon(std::move(bus),
                std::make_unique<HelpService>(std::move(host), std::move(books), listener),
                platform::Seconds(options.idleDelay));
  if (!daemon.run(error)) {
    ZEBLog(1, "%@", error.description);
    return 1;
  }
  return 0;
}

}  // namespace zebd
