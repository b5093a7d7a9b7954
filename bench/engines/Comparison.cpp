#include "bench/engines/Comparison.h"

#include <fmt/format.h>

#include <algorithm>
#include <stdexcept>

namespace engines {

namespace {

std::vector<uint64_t> pagesOf(const std::vector<Found>& found) {
  std::vector<uint64_t> pages;
  pages.reserve(found.size());
  for (const Found& one : found) {
    pages.push_back(uint64_t{one.book} << 32 | one.page);
  }
  std::sort(pages.begin(), pages.end());
  return pages;
}

}  // namespace

size_t requireSameResults(const std::vector<Engine*>& engines,
                          const std::vector<Question>& questions) {
  size_t total = 0;
  std::vector<Found> found;
  for (const Question& question : questions) {
    std::vector<uint64_t> wanted;
    for (const Engine* const first = engines.front(); Engine* const engine : engines) {
      engine->search(question, found);
      std::vector<uint64_t> pages = pagesOf(found);
      if (engine == first) {
        wanted = std::move(pages);
        total += wanted.size();
      } else if (pages != wanted) {
        throw std::runtime_error(fmt::format("\"{}\" ({}): {} finds {} pages, {} finds {}",
                                             question.text(), question.isAny ? "any" : "all",
                                             first->name(), wanted.size(), engine->name(),
                                             pages.size()));
      }
    }
  }
  return total;
}

}  // namespace engines
