#include "host/Luxwell/LUXTokenSections.h"

#include <algorithm>

#include "host/Luxwell/LUXNumbers.h"

using luxnumbers::appendVarnumber;

void LUXTokenSections::finish() {
  std::array<std::vector<std::string>, LUXTokenKindCount> sorted;
  uint32_t start = 0;
  for (size_t kind = 0; kind < LUXTokenKindCount; ++kind) {
    std::vector<std::string>& names = _names[kind];
    std::vector<bool> isUsed(names.size(), false);
    for (const Page& page : _pages) {
      for (const LUXTokenCounts::Entry& entry : page[kind]) {
        isUsed[entry.number] = true;
      }
    }
    std::vector<uint32_t> order;
    for (uint32_t number = 0; number < names.size(); ++number) {
      if (isUsed[number]) {
        order.push_back(number);
      }
    }
    std::sort(order.begin(), order.end(),
              [&](uint32_t a, uint32_t b) { return names[a] < names[b]; });
    _numbers[kind].assign(names.size(), 0);
    for (const uint32_t number : order) {
      if (sorted[kind].empty() || sorted[kind].back() != names[number]) {
        sorted[kind].push_back(std::move(names[number]));
      }
      _numbers[kind][number] = start + static_cast<uint32_t>(sorted[kind].size() - 1);
    }
    start += static_cast<uint32_t>(sorted[kind].size());
  }
  _table = LUXTokenTable::withTokens(sorted);
}

LUXRecordsWriter LUXTokenSections::countRecords() const {
  LUXRecordsWriter records;
  std::vector<LUXTokenCounts::Entry> all;
  for (const Page& page : _pages) {
    all.clear();
    for (size_t kind = 0; kind < LUXTokenKindCount; ++kind) {
      for (LUXTokenCounts::Entry entry : page[kind]) {
        entry.number = _numbers[kind][entry.number];
        all.push_back(entry);
      }
    }
    std::sort(all.begin(), all.end(),
              [](const auto& a, const auto& b) { return a.number < b.number; });
    std::string& bytes = records.beginRecord();
    uint32_t next = 0;
    for (size_t i = 0; i < all.size();) {
      LUXTokenCounts::Entry sum = all[i];
      for (++i; i < all.size() && all[i].number == sum.number; ++i) {
        sum.titleCount += all[i].titleCount;
        sum.bodyCount += all[i].bodyCount;
      }
      const bool isPlain = sum.titleCount == 0 && sum.bodyCount == 1;
      appendVarnumber(bytes, static_cast<uint64_t>(sum.number - next) << 1U | (isPlain ? 0U : 1U));
      if (!isPlain) {
        appendVarnumber(bytes, sum.titleCount);
        appendVarnumber(bytes, sum.bodyCount);
      }
      next = sum.number + 1;
    }
  }
  return records;
}
