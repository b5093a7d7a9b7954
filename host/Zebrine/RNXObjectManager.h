// The remote content service, as far as this machine is concerned.
#pragma once

#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/Clock.h"
#include "platform/Data.h"
#include "platform/Error.h"
#include "platform/ThreadSafety.h"
#include "platform/URL.h"
#include "platform/URLResponse.h"

class RNXBook;
class ZEBAuthChallengeHandler;
class ZEBHelpBook;
struct RNXCatalogue;

/// Domain of errors of the service.
inline constexpr const char* RNXErrorDomain = "RNXErrorDomain";
enum RNXErrorCode : long {
  /// Nobody has said where the book's catalogue is.
  RNXErrorNoCatalogue = 1,
  /// The catalogue does not have the book.
  RNXErrorNoSuchBook = 2,
  /// The server answered, but not with a catalogue.
  RNXErrorBadAnswer = 3,
};

/// Finds books in their publishers' catalogues (docs/formats/remote-book.md). A catalogue is asked
/// for at most once a minute, conditionally, and by one transfer at a time, whoever waits for it.
/// Thread-safety: internally synchronised. No lock is held over a completion.
class RNXObjectManager : public std::enable_shared_from_this<RNXObjectManager> {
 public:
  using CompletionHandler = std::function<void(const std::shared_ptr<RNXBook>& book,
                                               const std::optional<platform::Error>& error)>;
  using CatalogueHandler = std::function<void(const std::shared_ptr<const RNXCatalogue>& catalogue,
                                              const std::optional<platform::Error>& error)>;

  static std::shared_ptr<RNXObjectManager> sharedObjectManager();
  /// Puts another in its place, for tests; null restores the one of the process.
  static void setSharedObjectManager(std::shared_ptr<RNXObjectManager> manager);

  static std::shared_ptr<RNXObjectManager> init();
  virtual ~RNXObjectManager();
  RNXObjectManager(const RNXObjectManager&) = delete;
  RNXObjectManager& operator=(const RNXObjectManager&) = delete;

  /// Asks the book's catalogue for the book, in the language that suits its reader best. The
  /// completion gets a book or an error, once, on some thread, possibly before this returns.
  ///
  /// A book that was found has learnt where its pages are and which localization it is in; but one
  /// whose index is here in another localization only stays in that until the new index has come
  /// (takeLocalization()). Nothing but the files that the catalogue names is taken from their URLs
  /// from then on.
  virtual void _requestBookWithHelpBook(const std::shared_ptr<ZEBHelpBook>& helpBook,
                                        CompletionHandler completionHandler);

  /// The catalogue at a URL: as it was asked for less than a minute ago, else from the server.
  void loadCatalogue(const platform::URL& url, const CatalogueHandler& handler);

  /// Has a type-4 book be in the language that suits its reader best of those that its catalogue is
  /// known to have, unless the book's index is on this machine in its present language only. With
  /// the language go the address of its pages and its exact-match list. Asks no server; for hosts,
  /// before the plug-in sees the book and whenever its files have changed. Other books stay as they
  /// are, and so does a book of which no catalogue is known.
  void takeLocalization(const std::shared_ptr<ZEBHelpBook>& helpBook);

  /// What is known of the catalogue without asking anybody: from this process or, in the URL cache,
  /// from an earlier one. Null when that is nothing.
  std::shared_ptr<const RNXCatalogue> knownCatalogue(const platform::URL& url);

 protected:
  RNXObjectManager();

 private:
  struct Entry {
    std::shared_ptr<const RNXCatalogue> catalogue;
    /// When its server gave it; absent for one that an earlier process was given.
    std::optional<platform::Clock::Instant> loaded;
    bool isLoading = false;
    std::vector<CatalogueHandler> waiting;
  };

  void _ask(const platform::URL& url);
  void _catalogueDidLoad(const platform::URL& url, const std::optional<platform::Data>& data,
                         const std::shared_ptr<const platform::URLResponse>& response,
                         std::optional<platform::Error> error);

  const std::shared_ptr<ZEBAuthChallengeHandler> _authHandler;
  platform::Mutex _mutex;
  std::map<std::string, Entry> _entries GUARDED_BY(_mutex);
};
