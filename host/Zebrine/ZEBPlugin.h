// What the host asks of a search plug-in.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "platform/Value.h"

class ZEBPluginOwner;
class ZEBQuery;

/// A search plug-in as the host sees it: the principal class of a plug-in bundle derives from it.
/// Instances come from the plug-in's own `initWithOwner(owner)`.
///
/// Members that a plug-in may leave out have a body here; that body is what the host takes for
/// granted of a plug-in without them.
/// Thread-safety: internally synchronised; the host calls from any of its threads.
class ZEBPlugin {
 public:
  virtual ~ZEBPlugin() = default;

  /// Runs one search from start to end on the calling thread; everything found goes to the owner.
  /// The query may be null: a search that finds nothing.
  virtual void startSearchForQuery(const std::shared_ptr<ZEBQuery>& query) = 0;

  /// The host is done with the results of the query.
  virtual void completeSearchForQuery(const std::shared_ptr<ZEBQuery>& query) = 0;

  virtual std::shared_ptr<ZEBPluginOwner> owner() const = 0;

  /// The identifier of the bundle that holds the plug-in's code.
  virtual std::string pluginID() const = 0;

  /// The kinds of result that the plug-in makes.
  virtual std::vector<std::string> resultTypes() const = 0;

  /// Prepares whatever the plug-in keeps on disk. Nothing, without an implementation.
  virtual void buildCache() {}

  /// The host has read the book and will answer for it. Nothing, without an implementation.
  virtual void finishPopulatingBookWithID(const std::string& /*bookID*/) {}

  /// The host has read all the books that it knows. Nothing, without an implementation.
  virtual void finishPopulatingKnownBooks() {}

  /// The host no longer has the book. Nothing, without an implementation.
  virtual void removeIndexForBookWithID(const std::string& /*bookID*/) {}

  /// Something happened; see ZEBPluginEvent… for the codes. Nothing, without an implementation.
  virtual void notifyEvent(int64_t /*event*/, const platform::Value& /*context*/) {}

  /// Whether queries with ZEBQueryAnchorSearchOptionKey may be sent to this plug-in. They may,
  /// without an implementation.
  virtual bool supportsAnchorLookup() const { return true; }
};
