// Searches, anchor look-ups and indexing over the books of the catalogue.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Clock.h"
#include "platform/Error.h"
#include "zebd/Catalogue.h"
#include "zebd/Installation.h"

namespace zeb {

using zebd::CatalogueEntry;
using zebd::Installation;

class DaemonClient;
class RunningSearch;

/// A page that was found, ready to be shown.
struct FoundPage {
  /// The file's name where the page has no title.
  std::string title;
  std::string bookID;
  std::string bookTitle;
  std::optional<std::string> abstract;
  std::string url;
  /// Orders the pages of one answer, higher first.
  double relevance = 0;
};

/// Something to search for.
struct Suggestion {
  std::string text;
  /// Orders the suggestions of one answer, higher first; 0 for those of a book's own list, which
  /// come first, in the order of the alphabet.
  double relevance = 0;
};

struct Answer {
  /// Best first, no more than were asked for.
  std::vector<FoundPage> pages;
  /// How many there were before that limit.
  size_t count = 0;
};

/// What is shown while somebody types.
struct LiveAnswer {
  std::vector<Suggestion> completions;
  /// Best first.
  std::vector<FoundPage> pages;
};

/// A search that is under way. Thread-safety: internally synchronised.
class LiveSearch {
 public:
  virtual ~LiveSearch() = default;
  /// The answer is no longer wanted.
  virtual void cancel() = 0;
  virtual bool ended() const = 0;
  /// Whether all that was found is there; false while it runs, and for one that broke off.
  virtual bool finished() const = 0;
  /// What was found up to now, at most so many pages and completions.
  virtual LiveAnswer answer(size_t limit) const = 0;
};

/// The one place in which the command line meets the search: the help daemon, or a host in this
/// process, with the plug-in. Its functions run the main loop while they wait, so all of them
/// belong to the main thread. Lists of identifiers that are empty stand for all books.
class HelpSearch {
 public:
  /// A host in this process. Null, with `error` set, when the plug-in cannot be loaded. Entries
  /// whose books are gone are left out.
  static std::unique_ptr<HelpSearch> start(const std::vector<CatalogueEntry>& entries,
                                           const Installation& installation,
                                           platform::Error& error);
  /// A client of the daemon, which looks after the books and their indexes by itself: of the
  /// functions below, removeIndexes() is not for it.
  static std::unique_ptr<HelpSearch> withDaemon(std::unique_ptr<DaemonClient> daemon);
  ~HelpSearch();
  HelpSearch(const HelpSearch&) = delete;
  HelpSearch& operator=(const HelpSearch&) = delete;

  /// The daemon that searches; null where this process does.
  DaemonClient* daemon() const;

  /// Grows when an index comes, changes or goes: what was found may no longer be all.
  uint64_t changeCount() const;

  /// Those of the books for which there is no index yet, by identifier. Remote books are not among
  /// them: their indexes are a server's.
  std::vector<std::string> booksWithoutIndex(const std::vector<std::string>& bookIDs) const;

  /// What became of makeIndexes().
  struct Indexing {
    /// Books that still have no index.
    std::vector<std::string> missing;
    /// Whether all work came to its end within the limit; if not, missing indexes may still come.
    bool ended = false;
  };
  /// Told of each book that has got its index, and how many have by then.
  using Progress = std::function<void(const std::string& bookID, size_t count)>;

  /// Has the indexes of the books made that have none, and waits until the plug-in is quiet or
  /// `limit` has passed.
  Indexing makeIndexes(const std::vector<std::string>& bookIDs, platform::Seconds limit,
                       const Progress& progress);

  /// Waits for indexes that the daemon, which has to be there, is already making.
  Indexing waitForIndexes(const std::vector<std::string>& bookIDs, platform::Seconds limit,
                          const Progress& progress);

  /// Has the indexes of remote books fetched, those that are there already compared with their
  /// servers', and waits until the plug-in is quiet or `limit` has passed; returns whether it is.
  bool fetchIndexes(const std::vector<std::string>& bookIDs, platform::Seconds limit);

  /// Has indexes forgotten that are no longer those of their books' pages. Returns whether the
  /// plug-in has done so for all.
  bool removeIndexes(const std::vector<std::string>& bookIDs);

  /// The pages that match the words, up to `limit`, in the order of the plug-in. Absent when the
  /// search broke off.
  std::optional<Answer> search(std::string_view words, const std::vector<std::string>& bookIDs,
                               size_t limit);

  /// The pages that carry the anchor of exactly this name. Absent when the search broke off.
  std::optional<Answer> lookUpAnchor(std::string_view name,
                                     const std::vector<std::string>& bookIDs);

  /// Pages by meaning alone, many of them: for those who look for things to do.
  std::optional<Answer> searchActions(std::string_view words,
                                      const std::vector<std::string>& bookIDs, size_t limit);

  /// What the text, half typed, may become. Absent when the search broke off.
  std::optional<std::vector<Suggestion>> suggestions(std::string_view text,
                                                     const std::vector<std::string>& bookIDs,
                                                     size_t limit);

  /// Other searches that find pages like those that the words find. Absent when the search broke
  /// off.
  std::optional<std::vector<Suggestion>> similarSearches(std::string_view words,
                                                         const std::vector<std::string>& bookIDs,
                                                         size_t limit);

  /// Begins a search for pages and returns at once. The main loop has to run on.
  std::shared_ptr<LiveSearch> beginSearch(std::string_view words,
                                          const std::vector<std::string>& bookIDs);

  /// Begins a search for completions and pages and returns at once. The main loop has to run on; it
  /// is woken at the end.
  std::shared_ptr<LiveSearch> beginLiveSearch(std::string_view text,
                                              const std::vector<std::string>& bookIDs);

  /// Lets the plug-in come to an end with what it is doing, for `limit` at most.
  void settle(platform::Seconds limit);

 private:
  struct Implementation;
  class Live;

  std::shared_ptr<RunningSearch> _registerWithDaemon(std::vector<std::string> bookIDs);

  explicit HelpSearch(std::unique_ptr<Implementation> implementation);

  const std::unique_ptr<Implementation> _implementation;
};

}  // namespace zeb
