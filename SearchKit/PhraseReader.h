// Finds the documents in which terms stand at given distances.
#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "SearchKit/LeafReader.h"
#include "SearchKit/PostingsCursor.h"
#include "SearchKit/TermScan.h"

namespace searchkit {

/// Slot by slot, the rarest first: the places where a phrase could begin for its first slot are
/// kept in order, and each further slot strikes out those that it does not confirm. A slot may be a
/// prefix or a pattern. Thread-safety: confined to one thread.
class PhraseReader : public LeafReader {
 public:
  /// Both must outlive the reader. There is at least one slot.
  PhraseReader(const IndexView& view, const std::vector<PhraseSlot>& slots);

  bool read(WorkBudget& budget, const DocumentFilter* filter, Accumulator& found) override;
  uint64_t documentCount() const noexcept override { return _documentCount; }

 private:
  // Where the phrase may begin: the document in the upper half, the position in the lower one.
  struct Place {
    uint64_t at;
    float frequency;
  };

  bool _readSlot(WorkBudget& budget, const DocumentFilter* filter);
  bool _readList(WorkBudget& budget, const DocumentFilter* filter);
  void _confirm();
  void _finish(Accumulator& found);

  const IndexView& _view;
  const std::vector<PhraseSlot>& _slots;
  size_t _slot = 0;
  std::optional<TermScan> _scan;
  bool _isInList = false;
  PostingsCursor _postings;
  PositionsCursor _positions;
  // Of the slots before the current one, and of the current one.
  std::vector<Place> _places;
  std::vector<Place> _slotPlaces;
  std::optional<DocumentFilter> _documentsOfPlaces;
  uint64_t _slotDocumentCount = 0;
  uint64_t _documentCount = UINT64_MAX;
};

}  // namespace searchkit
