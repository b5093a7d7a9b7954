#include "host/Luxwell/LUXBigrams.h"

#include <algorithm>
#include <limits>
#include <numeric>

#include "host/Luxwell/LUXParallel.h"
#include "platform/Exception.h"

namespace {

// Pairs that are sorted at a time, by one thread.
constexpr size_t mostPairsAtOnce = size_t{1} << 22U;
constexpr size_t fewestPairsAtOnce = size_t{1} << 16U;

}  // namespace

void LUXBigrams::find(const Pages& pages, const std::vector<uint32_t>& stemOfNumber,
                      size_t stemCount, size_t threadCount) {
  // How many pairs each stem begins.
  std::vector<uint32_t> counts(stemCount);
  size_t pairCount = 0;
  for (const LUXWordSequence* const page : pages) {
    _pageStarts.push_back(pairCount);
    forEachPair(*page, stemOfNumber, [&](uint32_t first, uint32_t, size_t) {
      ++counts[first];
      ++pairCount;
    });
  }
  if (pairCount >= std::numeric_limits<uint32_t>::max()) {
    throw platform::Exception(platform::invalidArgumentException,
                              "a book too large for semantic data");
  }
  _places.resize(pairCount);
  _starts.assign(stemCount + 1, 0);
  const std::vector<Range> ranges = _ranges(counts, threadCount);
  std::vector<std::vector<uint32_t>> seconds(ranges.size());
  LUXInParallel(ranges.size(), 1, threadCount, [&](size_t range, size_t) {
    _fillRange(pages, stemOfNumber, counts, ranges[range], seconds[range]);
  });
  std::partial_sum(_starts.begin(), _starts.end(), _starts.begin());
  _seconds.reserve(_starts.back());
  for (std::vector<uint32_t>& part : seconds) {
    _seconds.insert(_seconds.end(), part.begin(), part.end());
    std::vector<uint32_t>().swap(part);
  }
}

std::vector<LUXBigrams::Range> LUXBigrams::_ranges(const std::vector<uint32_t>& counts,
                                                   size_t threadCount) {
  const size_t all = std::accumulate(counts.begin(), counts.end(), size_t{0});
  const size_t wanted =
      std::clamp(all / std::max<size_t>(threadCount, 1) + 1, fewestPairsAtOnce, mostPairsAtOnce);
  std::vector<Range> ranges;
  for (uint32_t stem = 0; stem < counts.size(); ++stem) {
    if (ranges.empty() || ranges.back().pairCount + counts[stem] > wanted) {
      ranges.push_back({stem, stem, 0});
    }
    ranges.back().to = stem + 1;
    ranges.back().pairCount += counts[stem];
  }
  return ranges;
}

// Writes how many different pairs each stem of the range begins behind its place in _starts.
void LUXBigrams::_fillRange(const Pages& pages, const std::vector<uint32_t>& stemOfNumber,
                            const std::vector<uint32_t>& counts, const Range& range,
                            std::vector<uint32_t>& seconds) {
  // The second stem above, below how many pairs come before it in the book.
  std::vector<uint64_t> drawers(range.pairCount);
  std::vector<size_t> ends(range.to - range.from);
  for (size_t i = 1; i < ends.size(); ++i) {
    ends[i] = ends[i - 1] + counts[range.from + i - 1];
  }
  uint64_t pair = 0;
  for (const LUXWordSequence* const page : pages) {
    forEachPair(*page, stemOfNumber, [&](uint32_t first, uint32_t second, size_t) {
      if (first >= range.from && first < range.to) {
        drawers[ends[first - range.from]++] = static_cast<uint64_t>(second) << 32U | pair;
      }
      ++pair;
    });
  }
  size_t begin = 0;
  for (size_t i = 0; i < ends.size(); ++i) {
    std::sort(drawers.begin() + static_cast<std::ptrdiff_t>(begin),
              drawers.begin() + static_cast<std::ptrdiff_t>(ends[i]));
    uint32_t count = 0;
    for (size_t at = begin; at < ends[i]; ++at) {
      const auto second = static_cast<uint32_t>(drawers[at] >> 32U);
      if (at == begin || seconds.back() != second) {
        seconds.push_back(second);
        ++count;
      }
      _places[static_cast<uint32_t>(drawers[at])] = count - 1;
    }
    _starts[range.from + i + 1] = count;
    begin = ends[i];
  }
}
