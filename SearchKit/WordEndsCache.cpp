#include "SearchKit/WordEndsCache.h"

#include <cstring>

#include "SearchKit/TermHash.h"

namespace searchkit {
namespace {

constexpr size_t firstSlotCount = 256;
constexpr size_t mostBytes = size_t{4} << 20;

}  // namespace

// Where the run is, or where it would be.
size_t WordEndsCache::_slotOf(uint32_t hash, std::string_view run) const noexcept {
  size_t at = hash & (_slots.size() - 1);
  for (; _slots[at].at != 0; at = (at + 1) & (_slots.size() - 1)) {
    const Slot& slot = _slots[at];
    if (slot.hash == hash && slot.runLength == run.size() &&
        std::memcmp(_bytes.data() + slot.at - 1, run.data(), run.size()) == 0) {
      break;
    }
  }
  return at;
}

std::span<const uint8_t> WordEndsCache::find(std::string_view run) noexcept {
  if (_count == 0) {
    return {};
  }
  const Slot& slot = _slots[_slotOf(hashOfBytes(run), run)];
  if (slot.at == 0) {
    return {};
  }
  return std::span<const uint8_t>(_bytes).subspan(slot.at - 1 + slot.runLength, slot.endCount);
}

void WordEndsCache::put(std::string_view run, std::span<const size_t> ends) {
  if (run.size() > longestRun) {
    return;
  }
  if (_bytes.size() + run.size() + ends.size() > mostBytes) {
    _bytes.clear();
    _slots.assign(_slots.size(), Slot());
    _count = 0;
  }
  if ((_count + 1) * 2 > _slots.size()) {
    _grow();
  }
  const uint32_t hash = hashOfBytes(run);
  _slots[_slotOf(hash, run)] = {hash, static_cast<uint32_t>(_bytes.size() + 1),
                                static_cast<uint16_t>(run.size()),
                                static_cast<uint16_t>(ends.size())};
  ++_count;
  _bytes.insert(_bytes.end(), run.begin(), run.end());
  for (const size_t end : ends) {
    _bytes.push_back(static_cast<uint8_t>(end));
  }
}

void WordEndsCache::_grow() {
  std::vector<Slot> slots(_slots.empty() ? firstSlotCount : _slots.size() * 2);
  for (const Slot& slot : _slots) {
    if (slot.at == 0) {
      continue;
    }
    size_t at = slot.hash & (slots.size() - 1);
    while (slots[at].at != 0) {
      at = (at + 1) & (slots.size() - 1);
    }
    slots[at] = slot;
  }
  _slots.swap(slots);
}

}  // namespace searchkit
