#include "SearchKit/TermScan.h"

namespace searchkit {

TermScan::Outcome TermScan::next(WorkBudget& budget) noexcept {
  const std::string_view prefix = _pattern->literalPrefix();
  while (_state != State::after) {
    const bool isThere = _state == State::before ? _cursor.seek(prefix) : _cursor.next();
    _state = State::within;
    if (!isThere || !_cursor.term().starts_with(prefix)) {
      break;
    }
    const bool hasTime = budget.spend(1);
    if (_pattern->matches(_cursor.term())) {
      if (_pattern->isExact()) {
        _state = State::after;
      }
      return Outcome::found;
    }
    if (_pattern->isExact()) {
      break;
    }
    if (!hasTime) {
      return Outcome::outOfTime;
    }
  }
  _state = State::after;
  return Outcome::finished;
}

bool TermScan::isExact() const noexcept {
  return _pattern->pieces.size() == 1 && _cursor.term() == _pattern->pieces.front();
}

}  // namespace searchkit
