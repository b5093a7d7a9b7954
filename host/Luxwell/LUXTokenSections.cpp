#include "host/Luxwell/LUXTokenSections.h"

#include <algorithm>
#include <array>
#include <bit>
#include <utility>

namespace {

// Sorting by digits looks at each of so many once more, so that few things are sorted by comparing.
constexpr unsigned digitBits = 11;
constexpr size_t digitCount = size_t{1} << digitBits;
constexpr size_t fewestForDigits = 256;

constexpr size_t longestVarnumber = 5;

char* writeVarnumber(char* out, uint64_t value) noexcept {
  for (; value >= 0x80; value >>= 7U) {
    *out++ = static_cast<char>((value & 0x7FU) | 0x80U);
  }
  *out++ = static_cast<char>(value);
  return out;
}

}  // namespace

LUXTokenSections::LUXTokenSections(size_t tokenCount, uint32_t firstWithoutPlace)
    : _tokenBits(static_cast<unsigned>(std::bit_width(tokenCount))),
      _firstWithoutPlace(firstWithoutPlace) {}

void LUXTokenSections::append(std::vector<std::unique_ptr<LUXTokenSections>> parts) {
  size_t recordLength = _records.length();
  size_t placeLength = _places.length();
  for (const auto& part : parts) {
    recordLength += part->_records.length();
    placeLength += part->_places.length();
  }
  _records.reserve(recordLength);
  _places.reserve(placeLength);
  for (auto& part : parts) {
    _records.append(part->_records);
    _places.append(part->_places);
    part.reset();
  }
}

// In order of tokens; in which order a token's occurrences are makes no difference.
void LUXTokenSections::_sort() {
  if (_page.size() < fewestForDigits) {
    std::sort(_page.begin(), _page.end());
    return;
  }
  _sorted.resize(_page.size());
  for (unsigned bit = shift; bit < shift + _tokenBits; bit += digitBits) {
    std::array<uint32_t, digitCount> ends{};
    for (const uint64_t occurrence : _page) {
      ++ends[occurrence >> bit & (digitCount - 1)];
    }
    uint32_t begin = 0;
    for (uint32_t& end : ends) {
      begin += std::exchange(end, begin);
    }
    for (const uint64_t occurrence : _page) {
      _sorted[ends[occurrence >> bit & (digitCount - 1)]++] = occurrence;
    }
    _page.swap(_sorted);
  }
}

void LUXTokenSections::endKind() {
  _sort();
  std::string& records = _inPage ? _records.record() : _records.beginRecord();
  std::string& places = _inPage ? _places.record() : _places.beginRecord();
  _inPage = true;
  std::array<char, 3 * longestVarnumber> bytes;
  for (auto at = _page.begin(); at != _page.end();) {
    const uint64_t token = *at >> shift;
    uint32_t titleCount = 0;
    uint32_t bodyCount = 0;
    uint8_t wordsBefore = LUXTokenCount::farDown;
    for (; at != _page.end() && *at >> shift == token; ++at) {
      const uint32_t inTitle = (*at & title) != 0 ? 1 : 0;
      titleCount += inTitle;
      bodyCount += 1 - inTitle;
      wordsBefore = std::min(wordsBefore, static_cast<uint8_t>(*at));
    }
    const bool isPlain = titleCount == 0 && bodyCount == 1;
    char* out = writeVarnumber(bytes.data(), (token - _next) << 1U | (isPlain ? 0U : 1U));
    if (!isPlain) {
      out = writeVarnumber(out, titleCount);
      out = writeVarnumber(out, bodyCount);
    }
    records.append(bytes.data(), out);
    if (token < _firstWithoutPlace) {
      places.push_back(static_cast<char>(wordsBefore));
    }
    _next = static_cast<uint32_t>(token) + 1;
  }
  _page.clear();
}

void LUXTokenSections::endPage() {
  endKind();
  _inPage = false;
  _next = 0;
}
