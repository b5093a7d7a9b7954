#include "bvmake/AnchorTable.h"

#include <utility>

namespace bvmake {

void AnchorTable::addPage(std::string_view path, const std::vector<std::string>& anchors) {
  if (anchors.empty()) {
    return;
  }
  const auto page = static_cast<uint32_t>(_paths.size());
  _paths.emplace_back(path);
  for (const std::string& anchor : anchors) {
    _pages[anchor].push_back(page);
  }
}

platform::Value AnchorTable::value() const {
  platform::Value::Dictionary table;
  for (const auto& entry : _pages) {
    platform::Value::Array paths;
    paths.reserve(entry.second.size());
    for (const uint32_t page : entry.second) {
      paths.push_back(_paths[page]);
    }
    table.emplace(entry.first, std::move(paths));
  }
  return table;
}

}  // namespace bvmake
