// What goes over the bus, made of what the daemon knows and made into what it is to do (see
// docs/bus.md). Thread-safety: all functions may be called from any thread.
#pragma once

#include <sdbus-c++/sdbus-c++.h>

#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "zebd/HelpService.h"

namespace zebd {

struct ListedModel;

namespace busmessages {

using Dictionary = std::map<std::string, sdbus::Variant>;
using Dictionaries = std::vector<Dictionary>;
using Strings = std::vector<std::string>;
using Failures = std::vector<sdbus::Struct<std::string, std::string>>;

inline constexpr const char* badRequest = "org.zeb.Help1.Error.BadRequest";
inline constexpr const char* failed = "org.zeb.Help1.Error.Failed";
inline constexpr const char* refused = "org.zeb.Help1.Error.Refused";
inline constexpr const char* unreachable = "org.zeb.Help1.Error.Unreachable";
inline constexpr const char* unknownBook = "org.zeb.Help1.Error.UnknownBook";
inline constexpr const char* unknownHandle = "org.zeb.Help1.Error.UnknownHandle";

std::string nameOfEnding(SearchEnding ending);
Dictionary dictionaryOfItem(const FoundItem& item);
Dictionary dictionaryOfBook(const BookStatus& book);
Dictionary dictionaryOfModel(const ListedModel& model);
Failures failuresOf(const std::vector<BookFailure>& failures);

/// Throws sdbus::Error where somebody says more than can be meant.
void checkTexts(const Strings& texts);
/// Throws sdbus::Error for what no book can be called.
void checkBookIDs(const Strings& bookIDs);

/// What is to be scanned. Throws sdbus::Error for what it may not be.
ScanRequest scanWithOptions(const Strings& folders, const Dictionary& options);
/// What a client may say beside the text. Throws sdbus::Error for what it may not.
SearchRequest requestWithOptions(std::string text, const Dictionary& options);
/// For results of one kind.
SearchRequest requestFor(std::string text, Strings books, const std::string& kind, uint32_t limit);

}  // namespace busmessages

}  // namespace zebd
