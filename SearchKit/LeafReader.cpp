#include "SearchKit/LeafReader.h"

#include "SearchKit/PhraseReader.h"
#include "SearchKit/PostingsCursor.h"
#include "SearchKit/Scoring.h"
#include "SearchKit/TermScan.h"

namespace searchkit {
namespace {

constexpr size_t postingsPerSlice = 1024;

// Reads up to a slice of the current list; false at the list's end.
template <bool isFiltered>
bool readSlice(PostingsCursor& cursor, float factor, const DocumentFilter* filter,
               Accumulator& found, size_t& units) noexcept {
  PostingsCursor at = cursor;
  size_t left = postingsPerSlice;
  bool hasMore = true;
  while (left > 0 && (hasMore = at.next())) {
    --left;
    if (!isFiltered || filter->has(at.document())) {
      found.add(at.document(), factor * static_cast<float>(at.weight()));
    }
  }
  cursor = at;
  units += postingsPerSlice - left;
  return hasMore;
}

bool readSlice(PostingsCursor& cursor, float factor, const DocumentFilter* filter,
               Accumulator& found, size_t& units) noexcept {
  return filter != nullptr ? readSlice<true>(cursor, factor, filter, found, units)
                           : readSlice<false>(cursor, factor, filter, found, units);
}

// A term or all terms with a prefix: one stretch of lists, read without the dictionary.
class RangeReader : public LeafReader {
 public:
  RangeReader(const IndexView& view, const PrefixRange& range) noexcept
      : _cursor(view, range.postings), _isExactNext(range.beginsWithExactTerm) {}

  bool read(WorkBudget& budget, const DocumentFilter* filter, Accumulator& found) override {
    for (;;) {
      if (!_isInList) {
        if (!_cursor.beginList()) {
          return true;
        }
        _isInList = true;
        _documentCount += _cursor.listDocumentCount();
        _factor = _isExactNext ? exactFactor : 1;
        _isExactNext = false;
      }
      size_t units = 1;
      _isInList = readSlice(_cursor, _factor, filter, found, units);
      if (!budget.spend(units)) {
        return false;
      }
    }
  }

  uint64_t documentCount() const noexcept override { return _documentCount; }

 private:
  PostingsCursor _cursor;
  bool _isExactNext;
  bool _isInList = false;
  float _factor = 1;
  uint64_t _documentCount = 0;
};

// The terms that a pattern matches, here and there in the dictionary.
class PatternReader : public LeafReader {
 public:
  PatternReader(const IndexView& view, const TermPattern& pattern) noexcept
      : _view(view), _scan(view, pattern) {}

  bool read(WorkBudget& budget, const DocumentFilter* filter, Accumulator& found) override {
    for (;;) {
      if (!_isInList) {
        const TermScan::Outcome outcome = _scan.next(budget);
        if (outcome != TermScan::Outcome::found) {
          return outcome == TermScan::Outcome::finished;
        }
        _cursor = PostingsCursor(_view, _scan.postings());
        _isInList = _cursor.beginList();
        _documentCount += _isInList ? _cursor.listDocumentCount() : 0;
      }
      size_t units = 1;
      _isInList =
          _isInList && readSlice(_cursor, _scan.isExact() ? exactFactor : 1, filter, found, units);
      if (!budget.spend(units)) {
        return false;
      }
    }
  }

  uint64_t documentCount() const noexcept override { return _documentCount; }

 private:
  const IndexView& _view;
  TermScan _scan;
  PostingsCursor _cursor;
  bool _isInList = false;
  uint64_t _documentCount = 0;
};

}  // namespace

std::unique_ptr<LeafReader> LeafReader::make(const IndexView& view, const PlanLeaf& leaf) {
  switch (leaf.kind) {
    case PlanLeaf::Kind::pattern:
      return std::make_unique<PatternReader>(view, leaf.slots.front().pattern);
    case PlanLeaf::Kind::phrase:
      return std::make_unique<PhraseReader>(view, leaf.slots);
    case PlanLeaf::Kind::range:
      break;
  }
  return std::make_unique<RangeReader>(view, leaf.range);
}

}  // namespace searchkit
