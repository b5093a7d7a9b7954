// The best few of many.
#pragma once

#include <algorithm>
#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <vector>

/// Keeps the best `count` of the items that are added: those of the highest score, and among equal
/// scores those of the lowest number. Scores are numbers from 0 up. It holds up to twice as many
/// and halves them when full, so that adding one costs the same on average however many are kept.
///
/// An item is one integer, the score's bits before the number's complement: the bits of floats that
/// are not negative are in the order of the floats, so that one comparison does for both. A few
/// hundred items are put in order by classes of scores first: comparing them with each other, which
/// no processor foresees, takes several times as long.
/// Thread-safety: confined to one thread.
class LUXBest {
 public:
  struct Item {
    uint32_t number = 0;
    float score = 0;
  };

  explicit LUXBest(size_t count) : _count(count) {
    _keys.reserve(std::min(_capacity(), mostClassed));
  }

  void add(uint32_t number, float score) {
    if (score < _threshold || _count == 0) {
      return;
    }
    // Adding zero makes a positive zero of a negative one.
    const auto bits = std::bit_cast<uint32_t>(score + 0.0F);
    _keys.push_back(static_cast<uint64_t>(bits) << 32 | ~number);
    if (_keys.size() >= _capacity()) {
      _cut();
    }
  }

  /// What an item must reach to be among the best, or less; 0 while there are fewer than wanted.
  float threshold() const noexcept { return _threshold; }

  /// Brings the threshold near to what it can be.
  void raiseThreshold() {
    if (_keys.size() < _count || _count == 0) {
      return;
    }
    if (_keys.size() > mostClassed) {
      _cut();
      return;
    }
    const Classes classes(_keys);
    size_t reaching = 0;
    for (size_t i = classCount; i-- > 0 && reaching < _count;) {
      reaching += classes.sizes[i];
      if (reaching >= _count) {
        _threshold = std::max(_threshold, classes.lowestScoreOf(i));
      }
    }
  }

  /// The best, best first.
  std::vector<Item> sorted() {
    if (_keys.size() > mostClassed || _keys.size() < fewestClassed) {
      _cut();
      std::sort(_keys.begin(), _keys.end(), std::greater<>());
    } else {
      _sortByClasses();
    }
    std::vector<Item> items(_keys.size());
    std::transform(_keys.begin(), _keys.end(), items.begin(), _item);
    return items;
  }

 private:
  static constexpr size_t fewestClassed = 16;
  static constexpr size_t mostClassed = 4096;
  static constexpr size_t classCount = 128;

  static Item _item(uint64_t key) noexcept { return {~static_cast<uint32_t>(key), _score(key)}; }
  static float _score(uint64_t key) noexcept {
    return std::bit_cast<float>(static_cast<uint32_t>(key >> 32));
  }

  // Scores from the lowest to the highest, divided evenly by their bits, which grow about as their
  // logarithms do: scores are often many small ones and few large ones.
  struct Classes {
    explicit Classes(const std::vector<uint64_t>& keys) {
      lowest = UINT32_MAX;
      uint32_t highest = 0;
      for (const uint64_t key : keys) {
        const auto bits = static_cast<uint32_t>(key >> 32);
        lowest = std::min(lowest, bits);
        highest = std::max(highest, bits);
      }
      while ((highest - lowest) >> shift >= classCount) {
        ++shift;
      }
      for (const uint64_t key : keys) {
        ++sizes[of(key)];
      }
    }

    size_t of(uint64_t key) const noexcept {
      return (static_cast<uint32_t>(key >> 32) - lowest) >> shift;
    }

    float lowestScoreOf(size_t number) const noexcept {
      return std::bit_cast<float>(lowest + (static_cast<uint32_t>(number) << shift));
    }

    uint32_t lowest = 0;
    uint32_t shift = 0;
    std::array<uint32_t, classCount> sizes{};
  };

  size_t _capacity() const noexcept { return 2 * _count + 64; }

  void _cut() {
    if (_keys.size() < _count || _count == 0) {
      return;
    }
    const auto last = _keys.begin() + static_cast<std::ptrdiff_t>(_count) - 1;
    std::nth_element(_keys.begin(), last, _keys.end(), std::greater<>());
    _threshold = _score(*last);
    _keys.resize(_count);
  }

  void _sortByClasses() {
    const Classes classes(_keys);
    // Where each class begins, the highest first, and then where its next item goes.
    std::array<uint32_t, classCount> next;
    uint32_t begin = 0;
    for (size_t i = classCount; i-- > 0;) {
      next[i] = begin;
      begin += classes.sizes[i];
    }
    std::vector<uint64_t> ordered(_keys.size());
    for (const uint64_t key : _keys) {
      ordered[next[classes.of(key)]++] = key;
    }
    for (size_t i = 0; i < classCount; ++i) {
      if (classes.sizes[i] > 1 && next[i] - classes.sizes[i] < _count) {
        const auto end = ordered.begin() + next[i];
        std::sort(end - classes.sizes[i], end, std::greater<>());
      }
    }
    ordered.resize(std::min(ordered.size(), _count));
    _keys = std::move(ordered);
  }

  const size_t _count;
  float _threshold = 0;
  std::vector<uint64_t> _keys;
};
