// Texts in the order of their bytes.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <string_view>
#include <vector>

/// The numbers from 0 to `count` - 1, in the order of the bytes of the texts that `textOf` has for
/// them; equal texts in the order of their numbers. The texts must stay where they are meanwhile.
template <typename TextOf>
std::vector<uint32_t> LUXOrderOfTexts(size_t count, TextOf textOf);

namespace luxtextorder {

/// A text with its first eight bytes, which mostly tell it from others without a look at it.
struct Entry {
  uint64_t beginning;
  std::string_view text;
  uint32_t number;
};

/// As a number that is less for what comes first. Shorter texts end in zeros.
uint64_t beginningOf(std::string_view text) noexcept;

std::vector<uint32_t> order(std::vector<Entry>& entries);

}  // namespace luxtextorder

template <typename TextOf>
std::vector<uint32_t> LUXOrderOfTexts(size_t count, TextOf textOf) {
  std::vector<luxtextorder::Entry> entries;
  entries.reserve(count);
  for (uint32_t number = 0; number < count; ++number) {
    const std::string_view text = textOf(number);
    entries.push_back({luxtextorder::beginningOf(text), text, number});
  }
  return luxtextorder::order(entries);
}
