#include "plugin/keyword/KeptList.h"

void KeptList::add(SKDocumentID id, float score) {
  const bool full = count() >= limit;
  if (full && score > _minimum) {
    _replaceMinimum(id, score);
  } else if (!full || score == _minimum) {
    _append(id, score);
  }
}

void KeptList::_append(SKDocumentID id, float score) {
  if (count() == _capacity) {
    _capacity = _capacity == 0 ? initialCapacity : _capacity + _capacity / 2 + 1;
    _ids.reserve(_capacity);
    _scores.reserve(_capacity);
  }
  if (empty() || score < _minimum) {
    _minimum = score;
    _minimumPosition = count();
  }
  _ids.push_back(id);
  _scores.push_back(score);
}

void KeptList::_replaceMinimum(SKDocumentID id, float score) {
  _ids[_minimumPosition] = id;
  _scores[_minimumPosition] = score;
  _minimum = _scores[0];
  _minimumPosition = 0;
  for (size_t i = 1; i < count(); ++i) {
    if (_scores[i] < _minimum) {
      _minimum = _scores[i];
      _minimumPosition = i;
    }
  }
}
