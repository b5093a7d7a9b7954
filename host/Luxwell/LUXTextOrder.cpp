#include "host/Luxwell/LUXTextOrder.h"

#include <algorithm>

namespace luxtextorder {

uint64_t beginningOf(std::string_view text) noexcept {
  uint64_t beginning = 0;
  for (size_t i = 0; i < 8; ++i) {
    beginning = beginning << 8U | (i < text.size() ? static_cast<uint8_t>(text[i]) : 0U);
  }
  return beginning;
}

std::vector<uint32_t> order(std::vector<Entry>& entries) {
  std::sort(entries.begin(), entries.end(), [](const Entry& a, const Entry& b) {
    if (a.beginning != b.beginning) {
      return a.beginning < b.beginning;
    }
    const int comparison = a.text.compare(b.text);
    return comparison != 0 ? comparison < 0 : a.number < b.number;
  });
  std::vector<uint32_t> numbers;
  numbers.reserve(entries.size());
  for (const Entry& entry : entries) {
    numbers.push_back(entry.number);
  }
  return numbers;
}

}  // namespace luxtextorder
