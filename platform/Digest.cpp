#include "platform/Digest.h"

#include <nettle/sha2.h>

#include <algorithm>
#include <array>

namespace platform {

namespace {

constexpr std::string_view digits = "0123456789abcdef";

}  // namespace

std::string sha256Digest(std::string_view bytes) {
  sha256_ctx context;
  sha256_init(&context);
  sha256_update(&context, bytes.size(), reinterpret_cast<const uint8_t*>(bytes.data()));
  std::array<uint8_t, SHA256_DIGEST_SIZE> digest;
  sha256_digest(&context, digest.size(), digest.data());
  std::string text;
  text.reserve(2 * digest.size());
  for (const uint8_t byte : digest) {
    text += digits[byte >> 4];
    text += digits[byte & 0xF];
  }
  return text;
}

bool isSHA256Digest(std::string_view text) {
  return text.size() == size_t{2} * SHA256_DIGEST_SIZE &&
         std::all_of(text.begin(), text.end(),
                     [](char c) { return digits.find(c) != std::string_view::npos; });
}

}  // namespace platform
