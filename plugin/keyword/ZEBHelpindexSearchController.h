// Search by keyword, and look-up of anchors, over help indexes.
#pragma once

#include <bitset>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "SearchKit/SearchKit.h"
#include "platform/URL.h"
#include "platform/Value.h"
#include "plugin/records/AtomicProperty.h"

class ZEBHelpBook;
class ZEBHelpindexIndex;
class ZEBIndex;
class ZEBPluginOwner;
class ZEBResult;

/// Answers the keyword half of every search, and all questions for anchors, from index records.
///
/// A query is first run with all of its words required and, when that finds little, once more with
/// any of them. Nothing is remembered between calls, and no index is open between them.
///
/// Calls run on the caller's thread from beginning to end. Results belong to the caller.
/// Thread-safety: internally synchronised; calls do not wait for each other.
class ZEBHelpindexSearchController {
 public:
  using Results = std::vector<std::shared_ptr<ZEBResult>>;
  using Indices = std::vector<std::shared_ptr<ZEBIndex>>;
  /// The pages to leave out, as absolute strings. What is no URL leaves out nothing.
  using IgnoredURLs = std::vector<std::string>;

  /// A controller without an owner: it knows no books.
  static std::shared_ptr<ZEBHelpindexSearchController> init();

  ZEBHelpindexSearchController(const ZEBHelpindexSearchController&) = delete;
  ZEBHelpindexSearchController& operator=(const ZEBHelpindexSearchController&) = delete;

  /// The host, asked for books by identifier. Held strongly.
  std::shared_ptr<ZEBPluginOwner> pluginOwner() const { return _pluginOwner.get(); }
  void setPluginOwner(std::shared_ptr<ZEBPluginOwner> owner) { _pluginOwner.set(std::move(owner)); }

  /// The articles that match, each page once, in no defined order, with the engine's own scores.
  /// Of `inIndices` only searchable help indexes are searched; the others, null among them, are
  /// passed over.
  Results doSearchForString(std::string_view queryString, const Indices& inIndices,
                            const IgnoredURLs& ignoringURLs);

  /// The pages that carry the anchor of exactly this name, each with relevance 1, index by index
  /// and in the order of the index's own list; a page that two indexes have comes twice.
  Results doLookupOfAnchor(std::string_view anchor, const Indices& inIndices);

  // The steps of a search. Internal: public so that each can be tested by itself.

  /// One pass: all words required (`useAndSearch`) or any. In the order of the indices, and of the
  /// hits kept within one.
  Results _doSearchForString(std::string_view queryString, const Indices& inIndices,
                             const IgnoredURLs& ignoringURLs, bool useAndSearch);

  /// The query as the engine gets it: as typed if it uses the engine's own syntax, otherwise each
  /// of its terms as a prefix, in order: "print* queue* ".
  std::string _prepareQuery(std::string_view query,
                            const std::vector<std::string>& composedOfTerms);

  /// Whether `_urlIsEqualToURL` holds for any of `urls`.
  static bool _arrayOfURLsContainsURL(const std::vector<platform::URL>& urls,
                                      const platform::URL& url);

  /// Whether two URLs lead to the same place: their absolute forms are spelled alike, or both are
  /// file URLs with the same path.
  static bool _urlIsEqualToURL(const platform::URL& url, const platform::URL& isEqualToURL);

 private:
  using OperatorSet = std::bitset<256>;

  ZEBHelpindexSearchController() = default;

  struct Pass;

  Pass _runPass(std::string_view queryString, const Indices& inIndices,
                const IgnoredURLs& ignoringURLs, bool useAndSearch);
  void _searchIndex(ZEBHelpindexIndex& index, Pass& pass);
  void _addResults(ZEBHelpindexIndex& index, const SKIndexRef& indexRef, Pass& pass);
  static Results _distinct(Results first, Results second);
  static Results _united(Pass all, Pass any);
  static bool _areDifferent(std::vector<size_t> hashes);
  void _lookUpPaths(ZEBHelpindexIndex& index, const platform::Value::Array& paths,
                    Results& results);

  std::shared_ptr<ZEBHelpBook> _bookOfIndex(const ZEBHelpindexIndex& index) const;
  /// A file in the folder that the index's documents lie under.
  static std::optional<std::string> _siblingPath(const ZEBHelpindexIndex& index,
                                                 const std::shared_ptr<ZEBHelpBook>& book);
  /// That folder.
  static std::optional<std::string> _parentPath(const ZEBHelpindexIndex& index,
                                                const std::shared_ptr<ZEBHelpBook>& book);

  /// Made at the first query. Threads that make it at the same time make the same.
  AtomicProperty<std::shared_ptr<const OperatorSet>> _skOperators;
  AtomicProperty<std::shared_ptr<ZEBPluginOwner>> _pluginOwner;
};
