#include "host/Luxwell/LUXQuery.h"

#include <tuple>
#include <utility>

#include "host/Luxwell/HelpLUXModel.h"
#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXCompletion.h"
#include "host/Luxwell/LUXHit.h"
#include "host/Luxwell/LUXModelView.h"
#include "host/Luxwell/LUXQueryTerms.h"
#include "host/Luxwell/LUXScoring.h"
#include "host/Luxwell/LUXSimilar.h"
#include "host/Zebrine/ZEBQuery.h"

LUXQuery::LUXQuery(std::string string, std::optional<std::string> helpbookID, size_t requestedCount,
                   std::weak_ptr<LUXQueryDelegate> delegate, std::shared_ptr<HelpLUXModel> luxModel,
                   std::shared_ptr<ZEBQuery> outsideQuery)
    : _queryString(std::move(string)),
      _helpbookID(std::move(helpbookID)),
      _requestedCount(requestedCount),
      _delegate(std::move(delegate)),
      _luxModel(std::move(luxModel)),
      _outsideQuery(std::move(outsideQuery)),
      _language(_luxModel->language()) {}

std::shared_ptr<LUXQuery> LUXQuery::initWithString(std::string string,
                                                   std::optional<std::string> helpbookID,
                                                   size_t requestedCount,
                                                   std::weak_ptr<LUXQueryDelegate> delegate,
                                                   std::shared_ptr<HelpLUXModel> luxModel,
                                                   std::shared_ptr<ZEBQuery> outsideQuery) {
  if (!luxModel) {
    return nullptr;
  }
  return std::shared_ptr<LUXQuery>(new LUXQuery(std::move(string), std::move(helpbookID),
                                                requestedCount, std::move(delegate),
                                                std::move(luxModel), std::move(outsideQuery)));
}

std::shared_ptr<HelpLUXIndex> LUXQuery::luxIndex() const {
  const platform::MutexLock lock(_luxIndexMutex);
  return _luxIndex;
}

void LUXQuery::setLuxIndex(std::shared_ptr<HelpLUXIndex> luxIndex) {
  const platform::MutexLock lock(_luxIndexMutex);
  _luxIndex.swap(luxIndex);
}

bool LUXQuery::isCancelled() const noexcept {
  return _cancelled.load(std::memory_order_acquire) ||
         (_outsideQuery && _outsideQuery->isCancelled());
}

void LUXQuery::run() {
  if (isCancelled()) {
    return;
  }
  const std::vector<std::shared_ptr<LUXHit>> results = _results();
  if (isCancelled()) {
    return;
  }
  if (const auto delegate = _delegate.lock()) {
    delegate->queryDidFinishWithResults(shared_from_this(), results);
  }
}

std::vector<std::shared_ptr<LUXHit>> LUXQuery::_results() const {
  const std::shared_ptr<const LUXModelView> view = _luxModel->view();
  const auto tokenizer = HelpTokenizer::tokenizerForLanguage(_language);
  if (!view || !tokenizer) {
    return {};
  }
  LUXPageScope scope;
  std::optional<uint32_t> book;
  if (_helpbookID) {
    book = view->bookNumber(*_helpbookID);
    if (!book) {
      return {};
    }
    std::tie(scope.first, scope.end) = view->pageRangeOfBook(*book);
  }
  if (_focusedHelpbookID) {
    if (const auto focused = view->bookNumber(*_focusedHelpbookID)) {
      std::tie(scope.focusFirst, scope.focusEnd) = view->pageRangeOfBook(*focused);
    }
  }
  const LUXIsCancelled isCancelled = [this] { return this->isCancelled(); };
  if (_queryType == LUXQueryTypeCompletions) {
    const LUXQueryTerms typed = LUXQueryTerms::foldedTextOf(*tokenizer, _queryString);
    return LUXHit::hitsForPhrases(*view,
                                  LUXCompletions(*view, typed, _requestedCount, book, isCancelled));
  }
  const LUXQueryTerms terms = LUXQueryTerms::termsOfText(*tokenizer, _queryString, isCancelled);
  if (_queryType == LUXQueryTypeSimilar) {
    return LUXHit::hitsForPhrases(
        *view, LUXSimilarPhrases(*view, terms, _requestedCount, scope, book, isCancelled));
  }
  auto pages = LUXScoring(*view).bestPages(terms, _requestedCount, scope, isCancelled);
  // Titles may look like searches with operators; but who puts the whole into quotation marks means
  // a phrase, be it a title or not, and who begins with an operator leaves something out.
  const bool isPhrase = _queryString.starts_with('"') && _queryString.ends_with('"');
  const bool isCommand = _queryString.starts_with('-') || _queryString.starts_with('+') ||
                         _queryString.starts_with('!');
  const bool isTitle = !isPhrase && !isCommand && !pages.empty() &&
                       pages.front().score >= luxscoring::exactTitleScore;
  if (LUXQueryHasOperators(_queryString) && !isTitle) {
    return {};
  }
  LUXLiftAboveCutoff(pages);
  return LUXHit::hitsForPages(*view, pages);
}
