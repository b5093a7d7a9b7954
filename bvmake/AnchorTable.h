// Which pages carry which anchors.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "host/Luxwell/LUXNumbering.h"
#include "platform/Value.h"

namespace bvmake {

/// Grows page by page. Thread-safety: confined to one thread.
class AnchorTable {
 public:
  /// Adds a page and its anchors, which must be distinct.
  void addPage(std::string_view path, const std::vector<std::string>& anchors);

  /// Distinct names.
  size_t count() const noexcept { return _names.size(); }

  /// A dictionary from name to array of paths, in the order in which the pages were added. Equal
  /// paths are one shared string, so that the archive holds each once.
  platform::Value value() const;

 private:
  std::vector<platform::Value> _paths;
  LUXStringNumbering _names;
  /// By the numbers of the names.
  std::vector<std::vector<uint32_t>> _pages;
};

}  // namespace bvmake
