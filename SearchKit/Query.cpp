#include "SearchKit/Query.h"

namespace searchkit {

bool TermPattern::matches(std::string_view term) const noexcept {
  size_t first = 0;
  size_t last = pieces.size();
  if (!isOpenAtStart) {
    if (!term.starts_with(pieces.front())) {
      return false;
    }
    term.remove_prefix(pieces.front().size());
    first = 1;
  }
  if (!isOpenAtEnd) {
    if (first == last) {
      return term.empty();
    }
    if (!term.ends_with(pieces.back())) {
      return false;
    }
    term.remove_suffix(pieces.back().size());
    --last;
  }
  for (size_t i = first; i < last; ++i) {
    const size_t at = term.find(pieces[i]);
    if (at == std::string_view::npos) {
      return false;
    }
    term.remove_prefix(at + pieces[i].size());
  }
  return true;
}

}  // namespace searchkit
