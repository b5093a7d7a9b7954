#include <unicode/ubrk.h>
#include <unicode/utf16.h>

#include <algorithm>
#include <memory>

#include "SearchKit/TextFolding.h"

namespace searchkit {
namespace {

struct CloseBreakIterator {
  void operator()(UBreakIterator* iterator) const noexcept { ubrk_close(iterator); }
};

// Opening one reads the rules and may load a dictionary; a thread keeps its own.
UBreakIterator* threadBreakIterator() {
  thread_local const std::unique_ptr<UBreakIterator, CloseBreakIterator> iterator = [] {
    UErrorCode status = U_ZERO_ERROR;
    std::unique_ptr<UBreakIterator, CloseBreakIterator> opened(
        ubrk_open(UBRK_WORD, "", nullptr, 0, &status));
    if (U_FAILURE(status) != 0) {
      opened.reset();
    }
    return opened;
  }();
  return iterator.get();
}

size_t pieceEnd(std::u16string_view run, size_t begin) {
  if (run.size() - begin <= longestDictionaryPiece) {
    return run.size();
  }
  size_t end = begin + longestDictionaryPiece;
  if (U16_IS_TRAIL(run[end])) {
    --end;
  }
  return end;
}

}  // namespace

void findWordEnds(std::u16string_view run, std::vector<size_t>& ends) {
  UBreakIterator* iterator = threadBreakIterator();
  for (size_t begin = 0; begin < run.size();) {
    const size_t end = pieceEnd(run, begin);
    UErrorCode status = U_ZERO_ERROR;
    if (iterator != nullptr) {
      ubrk_setText(iterator, run.data() + begin, static_cast<int32_t>(end - begin), &status);
    }
    if (iterator != nullptr && U_SUCCESS(status) != 0) {
      for (int32_t at = ubrk_next(iterator); at != UBRK_DONE; at = ubrk_next(iterator)) {
        ends.push_back(begin + static_cast<size_t>(at));
      }
    } else {
      ends.push_back(end);
    }
    begin = end;
  }
}

}  // namespace searchkit
