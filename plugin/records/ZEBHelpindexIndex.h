// The record of a help index: everything that a help-index file carries.
#pragma once

#include <memory>
#include <optional>
#include <string>

#include "SearchKit/SearchKit.h"
#include "platform/Data.h"
#include "platform/KeyedArchive.h"
#include "platform/ThreadSafety.h"
#include "platform/Value.h"
#include "plugin/records/ZEBIndex.h"

class HelpLUXIndex;

/// Keys of the record's archived form; each is its own name.
inline constexpr const char* SKIIndexPathKey = "SKIIndexPathKey";
inline constexpr const char* SKIBookIDKey = "SKIBookIDKey";

/// An index record with a help-index file behind it: keyword index, anchors, semantic index data
/// and remote settings. The file is a classic archive of one dictionary
/// (docs/formats/help-index.md); it is mapped once, and what the record holds are slices of that
/// mapping.
///
/// The record keeps no keyword index open: each search opens one of its own with copyIndexRef() and
/// gives it back with disposeIndexRef(). The semantic index is made when first asked for.
///
/// Archived, a record is only its path and its book's identifier; reviving it reads the file again.
///
/// Thread-safety: internally synchronised. A recursive lock of the record's own guards its data and
/// is held while semantic data is read; under it only the locks of single properties and of the log
/// are taken.
class ZEBHelpindexIndex : public ZEBIndex, public platform::KeyedCodable {
 public:
  /// Name of the class in keyed archives.
  static constexpr const char* archivedClassName = "ZEBHelpindexIndex";

  /// Null when the file cannot be read whole or is no help-index file.
  static std::shared_ptr<ZEBHelpindexIndex> initWithPath(const std::optional<std::string>& path);

  /// Always null: a record of this class needs a file, and there is none.
  static std::shared_ptr<ZEBHelpindexIndex> init();

  // A record made from the content of a file instead of a file. As the plain initialiser comes
  // first and fails, so do these.
  static std::shared_ptr<ZEBHelpindexIndex> indexWithDictionary(const platform::Value& dictionary);
  static std::shared_ptr<ZEBHelpindexIndex> initWithDictionary(const platform::Value& dictionary);

  /// Revives an archived record from its file; loadedFromGeneratedCache() is then true. Null
  /// without a path, and when there is no readable help-index file at it any more.
  static std::shared_ptr<ZEBHelpindexIndex> initWithCoder(platform::KeyedUnarchiver& coder);

  static bool supportsSecureCoding() noexcept { return true; }

  /// Lets keyed archives be read that hold such records. To be called before the first is; calling
  /// it again does no harm.
  static void registerArchiveClass();

  ~ZEBHelpindexIndex() override;

  /// Writes the path and the book's identifier, each if there is one.
  void encodeWithCoder(platform::KeyedArchiver& coder) const override;
  std::string archiveClassName() const override { return archivedClassName; }

  /// Replaces everything by the content of another help-index file, and notes that no download is
  /// under way any more and that the data is the book's own, even on failure. Data that is no
  /// archive leaves the contents as they were; an archive of something else than a dictionary
  /// leaves the record empty. Failures are logged.
  bool reinitializeWithData(const platform::Data& data) override;

  /// Opens the keyword index anew. Null when the data is no index, or one whose checksums were
  /// wrong when the record took it in, which is when they are looked at; isSearchable() then stays
  /// as it is, otherwise it now tells whether the index has terms. A record without keyword data
  /// gives what the last call gave, as long as somebody still holds that.
  SKIndexRef copyIndexRef();

  /// Gives back what copyIndexRef() gave; the reference is null afterwards.
  void disposeIndexRef(SKIndexRef& indexRef) const;

  /// Whether each page of the opened index has an abstract and a path that leads to a URL of its
  /// own: absolute, not ending in a slash, without NUL and '%'. Records for such pages can be made
  /// without a look at them. Found out once for the record's data.
  bool hasPlainPages(const SKIndexRef& indexRef);

  /// The semantic index, made from its data at the first call that succeeds; the data is then let
  /// go. Null without data, or with data that makes none.
  std::shared_ptr<HelpLUXIndex> luxIndex();

  /// The semantic index as bytes: as read from the file until luxIndex() has succeeded, the
  /// index's own form from then on. Does not make the index.
  std::optional<platform::Data> luxIndexData() const;

  /// Whether the book takes part in search by meaning. Data of some size says yes by itself; a
  /// small index is made and asked.
  bool shouldUseLUXIndex();

  /// Anchor names, each with an array of document paths; absent when there are none. What stands
  /// under the names comes from the file as it is: check its kinds. Takes no lock of the record.
  platform::Value anchorDictionary() const { return _anchorDictionary.get(); }

  std::string description() const override;

 protected:
  ZEBHelpindexIndex() = default;

  bool _initWithPath(const std::optional<std::string>& path) override;

 private:
  /// Semantic data longer than this is used without being looked at.
  static constexpr size_t luxDataLengthWorthUsing = 10000;

  bool _initWithDictionary(const platform::Value& dictionary);
  bool _initWithCoder(platform::KeyedUnarchiver& coder);
  bool _populateWithData(const platform::Data& data) EXCLUDES(_monitor);
  bool _populateWithDictionary(const platform::Value& dictionary) EXCLUDES(_monitor);
  void _disposeRetainedData() REQUIRES(_monitor);

  mutable platform::Monitor _monitor;
  std::optional<platform::Data> _indexData GUARDED_BY(_monitor);
  /// Its checksums are wrong: it is not opened.
  bool _isIndexDamaged GUARDED_BY(_monitor) = false;
  /// Of _indexData; absent until asked for.
  std::optional<bool> _hasPlainPages GUARDED_BY(_monitor);
  /// Not owned: those who were handed it are its owners.
  std::weak_ptr<const SKIndex> _indexRef GUARDED_BY(_monitor);
  std::optional<platform::Data> _luxIndexData GUARDED_BY(_monitor);
  std::shared_ptr<HelpLUXIndex> _luxIndex GUARDED_BY(_monitor);
  AtomicProperty<platform::Value> _anchorDictionary;
};
