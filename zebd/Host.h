// A running host: bookshelf, owner and plug-in.
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "platform/Clock.h"
#include "platform/DispatchQueue.h"
#include "platform/Error.h"
#include "zebd/Owner.h"

class ZEBPlugin;
class ZEBQuery;

namespace zebd {

/// Loads the plug-in and runs it in this process. Searches run on threads of the host; the main
/// loop runs on the main thread, and has to run while anything else does: the plug-in's background
/// work waits for it.
///
/// The plug-in outlives the host: what it has begun it carries on with, answering to nobody, until
/// the process ends.
/// Thread-safety: internally synchronised, where a function does not say otherwise.
class Host {
 public:
  /// On the main thread. Null, with `error` set, when the plug-in cannot be loaded. Groups of
  /// models come from the user's setting "ModelGroups" (docs/formats/group-list.md).
  static std::unique_ptr<Host> start(const std::string& pluginBundlePath, OwnerSettings settings,
                                     platform::Error& error);
  ~Host();
  Host(const Host&) = delete;
  Host& operator=(const Host&) = delete;

  Bookshelf& bookshelf() { return *_bookshelf; }
  /// For what may outlive the host.
  std::shared_ptr<const Bookshelf> sharedBookshelf() const { return _bookshelf; }
  Owner& owner() { return *_owner; }
  const std::shared_ptr<ZEBPlugin>& plugin() const { return _plugin; }

  /// Begins the search on a thread of the host, as soon as those before it have ended, and returns
  /// at once: the plug-in has one search by meaning at a time, and a second would take its models
  /// and answers. Whoever no longer wants an earlier one cancels it. The receiver hears the end
  /// whatever happens, except when the process ends before.
  void startSearch(const std::shared_ptr<ZEBQuery>& query,
                   std::shared_ptr<SearchReceiver> receiver);

  /// Has the indexes of these books found, or made, now. The plug-in registers books that are
  /// announced to it at leisure, but those that a search needs at once; so this is a search, for an
  /// anchor that no page carries. The receiver hears when all are registered; indexes that have to
  /// be made are made after that, in the background.
  void registerBooks(const std::vector<std::string>& bookIDs,
                     std::shared_ptr<SearchReceiver> receiver);

  /// Tells the plug-in that the host has read all its books. They are registered at leisure.
  void announceBooks();

  /// The user's languages (platform::Environment) are others than before: remote books are looked
  /// for in those from now on, and the plug-in forgets what it knows of all books, which are
  /// announced to it anew. A remote book that is not here in the new language stays in the former
  /// until its index has come.
  void userLanguagesDidChange();

  /// Has the plug-in forget what it knows of all books, which are announced to it anew: it looks at
  /// their indexes again, and asks servers for those of books that are from there.
  void lookAtBooksAnew();

  /// Has the book's index forgotten, and deleted where it was generated, a little later. On the
  /// main thread. The owner's handler hears when it is done.
  void removeIndexOfBook(const std::string& bookID);

  /// Runs the main loop, on the main thread, until `condition` holds or `limit` has passed; returns
  /// whether it holds. The condition is tested on the main thread, often.
  static bool runMainLoopUntil(const std::function<bool()>& condition, platform::Seconds limit);

  /// Ends the process at once, but for what must not be cut short (platform::ProcessInfo), which it
  /// gives a few seconds. Nothing is destroyed: background work may be going on.
  [[noreturn]] static void endProcess(int status);

 private:
  Host(std::shared_ptr<Bookshelf> bookshelf, std::shared_ptr<Owner> owner);

  const std::shared_ptr<Bookshelf> _bookshelf;
  const std::shared_ptr<Owner> _owner;
  const std::shared_ptr<platform::DispatchQueue> _searches;
  std::shared_ptr<ZEBPlugin> _plugin;
};

}  // namespace zebd
