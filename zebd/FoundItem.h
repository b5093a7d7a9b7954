// What a search finds, as it is handed to clients of a host.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "host/Zebrine/ZEBPluginOwner.h"

namespace zebd {

class Bookshelf;

/// One thing that was found.
struct FoundItem {
  /// ZEBHelp…Result.
  std::string kind;
  std::string title;
  double relevance = 0;
  /// Of pages alone; empty where there is none.
  std::string url;
  std::string bookID;
  std::string bookTitle;
  std::optional<std::string> abstract;
  bool isExactMatch = false;
};

/// What clients call the kinds of result ("pages", "suggestions", "similar", "actions"), and back;
/// absent, or empty, for others.
std::string nameOfKind(const std::string& kind);
std::optional<std::string> kindOfName(const std::string& name);

/// The items of a batch, in its order. A page without a title bears the name of its file; a book
/// that is not on the shelf has its identifier for a title.
std::vector<FoundItem> itemsOfBatch(const ZEBResultBatch& batch, const Bookshelf& bookshelf);

}  // namespace zebd
