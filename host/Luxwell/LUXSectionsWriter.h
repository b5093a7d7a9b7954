// Collects the sections of a model.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <vector>

#include "host/Luxwell/LUXSectionedData.h"
#include "platform/Data.h"

/// Thread-safety: confined to one thread.
class LUXSectionsWriter {
 public:
  void addBytes(uint32_t type, platform::Data bytes) {
    _sections.push_back(LUXSection::sectionWithBytes(type, std::move(bytes)));
  }

  void addText(uint32_t type, std::string text) {
    addBytes(type, platform::Data::adopt(std::move(text)));
  }

  /// Takes the items without copying them.
  template <typename Item>
  void addItems(uint32_t type, std::vector<Item> items) {
    static_assert(std::is_trivially_copyable_v<Item>);
    auto owner = std::make_shared<const std::vector<Item>>(std::move(items));
    const void* bytes = owner->data();
    const size_t length = owner->size() * sizeof(Item);
    addBytes(type, platform::Data::wrap(bytes, length, std::move(owner)));
  }

  /// Sections that share the bytes collected so far.
  const std::vector<LUXSection>& sections() const noexcept { return _sections; }

 private:
  std::vector<LUXSection> _sections;
};

/// Strings on their way into a section of offsets and one of text.
struct LUXTextColumn {
  std::vector<uint32_t> offsets{0};
  std::string text;

  /// Throws platform::Exception "InvalidArgumentException" above 4 GiB.
  void add(std::string_view string);
};
