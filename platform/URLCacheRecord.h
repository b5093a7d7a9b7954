// One answer as the URL cache keeps it, and its form as a file. Private to the cache.
#pragma once

#include <memory>
#include <optional>
#include <string>

#include "platform/Data.h"
#include "platform/HTTPHeaderFields.h"
#include "platform/URLCache.h"

namespace platform {

/// An answer with what tells which requests it is for. Thread-safety: immutable once shared.
struct URLCacheRecord {
  /// What answers are kept under: the URL without its fragment.
  static std::string keyForRequest(const URLRequest& request);

  /// Null for an answer that must not be kept for the request: it varies by everything, or by who
  /// asks where somebody does.
  static std::shared_ptr<const URLCacheRecord> recordWithCachedResponse(
      std::shared_ptr<const CachedURLResponse> cachedResponse, const URLRequest& request);

  /// The record that a file holds, as docs/formats/url-cache.md has it; its body is a slice of
  /// `file`. Null for anything that is not whole, or not written by encoded().
  static std::shared_ptr<const URLCacheRecord> decoded(const Data& file);
  Data encoded() const;
  /// Puts the checksum of a file right, whatever the file holds; one too short for it stays as it
  /// is.
  static void repairChecksum(std::string& file);

  /// Whether the request has the header fields that the answer was given for.
  bool matches(const URLRequest& request) const;

  /// Bytes that it takes in memory and, all but exactly, on disk.
  size_t size() const;

  std::string key;
  /// The request's values of the fields that the answer varies by; empty where it had none.
  HTTPHeaderFields variedFields;
  std::shared_ptr<const CachedURLResponse> cachedResponse;
};

/// A number of 64 bits that tells strings apart, the same on every machine.
uint64_t hashOfBytes(std::string_view bytes, uint64_t seed);

}  // namespace platform
