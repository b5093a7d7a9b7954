// One search in one language model.
#pragma once

#include <atomic>
#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/ThreadSafety.h"

class HelpLUXIndex;
class HelpLUXModel;
class LUXHit;
class LUXModelView;
class LUXQuery;
class ZEBQuery;

/// Hears the answer of a query, on the thread that runs it.
class LUXQueryDelegate {
 public:
  virtual ~LUXQueryDelegate() = default;

  /// Best first; empty where nothing was found. The query and the hits are the delegate's to keep.
  virtual void queryDidFinishWithResults(const std::shared_ptr<LUXQuery>& query,
                                         const std::vector<std::shared_ptr<LUXHit>>& results) = 0;
};

// Query types.

/// Pages that answer the text.
inline constexpr int LUXQueryTypeArticles = 1;
/// The same; asked with a large count by those who look for actions among them.
inline constexpr int LUXQueryTypeActions = 2;
/// Phrases of the books that the text, half typed, may become.
inline constexpr int LUXQueryTypeCompletions = 3;
/// Phrases of the books that find the pages which the text finds.
inline constexpr int LUXQueryTypeSimilar = 4;

/// A text, a model and the question what the one finds in the other.
///
/// The model is read as it was saved when the query ran: a build that replaces the model meanwhile
/// changes nothing for the query or its hits. Nothing is asked of the host but whether the outside
/// query is cancelled.
///
/// Thread-safety: set up by one thread before run(); run() is for one thread. setLuxIndex(),
/// luxIndex(), cancel() and isCancelled() are internally synchronised and may be called at any
/// time.
class LUXQuery : public std::enable_shared_from_this<LUXQuery> {
 public:
  /// `helpbookID`, a full identifier, restricts the query to the pages and phrases of that book;
  /// an absent one means every book of the model. Null when there is no model. Without an outside
  /// query only cancel() cancels. The delegate is not kept alive.
  static std::shared_ptr<LUXQuery> initWithString(std::string string,
                                                  std::optional<std::string> helpbookID,
                                                  size_t requestedCount,
                                                  std::weak_ptr<LUXQueryDelegate> delegate,
                                                  std::shared_ptr<HelpLUXModel> luxModel,
                                                  std::shared_ptr<ZEBQuery> outsideQuery);

  LUXQuery(const LUXQuery&) = delete;
  LUXQuery& operator=(const LUXQuery&) = delete;

  const std::string& queryString() const noexcept { return _queryString; }
  const std::optional<std::string>& helpbookID() const noexcept { return _helpbookID; }
  /// At most this many hits are wanted.
  size_t requestedCount() const noexcept { return _requestedCount; }
  const std::shared_ptr<HelpLUXModel>& luxModel() const noexcept { return _luxModel; }
  const std::shared_ptr<ZEBQuery>& outsideQuery() const noexcept { return _outsideQuery; }

  /// For whoever files the answer; the search itself does not depend on it.
  const std::string& groupName() const noexcept { return _groupName; }
  void setGroupName(std::string groupName) { _groupName = std::move(groupName); }

  /// A model language ("English"), which says how the text is taken apart; the model's own until
  /// another is set.
  const std::string& language() const noexcept { return _language; }
  void setLanguage(std::string language) { _language = std::move(language); }

  /// Of pages with the same score, those of this book come first. Absent until set.
  const std::optional<std::string>& focusedHelpbookID() const noexcept {
    return _focusedHelpbookID;
  }
  void setFocusedHelpbookID(std::optional<std::string> helpbookID) {
    _focusedHelpbookID = std::move(helpbookID);
  }

  /// One of LUXQueryType…; articles until another is set. Other numbers count as articles.
  int queryType() const noexcept { return _queryType; }
  void setQueryType(int queryType) noexcept { _queryType = queryType; }

  /// The index data of the book that the query is restricted to, kept for the delegate, who finds
  /// the titles of the pages there. It may be set while the query runs, so the search itself must
  /// not depend on it, and does not.
  std::shared_ptr<HelpLUXIndex> luxIndex() const;
  void setLuxIndex(std::shared_ptr<HelpLUXIndex> luxIndex);

  /// Gives the answer up: run() returns within some milliseconds, without an answer.
  void cancel() noexcept { _cancelled.store(true, std::memory_order_release); }
  /// Whether this query or the outside one was cancelled.
  bool isCancelled() const noexcept;

  /// Searches on the calling thread and answers the delegate, exactly once, unless the query is
  /// cancelled before that: then not at all. A model that cannot be read, a language that is not
  /// known and a text without words have an empty answer.
  void run();

 private:
  LUXQuery(std::string string, std::optional<std::string> helpbookID, size_t requestedCount,
           std::weak_ptr<LUXQueryDelegate> delegate, std::shared_ptr<HelpLUXModel> luxModel,
           std::shared_ptr<ZEBQuery> outsideQuery);

  std::vector<std::shared_ptr<LUXHit>> _results() const;

  const std::string _queryString;
  const std::optional<std::string> _helpbookID;
  const size_t _requestedCount;
  const std::weak_ptr<LUXQueryDelegate> _delegate;
  const std::shared_ptr<HelpLUXModel> _luxModel;
  const std::shared_ptr<ZEBQuery> _outsideQuery;
  std::string _groupName;
  std::string _language;
  std::optional<std::string> _focusedHelpbookID;
  int _queryType = LUXQueryTypeArticles;
  std::atomic<bool> _cancelled{false};
  mutable platform::Mutex _luxIndexMutex;
  std::shared_ptr<HelpLUXIndex> _luxIndex GUARDED_BY(_luxIndexMutex);
};
