#include "platform/Data.h"

#include <fmt/format.h>

#include "platform/Exception.h"

namespace platform {

Data Data::copy(std::string_view bytes) { return adopt(std::string(bytes)); }

Data Data::adopt(std::string bytes) {
  auto owner = std::make_shared<const std::string>(std::move(bytes));
  const auto* first = owner->data();
  const size_t length = owner->size();
  return wrap(first, length, std::move(owner));
}

Data Data::adopt(std::vector<uint8_t> bytes) {
  auto owner = std::make_shared<const std::vector<uint8_t>>(std::move(bytes));
  const auto* first = owner->data();
  const size_t length = owner->size();
  return wrap(first, length, std::move(owner));
}

Data Data::wrap(const void* bytes, size_t length, std::shared_ptr<const void> keepAlive) {
  Data data;
  data._bytes = static_cast<const uint8_t*>(bytes);
  data._length = length;
  data._keepAlive = std::move(keepAlive);
  return data;
}

Data Data::slice(size_t offset, size_t length) const {
  if (offset > _length || length > _length - offset) {
    throw Exception(rangeException,
                    fmt::format("slice of {} bytes at {} is outside data of {} bytes", length,
                                offset, _length));
  }
  Data part;
  part._bytes = _bytes + offset;
  part._length = length;
  part._keepAlive = _keepAlive;
  return part;
}

}  // namespace platform
