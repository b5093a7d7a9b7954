#include "SearchKit/PhraseReader.h"

#include <algorithm>

#include "SearchKit/Scoring.h"

namespace searchkit {
namespace {

uint32_t documentOf(uint64_t place) noexcept { return static_cast<uint32_t>(place >> 32); }

}  // namespace

PhraseReader::PhraseReader(const IndexView& view, const std::vector<PhraseSlot>& slots)
    : _view(view), _slots(slots) {}

bool PhraseReader::read(WorkBudget& budget, const DocumentFilter* filter, Accumulator& found) {
  while (_slot < _slots.size()) {
    if (!_scan) {
      _scan.emplace(_view, _slots[_slot].pattern);
    }
    const bool isFirst = _slot == 0;
    if (!_readSlot(budget, isFirst ? filter : &*_documentsOfPlaces)) {
      return false;
    }
    _confirm();
    ++_slot;
    if (_places.empty()) {
      _slot = _slots.size();
    }
  }
  _finish(found);
  return true;
}

bool PhraseReader::_readSlot(WorkBudget& budget, const DocumentFilter* filter) {
  for (;;) {
    if (!_isInList) {
      const TermScan::Outcome outcome = _scan->next(budget);
      if (outcome != TermScan::Outcome::found) {
        return outcome == TermScan::Outcome::finished;
      }
      _postings = PostingsCursor(_view, _scan->postings());
      _positions = PositionsCursor(_view, _scan->positions());
      _isInList = _postings.beginList();
      _slotDocumentCount += _isInList ? _postings.listDocumentCount() : 0;
    }
    if (_isInList && !_readList(budget, filter)) {
      return false;
    }
    _isInList = false;
  }
}

// To the end of the list, or false when time runs out before that.
bool PhraseReader::_readList(WorkBudget& budget, const DocumentFilter* filter) {
  const uint32_t offset = _slots[_slot].offset;
  const float factor = _scan->isExact() ? exactFactor : 1;
  while (_postings.next() && _positions.nextDocument(_view.documentLength(_postings.document()))) {
    size_t units = 1;
    const uint32_t document = _postings.document();
    if (filter == nullptr || filter->has(document)) {
      const float frequency = factor * static_cast<float>(_postings.weight());
      while (_positions.nextPosition()) {
        ++units;
        if (_positions.position() >= offset) {
          _slotPlaces.push_back(
              {uint64_t{document} << 32 | (_positions.position() - offset), frequency});
        }
      }
    }
    if (!budget.spend(units)) {
      return false;
    }
  }
  return true;
}

// Makes the slot's places those of the phrase so far.
void PhraseReader::_confirm() {
  const auto inOrder = [](const Place& a, const Place& b) { return a.at < b.at; };
  if (!std::is_sorted(_slotPlaces.begin(), _slotPlaces.end(), inOrder)) {
    std::sort(_slotPlaces.begin(), _slotPlaces.end(), inOrder);
  }
  if (_slot == 0) {
    _places.swap(_slotPlaces);
    _documentsOfPlaces.emplace(_view.documentCount());
  } else {
    for (const Place& place : _places) {
      _documentsOfPlaces->removeAround(documentOf(place.at));
    }
    size_t kept = 0;
    auto other = _slotPlaces.begin();
    for (const Place& place : _places) {
      while (other != _slotPlaces.end() && other->at < place.at) {
        ++other;
      }
      if (other != _slotPlaces.end() && other->at == place.at) {
        _places[kept++] = {place.at, std::min(place.frequency, other->frequency)};
      }
    }
    _places.resize(kept);
  }
  for (const Place& place : _places) {
    _documentsOfPlaces->insert(documentOf(place.at));
  }
  _documentCount = std::min(_documentCount, _slotDocumentCount);
  _slotDocumentCount = 0;
  _slotPlaces.clear();
  _scan.reset();
}

// A phrase is as frequent in a document as the rarest of its words there, and no more: where it
// stands several times, its words do.
void PhraseReader::_finish(Accumulator& found) {
  for (size_t i = 0; i < _places.size();) {
    const uint32_t document = documentOf(_places[i].at);
    float frequency = 0;
    for (; i < _places.size() && documentOf(_places[i].at) == document; ++i) {
      frequency = std::max(frequency, _places[i].frequency);
    }
    found.add(document, frequency);
  }
  _places.clear();
}

}  // namespace searchkit
