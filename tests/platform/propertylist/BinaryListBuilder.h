// Binary property lists put together by hand, so that tests can say what no writer would.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Data.h"

namespace platform::test {

/// `number` in `size` big-endian bytes.
inline std::string bigEndian(uint64_t number, size_t size) {
  std::string bytes;
  for (size_t i = size; i-- > 0;) {
    bytes += static_cast<char>(static_cast<uint8_t>(number >> (8 * i)));
  }
  return bytes;
}

/// Bytes from pairs of hexadecimal digits; blanks between them do not count.
inline std::string bytesFromHex(std::string_view hex) {
  std::string bytes;
  int high = -1;
  for (const char character : hex) {
    if (character == ' ' || character == '\n') {
      continue;
    }
    const int digit = character <= '9' ? character - '0' : character - 'a' + 10;
    if (high < 0) {
      high = digit;
    } else {
      bytes += static_cast<char>(high << 4 | digit);
      high = -1;
    }
  }
  return bytes;
}

/// A marker byte with a count that may need an integer of its own.
inline std::string marker(int type, size_t count) {
  if (count < 15) {
    return std::string(1, static_cast<char>(type << 4 | static_cast<int>(count)));
  }
  return std::string(1, static_cast<char>(type << 4 | 15)) + "\x12" + bigEndian(count, 4);
}

/// The objects as they stand, with offset table and trailer; every field of the trailer can be
/// set to what it should not be.
struct BinaryListBuilder {
  std::vector<std::string> objects;
  size_t offsetSize = 4;
  size_t referenceSize = 2;
  uint64_t top = 0;

  /// Adds an object and returns its number.
  size_t add(std::string bytes) {
    objects.push_back(std::move(bytes));
    return objects.size() - 1;
  }

  std::string references(const std::vector<size_t>& numbers) const {
    std::string bytes;
    for (const size_t number : numbers) {
      bytes += bigEndian(number, referenceSize);
    }
    return bytes;
  }

  std::string array(const std::vector<size_t>& numbers) const {
    return marker(0xA, numbers.size()) + references(numbers);
  }

  std::string dictionary(const std::vector<size_t>& keys, const std::vector<size_t>& values) const {
    return marker(0xD, keys.size()) + references(keys) + references(values);
  }

  static std::string text(std::string_view text) {
    return marker(0x5, text.size()) + std::string(text);
  }

  std::string bytes() const {
    std::string list = "bplist00";
    std::string table;
    for (const std::string& object : objects) {
      table += bigEndian(list.size(), offsetSize);
      list += object;
    }
    return list + table + trailer(objects.size(), list.size());
  }

  std::string trailer(uint64_t count, uint64_t table) const {
    return std::string(6, '\0') + bigEndian(offsetSize, 1) + bigEndian(referenceSize, 1) +
           bigEndian(count, 8) + bigEndian(top, 8) + bigEndian(table, 8);
  }

  Data data() const { return Data::adopt(bytes()); }
};

/// A list of one object.
inline Data listOf(std::string object) {
  BinaryListBuilder builder;
  builder.add(std::move(object));
  return builder.data();
}

}  // namespace platform::test
