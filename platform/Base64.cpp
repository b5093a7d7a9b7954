#include "platform/Base64.h"

#include <cstdint>

namespace platform {
namespace {

constexpr std::string_view alphabet =
    "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

// The six bits that a character stands for, or -1.
int bitsOf(char character) {
  if (character >= 'A' && character <= 'Z') {
    return character - 'A';
  }
  if (character >= 'a' && character <= 'z') {
    return character - 'a' + 26;
  }
  if (character >= '0' && character <= '9') {
    return character - '0' + 52;
  }
  return character == '+' ? 62 : character == '/' ? 63 : -1;
}

bool isBlank(char character) {
  return character == ' ' || character == '\t' || character == '\n' || character == '\r';
}

}  // namespace

std::string base64FromBytes(std::string_view bytes) {
  std::string text;
  text.reserve((bytes.size() + 2) / 3 * 4);
  for (size_t i = 0; i < bytes.size(); i += 3) {
    uint32_t group = 0;
    for (size_t j = 0; j < 3; ++j) {
      group = group << 8 | (i + j < bytes.size() ? static_cast<uint8_t>(bytes[i + j]) : 0U);
    }
    text += alphabet[group >> 18];
    text += alphabet[group >> 12 & 63];
    text += i + 1 < bytes.size() ? alphabet[group >> 6 & 63] : '=';
    text += i + 2 < bytes.size() ? alphabet[group & 63] : '=';
  }
  return text;
}

std::optional<std::string> bytesFromBase64(std::string_view text) {
  std::string bytes;
  bytes.reserve(text.size() / 4 * 3);
  uint32_t group = 0;
  size_t characters = 0;
  size_t padding = 0;
  for (const char character : text) {
    if (isBlank(character)) {
      continue;
    }
    if (character == '=') {
      ++padding;
      continue;
    }
    const int bits = bitsOf(character);
    if (bits < 0 || padding > 0) {
      return std::nullopt;
    }
    group = group << 6 | static_cast<uint32_t>(bits);
    if (++characters % 4 == 0) {
      bytes += static_cast<char>(static_cast<uint8_t>(group >> 16));
      bytes += static_cast<char>(static_cast<uint8_t>(group >> 8));
      bytes += static_cast<char>(static_cast<uint8_t>(group));
    }
  }
  const size_t last = characters % 4;
  if (last == 1 || padding != (4 - last) % 4) {
    return std::nullopt;
  }
  if (last >= 2) {
    group <<= 6 * (4 - last);
    bytes += static_cast<char>(static_cast<uint8_t>(group >> 16));
  }
  if (last == 3) {
    bytes += static_cast<char>(static_cast<uint8_t>(group >> 8));
  }
  return bytes;
}

}  // namespace platform
