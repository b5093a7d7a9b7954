// What keeps help from being found, whatever the book.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "zeb/Finding.h"
#include "zebd/Catalogue.h"
#include "zebd/Installation.h"

namespace zeb {

/// What is wrong with the installation (the plug-in, the indexing tool, which is started once),
/// with the folders for indexes and for the list of books, with the files of that list, and with
/// the user's settings at `settingsPath`. Changes nothing.
std::vector<Finding> examineSystem(const zebd::Catalogue& catalogue,
                                   const zebd::Installation& installation,
                                   const std::optional<std::string>& settingsPath);

}  // namespace zeb
