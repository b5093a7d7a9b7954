// Bytes with a keep-alive: the currency between files, archives and indexes.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace platform {

/// An immutable range of bytes together with whatever keeps those bytes alive.
///
/// The bytes may belong to a buffer (`copy`, `adopt`) or to a file mapping (`wrap`, see
/// FileManager::contentsMappedAtPath). A slice shares the keep-alive of the data that it was cut
/// from, so it costs two words and a reference count, never a copy, and stays valid after the
/// original is gone.
///
/// Thread-safety: immutable; copies may be used from any thread.
class Data {
 public:
  /// No bytes. Equal to any other empty data; "no data at all" is an absent std::optional<Data>.
  Data() noexcept = default;

  static Data copy(std::string_view bytes);
  static Data adopt(std::string bytes);
  static Data adopt(std::vector<uint8_t> bytes);

  /// Bytes that `keepAlive` owns in some way. The caller promises that they neither move nor
  /// change while `keepAlive` lives.
  static Data wrap(const void* bytes, size_t length, std::shared_ptr<const void> keepAlive);

  const uint8_t* bytes() const noexcept { return _bytes; }
  size_t length() const noexcept { return _length; }
  bool empty() const noexcept { return _length == 0; }
  std::span<const uint8_t> span() const noexcept { return {_bytes, _length}; }
  std::string_view view() const noexcept {
    return {reinterpret_cast<const char*>(_bytes), _length};
  }

  /// The bytes [offset, offset + length). Throws Exception "RangeException" when they do not all
  /// lie inside this data.
  Data slice(size_t offset, size_t length) const;

  /// Byte-wise; identity of the buffers does not matter.
  friend bool operator==(const Data& a, const Data& b) noexcept { return a.view() == b.view(); }

 private:
  const uint8_t* _bytes = nullptr;
  size_t _length = 0;
  std::shared_ptr<const void> _keepAlive;
};

}  // namespace platform
