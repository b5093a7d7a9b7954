#include "plugin/keyword/KeptList.h"

#include <algorithm>
#include <iterator>

void KeptList::add(SKDocumentID id, float score) {
  const bool full = count() >= limit;
  if (full && score > _minimum) {
    _replaceMinimum(id, score);
  } else if (!full || score == _minimum) {
    _append(id, score);
  }
}

void KeptList::clear() noexcept {
  _ids.clear();
  _scores.clear();
  _capacity = 0;
  _minimum = 0;
  _minimumPosition = 0;
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
  // The smallest of several stretches side by side, which do not wait for each other; then where it
  // is first.
  constexpr size_t stretches = 8;
  float smallest[stretches];
  std::fill(std::begin(smallest), std::end(smallest), _scores[0]);
  const float* const scores = _scores.data();
  const size_t whole = count() / stretches * stretches;
  for (size_t i = 0; i < whole; i += stretches) {
    for (size_t j = 0; j < stretches; ++j) {
      smallest[j] = scores[i + j] < smallest[j] ? scores[i + j] : smallest[j];
    }
  }
  _minimum = *std::min_element(std::begin(smallest), std::end(smallest));
  for (size_t i = whole; i < count(); ++i) {
    _minimum = std::min(_minimum, scores[i]);
  }
  // A score that is no number equals nothing, but then it was the first.
  const auto first = std::find(_scores.begin(), _scores.end(), _minimum);
  _minimumPosition = first == _scores.end() ? 0 : static_cast<size_t>(first - _scores.begin());
}
