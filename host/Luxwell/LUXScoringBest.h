// The best few of many.
#pragma once

#include <algorithm>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <vector>

/// Keeps the best `count` of the items that are added: those of the highest score, and among equal
/// scores those of the lowest number. Scores are 0 or above, and numbers. It holds up to twice as
/// many and halves them when full, so that adding one costs the same on average however many are
/// kept.
///
/// An item is one integer, the score's bits before the number's complement: the bits of floats that
/// are not negative are in the order of the floats, so that one comparison does for both.
/// Thread-safety: confined to one thread.
class LUXBest {
 public:
  struct Item {
    uint32_t number = 0;
    float score = 0;
  };

  explicit LUXBest(size_t count) : _count(count) {
    _keys.reserve(std::min(_capacity(), mostReserved));
  }

  void add(uint32_t number, float score) {
    if (score < _threshold || _count == 0) {
      return;
    }
    // Adding zero makes a positive zero of a negative one.
    const auto bits = std::bit_cast<uint32_t>(score + 0.0F);
    _keys.push_back(static_cast<uint64_t>(bits) << 32 | ~number);
    if (_keys.size() >= _capacity()) {
      settle();
    }
  }

  /// What an item must reach to be among the best, 0 while there are fewer than wanted. It may be
  /// out of date, which means too low, until settle().
  float threshold() const noexcept { return _threshold; }

  void settle() {
    if (_keys.size() < _count || _count == 0) {
      return;
    }
    const auto last = _keys.begin() + static_cast<std::ptrdiff_t>(_count) - 1;
    std::nth_element(_keys.begin(), last, _keys.end(), std::greater<>());
    _threshold = _item(*last).score;
    _keys.resize(_count);
  }

  /// The best, best first.
  std::vector<Item> sorted() {
    settle();
    std::sort(_keys.begin(), _keys.end(), std::greater<>());
    std::vector<Item> items(_keys.size());
    std::transform(_keys.begin(), _keys.end(), items.begin(), _item);
    return items;
  }

 private:
  static constexpr size_t mostReserved = 4096;

  size_t _capacity() const noexcept { return 2 * _count + 64; }

  static Item _item(uint64_t key) noexcept {
    return {~static_cast<uint32_t>(key), std::bit_cast<float>(static_cast<uint32_t>(key >> 32))};
  }

  const size_t _count;
  float _threshold = 0;
  std::vector<uint64_t> _keys;
};
