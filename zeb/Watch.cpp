#include "zeb/Watch.h"

#include <fmt/format.h>

#include <map>
#include <memory>
#include <nlohmann/json.hpp>
#include <ostream>
#include <set>
#include <vector>

#include "platform/Environment.h"
#include "platform/Strings.h"
#include "zeb/DaemonClient.h"
#include "zeb/HelpSearch.h"
#include "zebd/Host.h"

namespace zeb {

namespace {

using zebd::Host;

/// Indexes come in groups.
constexpr platform::Seconds calm{0.5};
/// A daemon that nobody asks for anything leaves, and then there is nobody to tell of changes.
constexpr platform::Seconds reminder{20};

enum class Change { found, gone };

void tell(Change change, const FoundPage& page, bool json, Console& console) {
  console.clearProgress();
  if (json) {
    nlohmann::ordered_json object;
    const auto text = [](const std::string& bytes) {
      return platform::stringByRepairingUTF8(bytes);
    };
    object["change"] = change == Change::found ? "found" : "gone";
    object["title"] = text(page.title);
    object["book"] = text(page.bookID);
    object["bookTitle"] = text(page.bookTitle);
    if (page.abstract) {
      object["abstract"] = text(*page.abstract);
    }
    object["url"] = text(page.url);
    object["relevance"] = page.relevance;
    console.out() << object.dump() << '\n';
  } else {
    console.out() << (change == Change::found ? "+ " : "- ")
                  << console.styled(Style::title, singleLine(page.title)) << "  "
                  << console.styled(Style::book, singleLine(page.bookTitle)) << "  "
                  << console.styled(Style::url, singleLine(page.url)) << '\n';
  }
}

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
          tell(Change::found, page, _command.json, _console);
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
      tell(Change::gone, told->second, _command.json, _console);
      told = _told.erase(told);
    }
    return true;
  }

  bool hasFoundAny() const { return !_told.empty(); }

 private:
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
