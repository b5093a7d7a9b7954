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
/// the model. Phrases have a title alone. A hit keeps the part of the model that it points into
/// alive, so that its strings are made only when somebody asks.
/// Thread-safety: immutable but for the score, which is confined to one thread.
class LUXHit {
 public:
  /// A hit that points nowhere and knows what it is given.
  static std::shared_ptr<LUXHit> hitWithTitle(std::optional<std::string> title, float score,
                                              std::optional<std::string> path = std::nullopt,
                                              std::string book = {});

  /// One hit for each page, in the same order. They share one block of memory, which is freed with
  /// the last of them.
  static std::vector<std::shared_ptr<LUXHit>> hitsForPages(
      const std::shared_ptr<const LUXModelView>& view, std::span<const LUXScoredPage> pages);

  /// The same for phrases.
  static std::vector<std::shared_ptr<LUXHit>> hitsForPhrases(
      const std::shared_ptr<const LUXModelView>& view, std::span<const LUXScoredPhrase> phrases);

  std::optional<std::string> title() const;

  /// From 0 to 1; 1 is kept for what the user named, all else is below .99.
  float score() const noexcept { return _score; }
  void setScore(float score) noexcept { _score = score; }

  /// Path within the book, without a leading slash; absent for phrases.
  std::optional<std::string> path() const;
  /// Full identifier of the page's book; empty for phrases.
  std::string book() const;

 private:
  enum class Kind : uint8_t { page, phrase, free };

  /// What a hit has that points nowhere.
  struct Strings {
    std::optional<std::string> title;
    std::optional<std::string> path;
    std::string book;
  };

  LUXHit() = default;

  template <typename Scored>
  static std::vector<std::shared_ptr<LUXHit>> _hits(const std::shared_ptr<const LUXModelView>& view,
                                                    Kind kind, std::span<const Scored> items,
                                                    uint32_t Scored::*number);

  std::shared_ptr<const LUXModelView> _view;
  std::unique_ptr<const Strings> _strings;
  uint32_t _number = 0;
  float _score = 0;
  Kind _kind = Kind::free;
};
