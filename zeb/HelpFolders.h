// Which help folders there are on a computer.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "zeb/Languages.h"

namespace zeb {

/// A folder of help pages, and what can be said of it without reading them.
struct HelpFolder {
  std::string bookID;
  std::string folder;
  /// As its folder is named; empty where the place does not say.
  std::string language;
};

/// Told of each folder that was passed over, and why.
using PassedOver = std::function<void(const std::string& folder, const std::string& reason)>;

/// Help of the desktop's applications, in the languages of `fallbacks` (see languageFallbacks):
/// <root>/usr/share/help/<language>/<application> and
/// <root>/usr/share/<application>/help/<language>. One folder an application.
std::vector<HelpFolder> applicationHelpFolders(const std::string& root,
                                               const std::vector<std::string>& fallbacks,
                                               const PassedOver& passedOver);

/// Manuals as web pages, with an index.html: <root>/usr/share/doc/<package>/html, …/manual or the
/// package's folder itself. One folder a package, and each folder once, whatever links lead to it.
/// Packages for developers (-dev), libraries for web pages (libjs-, node-) and interface
/// descriptions made by a generator are passed over: their pages drown those made for people.
std::vector<HelpFolder> manualFolders(const std::string& root, const PassedOver& passedOver);

/// What a folder looks like: changes whenever a file in it or below comes, goes, or is written.
/// It does not read the files; symbolic links to folders are not followed.
std::string folderFingerprint(const std::string& folder);

}  // namespace zeb
