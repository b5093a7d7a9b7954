#include "zeb/Watch.h"

#include <map>
#include <memory>
#include <ostream>
#include <set>

#include "platform/Environment.h"
#include "zeb/DaemonClient.h"
#include "zeb/HelpSearch.h"
#include "zeb/Output.h"
#include "zebd/Host.h"

namespace zeb {

namespace {

using zebd::Host;

/// Indexes come in groups.
constexpr platform::Seconds calm{0.5};
/// A daemon that nobody asks for anything leaves, and then there is nobody to tell of changes.
constexpr platform::Seconds reminder{20};

/// What has been told.
class Watch {
 public:
  Watch(HelpSearch& search, const WatchCommand& command, Console& console)
      : _search(search), _command(command), _console(console) {}

  /// Searches once; false when the search broke off.
  bool lookOnce(const std::string& words) {
    std::set<std::string> found;
    const std::shared_ptr<LiveSearch> search = _search.beginSearch(words, _command.books);
    const auto take = [&] {
      for (const FoundPage& page : search->answer(SIZE_MAX).pages) {
        found.insert(page.url);
        if (_told.emplace(page.url, page).second) {
          _tell(PageChange::found, page);
          _console.out() << std::flush;
        }
      }
    };
    while (!search->ended()) {
      Host::runMainLoopUntil([&] { return search->ended(); }, platform::Seconds(0.05));
      take();
    }
    take();
    if (!search->finished()) {
      return false;
    }
    for (auto told = _told.begin(); told != _told.end();) {
      if (found.contains(told->first)) {
        ++told;
        continue;
      }
      _tell(PageChange::gone, told->second);
      told = _told.erase(told);
    }
    return true;
  }

  bool hasFoundAny() const { return !_told.empty(); }

 private:
  void _tell(PageChange change, const FoundPage& page) {
    _console.clearProgress();
    if (_command.json) {
      printPageChangeAsJSON(change, page, _console);
    } else {
      printPageChange(change, page, _console);
    }
  }

  HelpSearch& _search;
  const WatchCommand& _command;
  Console& _console;
  std::map<std::string, FoundPage> _told;
};

platform::Clock::Instant elapsedNow() { return platform::Environment::current()->clock->elapsed(); }

/// Waits until something has changed and has been calm since then, or it is enough.
void waitForChange(const HelpSearch& search, uint64_t seen, const std::function<bool()>& isEnough) {
  platform::Clock::Instant nextReminder = elapsedNow() + reminder;
  std::optional<platform::Clock::Instant> last;
  Host::runMainLoopUntil(
      [&] {
        const platform::Clock::Instant now = elapsedNow();
        if (search.daemon() != nullptr && now >= nextReminder) {
          (void)search.daemon()->isBusy();
          nextReminder = now + reminder;
        }
        if (const uint64_t count = search.changeCount(); count != seen) {
          seen = count;
          last = now;
        }
        return isEnough() || (last && now - *last >= calm);
      },
      platform::Seconds::max());
}

}  // namespace

std::optional<bool> watch(HelpSearch& search, const WatchCommand& command, const std::string& words,
                          Console& console, const std::function<bool()>& isEnough) {
  Watch watched(search, command, console);
  int failures = 0;
  while (true) {
    const uint64_t seen = search.changeCount();
    failures = watched.lookOnce(words) ? 0 : failures + 1;
    if (failures == 2 || (failures > 0 && command.once)) {
      return std::nullopt;
    }
    if (!console.flush() || command.once || isEnough()) {
      return watched.hasFoundAny();
    }
    if (failures == 0) {
      waitForChange(search, seen, isEnough);
    }
    if (isEnough()) {
      return watched.hasFoundAny();
    }
  }
}

}  // namespace zeb
