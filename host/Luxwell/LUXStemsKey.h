// When two texts say the same with the same words.
#pragma once

#include <algorithm>
#include <cstdint>
#include <string_view>
#include <vector>

/// A number that is the same for the same stems in whatever order, and nearly always another for
/// others: FNV-1a over the sorted stems, a byte that no stem has behind each. Part of the model
/// format.
inline uint32_t LUXStemsKey(std::vector<std::string_view> stems) {
  std::sort(stems.begin(), stems.end());
  uint32_t key = 0x811C9DC5;
  const auto add = [&key](uint8_t byte) { key = (key ^ byte) * 0x01000193; };
  for (const std::string_view stem : stems) {
    for (const char byte : stem) {
      add(static_cast<uint8_t>(byte));
    }
    add(0xFF);
  }
  return key;
}
