// What a model is made from: the token counts of all its pages, with every token once.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <vector>

#include "host/Luxwell/LUXNumbering.h"
#include "host/Luxwell/LUXTokenCounts.h"

class HelpTokenizer;

/// A token of a page, by number. Counts stop at what their bits hold: there are many of these.
struct LUXOccurrence {
  uint32_t token = 0;
  uint16_t bodyCount = 0;
  uint8_t titleCount = 0;
  /// See LUXTokenCount.
  uint8_t wordsBefore = LUXTokenCount::farDown;

  uint32_t count() const noexcept { return uint32_t{titleCount} + bodyCount; }
};

/// Page after page.
struct LUXOccurrences {
  std::vector<LUXOccurrence> all;
  std::vector<size_t> starts{0};

  std::span<const LUXOccurrence> ofPage(size_t page) const noexcept {
    return std::span(all).subspan(starts[page], starts[page + 1] - starts[page]);
  }
};

struct LUXTrainingPage {
  static constexpr uint32_t noBook = 0xFFFFFFFF;

  /// Its number; noBook for pages of books that are not to be found.
  uint32_t book = noBook;
  /// Whether the page may be found. Only then it has a key.
  bool isShown = false;
  std::string key;

  /// How many tokens its title and the rest have, by kind.
  std::array<uint32_t, LUXTokenKindCount> titleLengths{};
  std::array<uint32_t, LUXTokenKindCount> bodyLengths{};
};

/// Thread-safety: confined to one thread while it is filled; then immutable.
struct LUXTrainingData {
  /// Folder name.
  std::string language;
  /// Null for a language that is not supported.
  std::shared_ptr<const HelpTokenizer> tokenizer;
  /// Full identifiers, in the order in which they were added.
  std::vector<std::string> books;
  std::vector<LUXTrainingPage> pages;
  /// By kind; pairs of stems are in `pairs`.
  std::array<LUXStringNumbering, LUXTokenKindCount> strings;
  LUXPairNumbering pairs;
  std::array<LUXOccurrences, LUXTokenKindCount> occurrences;

  LUXStringNumbering& stringsOf(LUXTokenKind kind) { return strings[static_cast<size_t>(kind)]; }
  const LUXStringNumbering& stringsOf(LUXTokenKind kind) const {
    return strings[static_cast<size_t>(kind)];
  }
  LUXOccurrences& occurrencesOf(LUXTokenKind kind) {
    return occurrences[static_cast<size_t>(kind)];
  }
  const LUXOccurrences& occurrencesOf(LUXTokenKind kind) const {
    return occurrences[static_cast<size_t>(kind)];
  }
};
