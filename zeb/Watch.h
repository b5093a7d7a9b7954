// A search that goes on.
#pragma once

#include <functional>
#include <optional>
#include <string>

#include "zeb/CommandLine.h"
#include "zeb/Console.h"

namespace zeb {

class HelpSearch;

/// Prints pages as they are found, a line each, in the order in which they come; and when indexes
/// have come, changed or gone, searches again and prints what is found now and was not before
/// ("+"), and what is no longer found ("-"). With the command's `json`, each line is a JSON object:
/// "change" ("found" or "gone") and what a result of a search has.
///
/// Goes on until `isEnough`, which is asked between searches, says so, results cannot be written
/// any more, or the search breaks off twice in a row. Returns whether anything was found; absent
/// where it broke off.
std::optional<bool> watch(HelpSearch& search, const WatchCommand& command, const std::string& words,
                          Console& console, const std::function<bool()>& isEnough);

}  // namespace zeb
