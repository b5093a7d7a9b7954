// Which help folders there are on a computer.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "zebd/Languages.h"

namespace zebd {

/// A folder of help pages, and what can be said of it without reading them.
struct HelpFolder {
  std::string bookID;
  std::string folder;
  /// As its folder is named; empty where the place does not say.
  std::string language;
  /// The page that opens it, where its registration names one.
  std::string accessPage = {};
};

/// Reasons for passing a folder over that somebody can do something about.
inline constexpr const char* noPagesReason = "there are no pages in it";
inline constexpr const char* noLanguageReason = "it is in none of the user's languages";
inline constexpr const char* noNameReason = "its name cannot be a book's identifier";
inline constexpr const char* noBookReason = "its information list does not describe a book";

/// Told of each folder that was passed over, and why: one of these reasons, or another.
using PassedOver = std::function<void(const std::string& folder, const std::string& reason)>;

// Data folders are those like /usr/share; what an earlier one has counts before what is in a later
// one.

/// Help of the desktop's applications, in the languages of `fallbacks` (see languageFallbacks):
/// <data>/help/<language>/<application> and <data>/<application>/help/<language>. One folder an
/// application.
std::vector<HelpFolder> applicationHelpFolders(const std::vector<std::string>& dataFolders,
                                               const std::vector<std::string>& fallbacks,
                                               const PassedOver& passedOver);

/// Manuals as web pages: what the registry of documents names, <data>/doc-base/<document> (its
/// first format "HTML" with an index page; what is registered elsewhere than in <data>/doc is
/// passed over), and folders with an index.html: <data>/doc/<package>/html, …/manual or the
/// package's folder itself. One folder a package, and each folder once, whatever links lead to it.
/// Packages for developers (-dev), libraries for web pages (libjs-, node-) and interface
/// descriptions made by a generator are passed over: their pages drown those made for people.
std::vector<HelpFolder> manualFolders(const std::vector<std::string>& dataFolders,
                                      const PassedOver& passedOver);

/// Help books in this system's own format: <data>/zeb/books/<folder> with an information list.
std::vector<HelpFolder> bookFolders(const std::vector<std::string>& dataFolders);

/// The folders in which books of these kinds come and go, whether they are there or not: those that
/// have to be watched to learn of new ones.
std::vector<std::string> placesOfHelpFolders(const std::vector<std::string>& dataFolders);

/// Whether there is a help page in the folder or below. Symbolic links are not followed, and
/// folders that may not be listed are passed over.
bool holdsPages(const std::string& folder);

/// What a folder looks like: changes whenever a file in it or below comes, goes, or is written.
/// It does not read the files; symbolic links to folders are not followed.
std::string folderFingerprint(const std::string& folder);

}  // namespace zebd
