#include "zebd/FolderWatcher.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <sys/inotify.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <filesystem>
#include <map>
#include <optional>
#include <set>
#include <system_error>
#include <thread>
#include <utility>

#include "host/Zebrine/ZEBLog.h"
#include "platform/Clock.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/RunLoop.h"
#include "platform/WorkerThreads.h"

namespace zebd {

namespace {

namespace fs = std::filesystem;

/// A package that is being installed changes many files one after the other.
constexpr platform::Seconds calm{2};
constexpr platform::Seconds longest{30};

constexpr uint32_t events = IN_CREATE | IN_DELETE | IN_MOVED_FROM | IN_MOVED_TO | IN_CLOSE_WRITE |
                            IN_ATTRIB | IN_DELETE_SELF | IN_MOVE_SELF | IN_ONLYDIR;

/// For the folder above one that is not there yet.
constexpr uint32_t arrivals = IN_CREATE | IN_MOVED_TO | IN_DELETE_SELF | IN_MOVE_SELF | IN_ONLYDIR;

/// One thing that the kernel reports: watch, and what happened.
using Event = std::pair<int, uint32_t>;

/// The folder, or the nearest one above it that is there.
std::string nearestFolder(std::string path) {
  std::error_code error;
  while (path.size() > 1 && !fs::is_directory(path, error)) {
    path = platform::stringByDeletingLastPathComponent(path);
  }
  return path;
}

void addTree(const std::string& tree, std::set<std::string>& paths) {
  std::error_code error;
  fs::recursive_directory_iterator entry(tree, fs::directory_options::skip_permission_denied,
                                         error);
  for (; !error && entry != fs::recursive_directory_iterator(); entry.increment(error)) {
    std::error_code unknown;
    if (!entry->is_symlink(unknown) && entry->is_directory(unknown)) {
      paths.insert(entry->path().string());
      if (paths.size() > FolderWatcher::maximumFolderCount) {
        return;
      }
    }
  }
}

}  // namespace

/// Shared with the thread that listens to the kernel. But for the descriptors, which never change,
/// all belongs to the main thread.
struct FolderWatcher::Implementation : std::enable_shared_from_this<Implementation> {
  explicit Implementation(std::function<void()> whenChanged) : changed(std::move(whenChanged)) {}
  ~Implementation() {
    for (const int descriptor : {notifications, wake}) {
      if (descriptor >= 0) {
        ::close(descriptor);
      }
    }
  }

  void listen() const;
  void happened(const std::vector<Event>& reported);
  void look();

  const int notifications = ::inotify_init1(IN_NONBLOCK | IN_CLOEXEC);
  const int wake = ::eventfd(0, EFD_NONBLOCK | EFD_CLOEXEC);

  std::function<void()> changed;
  std::map<std::string, int> watches;
  /// Those of folders above the ones that are wanted, where all kinds of things happen.
  std::set<int> substitutes;
  std::optional<platform::Clock::Instant> first;
  platform::Clock::Instant last{0};
};

FolderWatcher::FolderWatcher(std::function<void()> changed)
    : _implementation(std::make_shared<Implementation>(std::move(changed))) {
  if (_implementation->notifications < 0 || _implementation->wake < 0) {
    ZEBLog(1, "Folders cannot be watched");
    return;
  }
  // The thread holds on to what it listens to, and no longer than that to anything else.
  platform::startNamedThread("folder-watch",
                             [implementation = _implementation] { implementation->listen(); });
}

FolderWatcher::~FolderWatcher() {
  _implementation->changed = nullptr;
  const uint64_t one = 1;
  (void)!::write(_implementation->wake, &one, sizeof one);
}

void FolderWatcher::Implementation::listen() const {
  alignas(inotify_event) char buffer[16384];
  pollfd descriptors[] = {{notifications, POLLIN, 0}, {wake, POLLIN, 0}};
  while (true) {
    if (::poll(descriptors, 2, -1) < 0 && errno != EINTR) {
      return;
    }
    if ((descriptors[1].revents & POLLIN) != 0) {
      return;
    }
    std::vector<Event> reported;
    ssize_t length = 0;
    while ((length = ::read(notifications, buffer, sizeof buffer)) > 0) {
      for (const char* at = buffer; at < buffer + length;) {
        const auto* event = reinterpret_cast<const inotify_event*>(at);
        // A watch that was taken back says so itself.
        if ((event->mask & IN_IGNORED) == 0) {
          reported.emplace_back(event->wd, event->mask);
        }
        at += sizeof(inotify_event) + event->len;
      }
    }
    if (!reported.empty()) {
      platform::RunLoop::main()->perform(
          [weak = std::weak_ptr(std::const_pointer_cast<Implementation>(shared_from_this())),
           reported = std::move(reported)] {
            if (const auto self = weak.lock()) {
              self->happened(reported);
            }
          });
    }
  }
}

void FolderWatcher::Implementation::happened(const std::vector<Event>& reported) {
  const bool concernsUs = std::any_of(reported.begin(), reported.end(), [this](const Event& event) {
    return !substitutes.contains(event.first) || (event.second & IN_ISDIR) != 0;
  });
  if (!concernsUs) {
    return;
  }
  last = platform::Environment::current()->clock->elapsed();
  if (!first) {
    first = last;
    look();
  }
}

void FolderWatcher::Implementation::look() {
  const platform::Clock::Instant now = platform::Environment::current()->clock->elapsed();
  const platform::Seconds left = std::min(calm - (now - last), longest - (now - *first));
  if (left > platform::Seconds(0)) {
    platform::RunLoop::main()->performAfterDelay(left, [weak = weak_from_this()] {
      if (const auto self = weak.lock()) {
        self->look();
      }
    });
    return;
  }
  first.reset();
  if (changed) {
    changed();
  }
}

void FolderWatcher::watch(const std::vector<std::string>& folders,
                          const std::vector<std::string>& trees) {
  std::set<std::string> paths;
  std::set<std::string> above;
  const auto add = [&](const std::string& folder) {
    const std::string there = nearestFolder(folder);
    (there == folder ? paths : above).insert(there);
  };
  for (const std::string& folder : folders) {
    add(folder);
  }
  for (const std::string& tree : trees) {
    add(tree);
    addTree(tree, paths);
  }
  auto& watches = _implementation->watches;
  bool isComplete = paths.size() <= maximumFolderCount;
  // One watch may have several names, through links; it is given back with the last of them.
  std::set<int> kept;
  std::map<std::string, int> wanted;
  _implementation->substitutes.clear();
  const auto addWatch = [&](const std::string& path, uint32_t mask) {
    const int watch = ::inotify_add_watch(_implementation->notifications, path.c_str(), mask);
    if (watch >= 0) {
      wanted[path] = watch;
      kept.insert(watch);
    }
    isComplete = isComplete && (watch >= 0 || errno != ENOSPC);
    return watch;
  };
  for (const std::string& path : paths) {
    addWatch(path, events);
  }
  for (const std::string& path : above) {
    if (!paths.contains(path)) {
      if (const int watch = addWatch(path, arrivals); watch >= 0) {
        _implementation->substitutes.insert(watch);
      }
    }
  }
  for (const auto& former : watches) {
    if (!kept.contains(former.second)) {
      ::inotify_rm_watch(_implementation->notifications, former.second);
    }
  }
  watches = std::move(wanted);
  if (!isComplete) {
    ZEBLog(2, "Not all folders of help can be watched; changes in some are found later");
  }
}

size_t FolderWatcher::count() const { return _implementation->watches.size(); }

}  // namespace zebd
