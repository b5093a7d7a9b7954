// One finding of a query.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <vector>

class LUXModelView;
struct LUXScoredPage;
struct LUXScoredPhrase;

/// A page, or a phrase that is offered as something to search for.
///
/// Pages have a path and a book and no title: titles belong to the books' own index data, not to
/// the model. Phrases have a title alone. The hits of one answer share one block of memory with the
/// text of all, which is freed with the last of them; they need neither model nor query.
/// Thread-safety: immutable but for the score, which is confined to one thread.
class LUXHit {
 public:
  static std::shared_ptr<LUXHit> hitWithTitle(const std::optional<std::string>& title, float score,
                                              const std::optional<std::string>& path = std::nullopt,
                                              const std::string& book = {});

  /// One hit for each page of the model, in the same order.
  static std::vector<std::shared_ptr<LUXHit>> hitsForPages(const LUXModelView& view,
                                                           std::span<const LUXScoredPage> pages);
  /// The same for phrases.
  static std::vector<std::shared_ptr<LUXHit>> hitsForPhrases(
      const LUXModelView& view, std::span<const LUXScoredPhrase> phrases);

  std::optional<std::string> title() const;

  /// From 0 to 1; 1 is kept for what the user named, all else is below .99.
  float score() const noexcept { return _score; }
  void setScore(float score) noexcept { _score = score; }

  /// Path within the book, without a leading slash; absent for phrases.
  std::optional<std::string> path() const;
  /// Full identifier of the page's book; empty for phrases.
  std::string book() const;

 private:
  struct Block;
  /// Where in the block's text a string lies.
  struct Place {
    uint32_t start = 0;
    uint32_t length = absent;
  };
  static constexpr uint32_t absent = UINT32_MAX;

  LUXHit() = default;

  std::optional<std::string> _string(Place place) const;

  /// The block that this hit is in.
  const Block* _block = nullptr;
  Place _title;
  Place _path;
  Place _book;
  float _score = 0;
};
