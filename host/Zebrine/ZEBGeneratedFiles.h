// Where the files lie that are generated for help books.
#pragma once

#include <optional>
#include <string>
#include <string_view>

// <caches>/<daemon>/<generated indexes>/<book>/<localization>.<extension>: a folder a book, so that
// all that was generated for it can go at once, and a file a localization, so that a change of
// language costs nothing. The plug-in writes there; a host may look whether there is something.
// Thread-safety: these functions are pure but for reading Environment's caches folder.

/// The folder above the folders of the books; absent where the user has no caches folder.
std::optional<std::string> ZEBGeneratedRoot();

/// The file of a book within `root`. A book without localization gives the file its own name.
std::string ZEBGeneratedFilePath(const std::string& root, const std::string& bookID,
                                 const std::string& localization, std::string_view extension);
