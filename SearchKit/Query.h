// A query as it was understood: a tree of clauses over terms and phrases.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace searchkit {

/// What a term must look like: literal pieces in this order, anything between them, and anything
/// before the first or after the last where that side is open. "print" is one piece, "print*" one
/// piece open at the end, "w*d" two pieces.
struct TermPattern {
  std::vector<std::string> pieces;
  bool isOpenAtStart = false;
  bool isOpenAtEnd = false;

  bool isExact() const noexcept { return pieces.size() == 1 && !isOpenAtStart && !isOpenAtEnd; }
  bool isPrefix() const noexcept { return pieces.size() == 1 && !isOpenAtStart && isOpenAtEnd; }

  /// What all its terms begin with; empty where there is no telling.
  std::string_view literalPrefix() const noexcept {
    return isOpenAtStart ? std::string_view() : std::string_view(pieces.front());
  }

  /// Takes time linear in the length of the term.
  bool matches(std::string_view term) const noexcept;

  friend bool operator==(const TermPattern&, const TermPattern&) = default;
};

/// A term of a phrase, and how many words after the phrase's first one it stands.
struct PhraseSlot {
  TermPattern pattern;
  uint32_t offset = 0;

  friend bool operator==(const PhraseSlot&, const PhraseSlot&) = default;
};

/// Either a leaf, which has slots (one: a term; several: a phrase) and no children, or a clause.
///
/// A clause with required children has the documents that all of those have; one without, those
/// that any optional child has. Optional children beside required ones add to the score only.
/// Documents of excluded children are taken away. A node of nothing at all has no documents, as has
/// a clause of excluded children alone: there is nothing that they could be taken away from.
struct QueryNode {
  std::vector<PhraseSlot> slots;
  std::vector<QueryNode> required;
  std::vector<QueryNode> optional;
  std::vector<QueryNode> excluded;
  /// A term that the index may have left out for its length: it cannot be required of a document.
  bool mayBeLeftOut = false;

  bool isLeaf() const noexcept { return !slots.empty(); }
  bool hasPositive() const noexcept { return isLeaf() || !required.empty() || !optional.empty(); }
  bool isEmpty() const noexcept { return !hasPositive() && excluded.empty(); }

  friend bool operator==(const QueryNode&, const QueryNode&) = default;
};

}  // namespace searchkit
