// Archives put together by hand, byte by byte, for the tests of the classic archive.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "platform/ClassicArchive.h"

namespace platform::archivebytes {

/// The bytes of hexadecimal digits; blanks are left out.
inline std::string hex(std::string_view digits) {
  std::string result;
  int pending = -1;
  for (const char c : digits) {
    if (c == ' ') {
      continue;
    }
    const int digit = c >= 'a' ? c - 'a' + 10 : c - '0';
    if (pending < 0) {
      pending = digit;
    } else {
      result += static_cast<char>(pending * 16 + digit);
      pending = -1;
    }
  }
  return result;
}

inline std::string byte(int value) { return std::string(1, static_cast<char>(value)); }

/// A little-endian integer in its shortest form.
inline std::string integer(int64_t value) {
  if (value >= -110 && value <= 127) {
    return byte(static_cast<int>(value));
  }
  const int width = value >= -32768 && value <= 32767                 ? 2
                    : value >= -2147483648LL && value <= 2147483647LL ? 4
                                                                      : 8;
  std::string result = byte(width == 2 ? 0x81 : width == 4 ? 0x82 : 0x87);
  for (int i = 0; i < width; ++i) {
    result += byte(static_cast<int>((static_cast<uint64_t>(value) >> (8 * i)) & 0xFFU));
  }
  return result;
}

/// The reference to entry `entry` of either table.
inline std::string reference(int64_t entry) { return integer(entry - 110); }

/// A shared string that is new.
inline std::string newString(std::string_view text) {
  return byte(0x84) + integer(static_cast<int64_t>(text.size())) + std::string(text);
}

/// A class that is new, up to its superclass.
inline std::string newClass(std::string_view name, int version) {
  return byte(0x84) + newString(name) + integer(version);
}

/// 16 bytes.
inline std::string header() { return hex("040b") + "streamtyped" + hex("81e803"); }

/// Header, and a root array of `count` elements up to the first of them; the count is at 47.
/// Strings: 0 "@", 1 "NSArray", 2 "NSObject", 3 "i". Entities: 0 array, 1 NSArray, 2 NSObject.
inline std::string arrayOf(const std::string& count) {
  return header() + newString("@") + hex("84") + newClass("NSArray", 0) + newClass("NSObject", 0) +
         hex("85") + newString("i") + count;
}

/// In an array as above, an array of `count` elements up to the first.
inline std::string innerArrayOf(const std::string& count) { return hex("92 84 93 95") + count; }

/// Header and a root object of a class derived from NSObject, up to its first group.
/// Strings: 0 "@", 1 the class, 2 "NSObject". Entities: 0 object, 1 the class, 2 NSObject.
inline std::string objectOf(std::string_view name, int version) {
  return header() + newString("@") + hex("84") + newClass(name, version) + newClass("NSObject", 0) +
         hex("85");
}

/// An archive of one NSValue with its type code and the bytes under it; the code's literal is
/// at 46.
inline std::string valueOf(std::string_view code, std::string_view content) {
  return objectOf("NSValue", 0) + newString("*") + hex("84") + newString(code) + reference(4) +
         std::string(content) + hex("86");
}

/// The same with a NSNumber.
inline std::string numberOf(std::string_view code, std::string_view content) {
  return header() + newString("@") + hex("84") + newClass("NSNumber", 0) + newClass("NSValue", 0) +
         newClass("NSObject", 0) + hex("85") + newString("*") + hex("84") + newString(code) +
         reference(5) + std::string(content) + hex("86");
}

inline ClassicArchive decodeBytes(const std::string& bytes) {
  return classicarchive::decode(Data::copy(bytes));
}

/// An array within an array and so on, `depth` of them, each the only element of the one around it;
/// closed only where `isClosed`.
inline std::string nestedArrays(size_t depth, bool isClosed = true) {
  std::string result = arrayOf(hex(depth > 1 ? "01" : "00"));
  for (size_t i = 1; i < depth; ++i) {
    result += innerArrayOf(hex(i + 1 < depth ? "01" : "00"));
  }
  return isClosed ? result + std::string(depth, '\x86') : result;
}

/// `levels` arrays, each holding the next one twice; the innermost is empty. With 61 levels, 544
/// bytes that describe 2^60 paths.
inline std::string doublingArrays(int levels) {
  std::string result = arrayOf(hex("02"));
  for (int i = 1; i < levels; ++i) {
    result += innerArrayOf(hex(i + 1 < levels ? "02" : "00"));
  }
  result += hex("86");
  for (int i = levels - 1; i > 0; --i) {
    result += hex("92") + reference(i + 2) + hex("86");
  }
  return result;
}

}  // namespace platform::archivebytes
