#include "SearchKit/SearchScratch.h"

#include <utility>

namespace searchkit {
namespace {

// More than this is not kept between searches: a very large index would hold the memory of every
// thread that ever searched it.
constexpr uint32_t largestKeptDocumentCount = 1 << 18;

std::unique_ptr<SearchScratch>& threadScratch() {
  thread_local std::unique_ptr<SearchScratch> scratch;
  return scratch;
}

}  // namespace

void ScratchLease::take(uint32_t documentCount) {
  _scratch = std::move(threadScratch());
  if (_scratch == nullptr) {
    _scratch = std::make_unique<SearchScratch>();
  }
  _scratch->fit(documentCount);
  _isClean = true;
}

void ScratchLease::giveBack() noexcept {
  if (_scratch != nullptr && _isClean && _scratch->found.size() <= largestKeptDocumentCount) {
    threadScratch() = std::move(_scratch);
  }
  _scratch.reset();
}

}  // namespace searchkit
