// Where the words of runs without blanks end, for runs that come again.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string_view>
#include <vector>

namespace searchkit {

/// The same phrases come again and again in a manual, and ICU's dictionaries take half a
/// microsecond a word. Remembers runs as long as there is room, then begins anew.
/// Thread-safety: confined to one thread.
class WordEndsCache {
 public:
  /// Longer runs hardly ever come twice.
  static constexpr size_t longestRun = 255;

  /// The ends that were put in for a run, in bytes; empty when it is not known. Valid until the
  /// next call.
  std::span<const uint8_t> find(std::string_view run) noexcept;

  /// Remembers the ends of the run last sought, which was not known.
  void put(std::string_view run, std::span<const size_t> ends);

 private:
  struct Slot {
    uint32_t hash = 0;
    // Where the run stands among the bytes, plus one; 0 for none. The ends follow it.
    uint32_t at = 0;
    uint16_t runLength = 0;
    uint16_t endCount = 0;
  };

  size_t _slotOf(uint32_t hash, std::string_view run) const noexcept;
  void _grow();

  std::vector<Slot> _slots;
  size_t _count = 0;
  std::vector<uint8_t> _bytes;
};

}  // namespace searchkit
