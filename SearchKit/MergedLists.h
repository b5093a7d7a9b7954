// Lists of the pages that have any term with a short prefix, for prefixes that have many.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "SearchKit/DocumentSets.h"

namespace searchkit {

struct Posting;

/// Makes the section. A prefix of one to four letters stands for hundreds of terms; to search for
/// one is to read the lists of all of them and to bring them into order. Where a list of its own is
/// much shorter than those together it is written beside them, with the sums that the search would
/// have come to, so that scores are the same with and without. In a small book no prefix gains
/// enough, and there is no section. Thread-safety: confined to one thread.
class MergedListsBuilder {
 public:
  /// Lists are written where the terms' own have at least this many entries …
  static constexpr size_t fewestPostings = 128;
  /// … and this many times as many as the list has.
  static constexpr size_t leastGain = 4;

  /// Terms come in the order of their bytes, without repetition.
  void addTerm(std::string_view term, std::span<const Posting> postings, size_t documentCount);

  /// The bytes of the section; none when there is no list. May be called once.
  std::vector<uint8_t> finish();

 private:
  struct Entry {
    uint32_t document;
    uint32_t frequency;
  };
  /// The prefix of one length that the terms now coming begin with.
  struct Level {
    std::string prefix;
    size_t postingCount = 0;
    /// Those that there are, as long as they are too few for a list; else they are in the sums.
    std::vector<Entry> few;
    /// Of each page, and the pages that have any.
    std::vector<uint64_t> frequencies;
    DocumentFilter touched;

    void add(const Entry& entry) noexcept {
      frequencies[entry.document] += entry.frequency;
      touched.insert(entry.document);
    }
  };
  struct List {
    uint64_t key;
    uint32_t documentSum;
    std::vector<uint8_t> bytes;
  };

  void _close(Level& level);

  Level _levels[4];
  std::vector<List> _lists;
};

}  // namespace searchkit
