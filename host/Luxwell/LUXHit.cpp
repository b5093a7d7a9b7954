#include "host/Luxwell/LUXHit.h"

#include <cstddef>
#include <string_view>

#include "host/Luxwell/LUXCompletion.h"
#include "host/Luxwell/LUXModelView.h"
#include "host/Luxwell/LUXScoring.h"

struct LUXHit::Block {
  explicit Block(size_t count) : hits(new LUXHit[count]) {}

  Place add(std::string_view string) {
    const Place place{static_cast<uint32_t>(text.size()), static_cast<uint32_t>(string.size())};
    text.append(string);
    return place;
  }

  std::string text;
  const std::unique_ptr<LUXHit[]> hits;
};

namespace {

// A guess at what paths, or phrases, take.
constexpr size_t usualLength = 40;

template <typename Scored, typename Fill>
std::vector<std::shared_ptr<LUXHit>> hitsFor(std::span<const Scored> items, Fill fill) {
  std::vector<std::shared_ptr<LUXHit>> hits;
  hits.reserve(items.size());
  for (const Scored& item : items) {
    hits.push_back(fill(item));
  }
  return hits;
}

}  // namespace

std::shared_ptr<LUXHit> LUXHit::hitWithTitle(const std::optional<std::string>& title, float score,
                                             const std::optional<std::string>& path,
                                             const std::string& book) {
  const auto block = std::make_shared<Block>(1);
  LUXHit& hit = block->hits[0];
  hit._block = block.get();
  hit._score = score;
  hit._title = title ? block->add(*title) : Place();
  hit._path = path ? block->add(*path) : Place();
  hit._book = block->add(book);
  return {block, &hit};
}

std::vector<std::shared_ptr<LUXHit>> LUXHit::hitsForPages(const LUXModelView& view,
                                                          std::span<const LUXScoredPage> pages) {
  const auto block = std::make_shared<Block>(pages.size());
  block->text.reserve(pages.size() * usualLength);
  uint32_t book = 0;
  Place bookPlace;
  LUXHit* next = block->hits.get();
  return hitsFor(pages, [&](const LUXScoredPage& scored) {
    const LUXModelView::Page page = view.page(scored.page);
    // Pages of one book mostly follow one another.
    if (bookPlace.length == absent || page.book != book) {
      book = page.book;
      bookPlace = block->add(view.bookID(book));
    }
    LUXHit& hit = *next++;
    hit._block = block.get();
    hit._path = block->add(page.key);
    hit._book = bookPlace;
    hit._score = scored.score;
    return std::shared_ptr<LUXHit>(block, &hit);
  });
}

std::vector<std::shared_ptr<LUXHit>> LUXHit::hitsForPhrases(
    const LUXModelView& view, std::span<const LUXScoredPhrase> phrases) {
  const auto block = std::make_shared<Block>(phrases.size());
  block->text.reserve(phrases.size() * usualLength);
  LUXHit* next = block->hits.get();
  return hitsFor(phrases, [&](const LUXScoredPhrase& phrase) {
    LUXHit& hit = *next++;
    hit._block = block.get();
    hit._title = block->add(view.phraseText(phrase.phrase));
    hit._score = phrase.score;
    return std::shared_ptr<LUXHit>(block, &hit);
  });
}

std::optional<std::string> LUXHit::_string(Place place) const {
  return place.length == absent
             ? std::nullopt
             : std::optional<std::string>(_block->text.substr(place.start, place.length));
}

std::optional<std::string> LUXHit::title() const { return _string(_title); }

std::optional<std::string> LUXHit::path() const { return _string(_path); }

std::string LUXHit::book() const { return _string(_book).value_or(std::string()); }
