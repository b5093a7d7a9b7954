// Names that the host, its plug-ins and the programs around them agree on.
#pragma once

#include <cstdint>
#include <string>

// Result kinds.
/// A help page.
inline const std::string ZEBHelpArticleResult = "ZEBHelpArticleResult";
/// A completion of what the user is typing.
inline const std::string ZEBHelpSuggestionResult = "ZEBHelpSuggestionResult";
/// A related search that the user may try.
inline const std::string ZEBHelpSimilarSuggestionResult = "ZEBHelpSimilarSuggestionResult";
/// An action page; asked for in place of articles.
inline const std::string ZEBHelpActionResult = "ZEBHelpActionResult";

// Keys of a result's payload.
/// String: absolute URL of the page, a file URL or that of a server.
inline const std::string ZEBResultURLKey = "ZEBResultURL";
/// String: the book's identifier.
inline const std::string ZEBResultBookIDKey = "ZEBResultBookID";
/// String: what the page is about.
inline const std::string ZEBResultAbstractKey = "ZEBResultAbstract";
/// Integer: the serial number of the index record that the hit came from.
inline const std::string ZEBResultIndexIDKey = "ZEBResultIndexID";
/// Boolean, always true when present: the query is one that the book lists for this page.
inline const std::string ZEBResultIsExactMatchKey = "ZEBResultIsExactMatch";
/// Boolean: the book's pages are shown by another program.
inline const std::string ZEBResultUsesExternalViewerKey = "ZEBResultUsesExternalViewer";
/// String: version of the application that owns the book.
inline const std::string ZEBResultAppVersionKey = "ZEBResultAppVersion";
/// Boolean, true when present: another book of the same application has a page of this title.
inline const std::string ZEBResultIsDuplicateAppKey = "ZEBResultIsDuplicateApp";

// Keys of a query's options; the values are booleans, a missing one is false.
/// The query string is the name of an anchor, not text to search for.
inline const std::string ZEBQueryAnchorSearchOptionKey = "ZEBQueryAnchorSearch";
/// Search every known book even when the query has a scope.
inline const std::string ZEBQuerySearchAllBooksOptionKey = "ZEBQuerySearchAllBooks";
/// Let the daemon exit soon after this search.
inline const std::string ZEBQuerySkipShutdownDelayOptionKey = "ZEBSkipShutdownDelay";

// Kinds of help book (ZEBHelpBook::type).
/// A folder of pages.
inline constexpr int32_t ZEBHelpBookType1 = 1;
/// A bundle: its pages are in its resource folder, one folder a language.
inline constexpr int32_t ZEBHelpBookType2 = 2;
/// A bundle whose index may be replaced by a newer one from a server.
inline constexpr int32_t ZEBHelpBookType3 = 3;
/// A remote book: index and pages are on a server.
inline constexpr int32_t ZEBHelpBookType4 = 4;

// Keys of the information that a server gives about a remote book (ZEBHelpBook::remoteBookInfo).
/// URL: the search index.
inline const std::string ZEBBookIndexRemoteURLKey = "ZEBBookIndexRemoteURL";
/// URL: the exact-match list.
inline const std::string ZEBBookEMRemoteURLKey = "ZEBBookEMRemoteURL";
/// String: the language of the remote book.
inline const std::string ZEBBookLocalizationKey = "ZEBBookLocalization";

// Keys in the information property list of an application that carries help books.
/// String or array of strings: the books' identifiers.
inline const std::string ZEBCFBundleHelpBookID = "ZEBHelpBookIdentifiers";
/// String or array of strings: the books' folders among the application's resources, in the same
/// order.
inline const std::string ZEBCFBundleHelpBookFolder = "ZEBHelpBookFolders";

// Books with a part to play.
/// The system's own manual.
inline const std::string KROrvHelpbookID = "org.zeb.manual";
/// The book that is there without a network.
inline const std::string KROfflineHelpbookID = "org.zeb.offline";
/// In that book, the anchor of the topic that says that the computer is not connected.
inline const std::string KROfflineHelpTopicNotConnected = "not-connected";

// Programs.
/// The help daemon; also names its folder among the user's caches.
inline const std::string ZEBDaemonBundleID = "org.zeb.zebd";
/// The program in which users read help books.
inline const std::string ZEBKestrelBundleID = "org.zeb.kestrel";

// Files and folders.
/// Among the user's help caches, the plug-in's memory of which index is whose; it may be deleted.
inline const std::string ZEBKnownIndicesFileName = "HelpindexCache.plist";
/// Extension of help-index files, without the dot.
inline const std::string ZEBHelpindexExtension = "helpindex";
/// Extension of exact-match lists that were downloaded, without the first dot.
inline const std::string ZEBExactMatchListExtension = "exactmatch.plist";
/// Folder of generated indexes within the daemon's caches folder.
inline const std::string ZEBGeneratedIndexDirectory = "GeneratedIndexes";

// Notifications.
/// Broadcast when the registration of a book changed; the object is the book's identifier.
inline const std::string QWBookRegistrationNotification = "org.zeb.book-registration";

// Events that the host tells its plug-ins of (ZEBPlugin::notifyEvent).
/// The user's language changed.
inline constexpr int64_t ZEBPluginEventLanguageChanged = 1;
