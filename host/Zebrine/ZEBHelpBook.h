// A help book: where its pages, indexes and lists are, and whose it is.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/ThreadSafety.h"
#include "platform/URL.h"
#include "platform/Value.h"

class RNXBook;

/// One help book that the host knows, read from a book folder (docs/formats/help-book.md) or put
/// together by the host.
///
/// What a book is (identifier, kind, folder) never changes; everything else may, while searches
/// read it. Getters therefore return copies, except bookID().
/// Thread-safety: internally synchronised.
class ZEBHelpBook {
 public:
  /// The book in the folder `path`, in the language of the folder's that suits
  /// platform::Environment::preferredLanguages best. Null when there is no readable information
  /// list, or one that does not describe a book; nothing is logged.
  static std::shared_ptr<ZEBHelpBook> initWithPath(const std::string& path);

  /// A book without an information list: the host sets the rest. Null when isValidBookID() refuses
  /// the identifier or `type` is none of ZEBHelpBookType….
  static std::shared_ptr<ZEBHelpBook> bookWithID(std::string bookID, int32_t type,
                                                 std::string path);

  ~ZEBHelpBook();
  ZEBHelpBook(const ZEBHelpBook&) = delete;
  ZEBHelpBook& operator=(const ZEBHelpBook&) = delete;

  /// Whether a string may be a book's identifier. Identifiers name folders, so an empty one, one
  /// with a slash or a NUL, "." and ".." are refused, as are ill-formed UTF-8 and more than 200
  /// bytes.
  static bool isValidBookID(std::string_view bookID);

  /// An identifier may end in a version: "org.example.editor.help*2.1". This is the part before the
  /// first '*'; an identifier without one, or with nothing before it, comes back as it is.
  static std::string unversionedbookIDFromBookID(std::string_view bookID);

  /// Where the server has a page of a type-4 book: the book's remoteURL (without query and
  /// fragment), one slash, and the document's path within the book, percent-escaped. Of several
  /// living books of one identifier the one made last that has a remoteURL answers. Absent when
  /// there is none, and for a path that is empty, holds a NUL or has ".." for a component, escaped
  /// or not: such a page would not be the book's.
  static std::optional<platform::URL> _urlForType4HelpBookResult(std::string_view path,
                                                                 std::string_view bookID);

  /// The identifier. Always the same string object for one book, as long as the book lives: its
  /// address is its identity.
  const std::string& bookID() const noexcept { return _bookID; }
  /// One of ZEBHelpBookType….
  int32_t type() const noexcept { return _type; }
  /// The book's folder.
  const std::string& path() const noexcept { return _path; }

  /// What the user is shown; the identifier when the book has no title.
  std::string title() const;
  void setTitle(std::string title);

  /// The language in use, as its folder is named (without ".lproj"); empty when the book has none.
  std::string localization() const;
  /// The localization names files, so one that is not empty has to pass the test of identifiers;
  /// returns false, changing nothing, where it does not.
  bool setLocalization(std::string localization);

  /// The book's own help-index files.
  std::vector<std::string> indexPaths() const;
  void setIndexPaths(std::vector<std::string> indexPaths);

  /// The page that opens the book. Pages of a generated index are relative to its folder.
  std::optional<std::string> accessPagePath() const;
  void setAccessPagePath(std::optional<std::string> accessPagePath);

  /// The folder of the book's resources, above its language folders: the resource folder of a
  /// bundle (types 2 and 3; absent when the bundle has none), the book's folder for other types.
  std::optional<std::string> resourcesRootPath() const;
  void setResourcesRootPath(std::optional<std::string> resourcesRootPath);

  /// A property list: normalised query to anchor.
  std::optional<std::string> exactMatchPath() const;
  void setExactMatchPath(std::optional<std::string> exactMatchPath);

  /// A property list: suggestion key to texts.
  std::optional<std::string> suggestionsPath() const;
  void setSuggestionsPath(std::optional<std::string> suggestionsPath);

  /// The folder of the book's pages on a server.
  std::optional<platform::URL> remoteURL() const;
  void setRemoteURL(std::optional<platform::URL> remoteURL);

  /// Where the publisher's catalogue is (docs/formats/remote-book.md) that has the book, or newer
  /// versions of it.
  std::optional<platform::URL> catalogueURL() const;
  void setCatalogueURL(std::optional<platform::URL> catalogueURL);

  /// In which languages the reader wants the remote book, the favourite first; empty for those of
  /// platform::Environment::preferredLanguages.
  std::vector<std::string> preferredLanguages() const;
  void setPreferredLanguages(std::vector<std::string> languages);

  /// Whether another program shows the book's pages, from remoteURL.
  bool usesExternalViewer() const;
  void setUsesExternalViewer(bool usesExternalViewer);

  /// The application that the book belongs to.
  std::optional<std::string> appBundleID() const;
  void setAppBundleID(std::optional<std::string> appBundleID);
  std::optional<std::string> appBundleVersion() const;
  void setAppBundleVersion(std::optional<std::string> appBundleVersion);

  /// What the server last said of a remote book: a dictionary by ZEBBook…Key, or absent.
  platform::Value remoteBookInfo() const;
  void setRemoteBookInfo(platform::Value remoteBookInfo);

  /// The server's own copies of index and exact-match list.
  std::optional<platform::URL> remoteSearchIndex() const;
  void setRemoteSearchIndex(std::optional<platform::URL> remoteSearchIndex);
  std::optional<platform::URL> remoteExactMatch() const;
  void setRemoteExactMatch(std::optional<platform::URL> remoteExactMatch);

  /// Attributes of a remote book that have no place of their own: a dictionary, or absent.
  platform::Value miscAttributes() const;
  void setMiscAttributes(platform::Value miscAttributes);

  /// The book as the remote content service has it; null for books that it does not have.
  std::shared_ptr<RNXBook> rnxBook() const;
  void setRnxBook(std::shared_ptr<RNXBook> rnxBook);

  /// For logs.
  std::string description() const;

 private:
  struct Properties;
  ZEBHelpBook(std::string bookID, int32_t type, std::string path);
  // The process-wide registry of living type-4 books: weak, internally synchronised.
  static void _rememberType4Book(const std::shared_ptr<ZEBHelpBook>& book);
  static void _forgetDeadType4Books(const std::string& bookID);
  template <typename Member>
  Member _get(Member Properties::*member) const;
  template <typename Member>
  void _set(Member Properties::*member, Member value);

  const std::string _bookID;
  const int32_t _type;
  const std::string _path;
  mutable platform::Mutex _mutex;
  const std::unique_ptr<Properties> _properties PT_GUARDED_BY(_mutex);
};
