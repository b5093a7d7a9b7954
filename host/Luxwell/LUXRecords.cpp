#include "host/Luxwell/LUXRecords.h"

#include <limits>
#include <utility>

#include "host/Luxwell/LUXNumbers.h"
#include "platform/Exception.h"

using luxnumbers::appendUInt32;
using luxnumbers::readUInt32;

LUXRecords::LUXRecords(const platform::Data& section) {
  if (section.length() < 8) {
    return;
  }
  const uint64_t count = readUInt32(section.bytes());
  const uint64_t start = 4 + 4 * (count + 1);
  if (start > section.length()) {
    return;
  }
  const platform::Data bytes = section.slice(start, section.length() - start);
  const platform::Data offsets = section.slice(4, 4 * (count + 1));
  uint32_t before = 0;
  for (uint64_t i = 0; i <= count; ++i) {
    const uint32_t offset = readUInt32(offsets.bytes() + 4 * i);
    if (offset < before || (i == 0 && offset != 0)) {
      return;
    }
    before = offset;
  }
  if (before != bytes.length()) {
    return;
  }
  _count = count;
  _offsets = offsets;
  _bytes = bytes;
}

std::string_view LUXRecords::operator[](size_t i) const noexcept {
  const uint8_t* const offset = _offsets.bytes() + 4 * i;
  const size_t begin = readUInt32(offset);
  return _bytes.view().substr(begin, readUInt32(offset + 4) - begin);
}

void LUXRecordsWriter::append(LUXRecordsWriter& other) {
  const uint64_t begin = _bytes.size();
  for (const uint64_t offset : other._offsets) {
    _offsets.push_back(begin + offset);
  }
  _bytes += other._bytes;
  other._offsets.clear();
  std::string().swap(other._bytes);
}

platform::Data LUXRecordsWriter::finish() {
  if (_bytes.size() > std::numeric_limits<uint32_t>::max()) {
    throw platform::Exception(platform::invalidArgumentException,
                              "a book too large for semantic data");
  }
  std::string out;
  out.reserve(4 * (_offsets.size() + 2) + _bytes.size());
  appendUInt32(out, static_cast<uint32_t>(_offsets.size()));
  for (const uint64_t offset : _offsets) {
    appendUInt32(out, static_cast<uint32_t>(offset));
  }
  appendUInt32(out, static_cast<uint32_t>(_bytes.size()));
  out += _bytes;
  std::string().swap(_bytes);
  return platform::Data::adopt(std::move(out));
}
