// The best few of many.
#pragma once

#include <algorithm>
#include <cstddef>
#include <utility>
#include <vector>

/// Keeps the best `count` of the items that are added, in the order of `Better`, a strict order in
/// which a higher `score` comes first. It holds up to twice as many and halves them when full, so
/// that adding one costs the same on average however many are kept.
/// Thread-safety: confined to one thread.
template <typename Item, typename Better>
class LUXBest {
 public:
  LUXBest(size_t count, Better better) : _count(count), _better(std::move(better)) {}

  void add(const Item& item) {
    if (item.score < _threshold || _count == 0) {
      return;
    }
    _items.push_back(item);
    if (_items.size() >= 2 * _count + reserve) {
      _cut();
    }
  }

  /// What an item must reach to be among the best, 0 while there are fewer than wanted. It may be
  /// out of date, which means too low, until settle().
  float threshold() const noexcept { return _threshold; }
  void settle() { _cut(); }

  /// The best, in no particular order.
  const std::vector<Item>& items() {
    _cut();
    return _items;
  }

  /// The best, best first. Nothing is left here.
  std::vector<Item> sorted() {
    _cut();
    std::sort(_items.begin(), _items.end(), _better);
    return std::move(_items);
  }

 private:
  static constexpr size_t reserve = 64;

  void _cut() {
    if (_items.size() < _count || _count == 0) {
      return;
    }
    const auto last = _items.begin() + static_cast<std::ptrdiff_t>(_count) - 1;
    std::nth_element(_items.begin(), last, _items.end(), _better);
    _threshold = last->score;
    _items.erase(last + 1, _items.end());
  }

  const size_t _count;
  const Better _better;
  float _threshold = 0;
  std::vector<Item> _items;
};
