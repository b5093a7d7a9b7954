#include "host/Luxwell/LUXTokenSections.h"

#include <algorithm>
#include <numeric>
#include <utility>

#include "host/Luxwell/LUXNumbers.h"

using luxnumbers::appendVarnumber;

LUXTokenSections::LUXTokenSections(Names names) {
  Names sorted;
  uint32_t start = 0;
  for (size_t kind = 0; kind < LUXTokenKindCount; ++kind) {
    std::vector<uint32_t> order(names[kind].size());
    std::iota(order.begin(), order.end(), 0);
    std::sort(order.begin(), order.end(),
              [&](uint32_t a, uint32_t b) { return names[kind][a] < names[kind][b]; });
    _numbers[kind].resize(order.size());
    for (const uint32_t number : order) {
      if (sorted[kind].empty() || sorted[kind].back() != names[kind][number]) {
        sorted[kind].push_back(std::move(names[kind][number]));
      }
      _numbers[kind][number] = start + static_cast<uint32_t>(sorted[kind].size() - 1);
    }
    start += static_cast<uint32_t>(sorted[kind].size());
  }
  _table = LUXTokenTable::withTokens(sorted);
}

void LUXTokenSections::append(Pages& pages) {
  _records.append(pages._records);
  _places.append(pages._places);
}

void LUXTokenSections::Pages::endPage() {
  std::sort(_page.begin(), _page.end(),
            [](const auto& a, const auto& b) { return a.number < b.number; });
  std::string& bytes = _records.beginRecord();
  std::string& places = _places.beginRecord();
  const uint32_t firstWithoutPlace = _sections._table->startOfKind(LUXTokenKind::phrase);
  uint32_t next = 0;
  for (size_t i = 0; i < _page.size();) {
    LUXTokenCounts::Entry sum = _page[i];
    for (++i; i < _page.size() && _page[i].number == sum.number; ++i) {
      sum.titleCount += _page[i].titleCount;
      sum.bodyCount += _page[i].bodyCount;
      sum.wordsBefore = std::min(sum.wordsBefore, _page[i].wordsBefore);
    }
    const bool isPlain = sum.titleCount == 0 && sum.bodyCount == 1;
    appendVarnumber(bytes, static_cast<uint64_t>(sum.number - next) << 1U | (isPlain ? 0U : 1U));
    if (!isPlain) {
      appendVarnumber(bytes, sum.titleCount);
      appendVarnumber(bytes, sum.bodyCount);
    }
    if (sum.number < firstWithoutPlace) {
      places.push_back(static_cast<char>(sum.wordsBefore));
    }
    next = sum.number + 1;
  }
  _page.clear();
}
