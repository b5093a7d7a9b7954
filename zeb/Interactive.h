// Searching while one types.
#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "zeb/HelpSearch.h"
#include "zeb/Terminal.h"

namespace zeb {

/// What the screen shows, and what keys do to it. It knows neither terminal nor search, so that
/// both can be whatever they like. Thread-safety: confined to one thread.
class SearchPrompt {
 public:
  enum class Outcome {
    /// Nothing that anybody else must know.
    stays,
    /// The text is another: search for it.
    textChanged,
    /// The page under selectedPage() is to be opened.
    opensPage,
    leaves,
  };

  Outcome press(const Key& key);
  const std::string& text() const { return _text; }
  void show(LiveAnswer answer);
  /// Null when no page is selected.
  const FoundPage* selectedPage() const;

  /// The lines from the prompt down, each fitting into `columns`, no more than `rows`. The selected
  /// one begins with "> ".
  std::vector<std::string> lines(size_t columns, size_t rows) const;

 private:
  size_t _itemCount() const { return _answer.completions.size() + _answer.pages.size(); }
  Outcome _choose();

  std::string _text;
  LiveAnswer _answer;
  /// Completions, then pages; absent for the text itself.
  std::optional<size_t> _selected;
};

/// Runs the prompt on a terminal until the user leaves. `openPage` gets the URL of each page that
/// is to be opened. Runs the main loop; to be called on the main thread.
void searchInteractively(HelpSearch& search, const std::vector<std::string>& bookIDs,
                         Terminal& terminal,
                         const std::function<void(const std::string&)>& openPage);

/// The address under which a viewer shows a result: that of a page in a DocBook document names the
/// place behind a '#', which in the result's URL is escaped like any other in a path.
std::string addressForViewer(std::string url);

}  // namespace zeb
