// The record of one searchable index.
#pragma once

#include <atomic>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <utility>

#include "platform/Data.h"
#include "platform/URL.h"
#include "plugin/records/AtomicProperty.h"

/// What the shelf knows of one index: where its file lies, which book owns it, where its remote
/// twin lives, and flags that registration, generation, downloads and searches read and set. It
/// holds no index data; subclasses do.
///
/// Records are shared: the shelf, running searches and downloads hold the same one at once.
/// Thread-safety: internally synchronised. The flags are independent of each other; whoever polls
/// one may see it a moment late.
class ZEBIndex {
 public:
  /// The record for an index file, of the class that reads files with that extension. Null for
  /// every other extension, without a path, and when the file cannot be read as what its extension
  /// says.
  static std::shared_ptr<ZEBIndex> indexWithPath(const std::optional<std::string>& path);

  /// A record with this path, whether or not a file is there. Never null.
  static std::shared_ptr<ZEBIndex> initWithPath(const std::optional<std::string>& path);

  /// The same with no path.
  static std::shared_ptr<ZEBIndex> init();

  virtual ~ZEBIndex() = default;
  ZEBIndex(const ZEBIndex&) = delete;
  ZEBIndex& operator=(const ZEBIndex&) = delete;

  /// Replaces the record's contents by those of a help-index file. Here there are none to replace:
  /// always throws platform::Exception "ZEBVirtualFunctionException".
  virtual bool reinitializeWithData(const platform::Data& data);

  /// Path of the index file, if the record has one.
  std::optional<std::string> path() const { return _path.get(); }

  /// Takes the path of an existing file. For anything else, folders included, returns false and
  /// the record keeps the path that it has.
  bool setPath(const std::string& path);

  /// Identifier of the book that owns the index.
  std::optional<std::string> bookID() const { return _bookID.get(); }
  void setBookID(std::optional<std::string> bookID) { _bookID.set(std::move(bookID)); }

  /// Serial number of this record within the process, from 1. A record whose initialisation
  /// failed has used one up as well.
  int32_t indexID() const noexcept { return _indexID.load(); }

  /// URL string of the remote folder with the index's files; absent for local indexes.
  std::optional<std::string> remoteRoot() const { return _remoteRoot.get(); }
  void setRemoteRoot(std::optional<std::string> root) { _remoteRoot.set(std::move(root)); }

  /// URL of the index file in the remote folder, absent as long as there is no such folder or the
  /// two do not make a URL. Once there is one it stays, however path and folder change later.
  std::optional<platform::URL> remoteURL() const;

  /// The documents should be opened from the network rather than from the disk.
  bool networkFilesPreferred() const noexcept { return _networkFilesPreferred.load(); }
  /// There is keyword data with a term in it, as far as is known yet.
  bool isSearchable() const noexcept { return _isSearchable.load(); }
  /// There are anchors.
  bool hasAnchors() const noexcept { return _hasAnchors.load(); }
  /// reinitializeWithData() has succeeded.
  bool isReinitialized() const noexcept { return _isReinitialized.load(); }

  /// New data is being downloaded.
  bool isDownloading() const noexcept { return _isDownloading.load(); }
  void setIsDownloading(bool isDownloading) noexcept { _isDownloading.store(isDownloading); }

  /// The index is being made again on this machine.
  bool isRebuilding() const noexcept { return _isRebuilding.load(); }
  void setIsRebuilding(bool isRebuilding) noexcept { _isRebuilding.store(isRebuilding); }

  /// The record comes from the known-indices cache or from a generated index, not from the file
  /// that the book brought: its documents lie beside the book's access page, not beside the file.
  bool loadedFromGeneratedCache() const noexcept { return _loadedFromGeneratedCache.load(); }
  void setLoadedFromGeneratedCache(bool loaded) noexcept {
    _loadedFromGeneratedCache.store(loaded);
  }

  /// One line for logs.
  virtual std::string description() const;

 protected:
  ZEBIndex() = default;

  /// Gives the record its number and its path. Subclasses load their data here; false means that
  /// there will be no record.
  virtual bool _initWithPath(const std::optional<std::string>& path);

  /// The plain initialiser: no path, whatever the class makes of that.
  bool _init();

  void _setUpVariables() noexcept;

  std::atomic<bool> _networkFilesPreferred{false};
  std::atomic<bool> _isSearchable{false};
  std::atomic<bool> _hasAnchors{false};
  std::atomic<bool> _isReinitialized{false};

 private:
  AtomicProperty<std::optional<std::string>> _path;
  AtomicProperty<std::optional<std::string>> _bookID;
  AtomicProperty<std::optional<std::string>> _remoteRoot;
  /// Threads that fill it at the same time fill in the same.
  mutable AtomicProperty<std::optional<platform::URL>> _remoteURL;
  std::atomic<int32_t> _indexID{0};
  std::atomic<bool> _isDownloading{false};
  std::atomic<bool> _isRebuilding{false};
  std::atomic<bool> _loadedFromGeneratedCache{false};
};
