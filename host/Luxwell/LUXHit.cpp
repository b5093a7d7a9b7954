#include "host/Luxwell/LUXHit.h"

#include <utility>

#include "host/Luxwell/LUXCompletion.h"
#include "host/Luxwell/LUXModelView.h"
#include "host/Luxwell/LUXScoring.h"

std::shared_ptr<LUXHit> LUXHit::hitWithTitle(std::optional<std::string> title, float score,
                                             std::optional<std::string> path, std::string book) {
  const std::shared_ptr<LUXHit> hit(new LUXHit);
  hit->_strings =
      std::make_unique<const Strings>(Strings{std::move(title), std::move(path), std::move(book)});
  hit->_score = score;
  return hit;
}

template <typename Scored>
std::vector<std::shared_ptr<LUXHit>> LUXHit::_hits(const std::shared_ptr<const LUXModelView>& view,
                                                   Kind kind, std::span<const Scored> items,
                                                   uint32_t Scored::*number) {
  const std::shared_ptr<LUXHit[]> block(new LUXHit[items.size()]);
  std::vector<std::shared_ptr<LUXHit>> hits;
  hits.reserve(items.size());
  LUXHit* hit = block.get();
  for (const Scored& item : items) {
    hit->_view = view;
    hit->_number = item.*number;
    hit->_score = item.score;
    hit->_kind = kind;
    hits.emplace_back(block, hit++);
  }
  return hits;
}

std::vector<std::shared_ptr<LUXHit>> LUXHit::hitsForPages(
    const std::shared_ptr<const LUXModelView>& view, std::span<const LUXScoredPage> pages) {
  return _hits(view, Kind::page, pages, &LUXScoredPage::page);
}

std::vector<std::shared_ptr<LUXHit>> LUXHit::hitsForPhrases(
    const std::shared_ptr<const LUXModelView>& view, std::span<const LUXScoredPhrase> phrases) {
  return _hits(view, Kind::phrase, phrases, &LUXScoredPhrase::phrase);
}

std::optional<std::string> LUXHit::title() const {
  switch (_kind) {
    case Kind::page:
      return std::nullopt;
    case Kind::phrase:
      return std::string(_view->phraseText(_number));
    default:
      return _strings->title;
  }
}

std::optional<std::string> LUXHit::path() const {
  switch (_kind) {
    case Kind::page:
      return std::string(_view->page(_number).key);
    case Kind::phrase:
      return std::nullopt;
    default:
      return _strings->path;
  }
}

std::string LUXHit::book() const {
  switch (_kind) {
    case Kind::page:
      return std::string(_view->bookID(_view->page(_number).book));
    case Kind::phrase:
      return {};
    default:
      return _strings->book;
  }
}
