#include "bvmake/AnchorTable.h"

#include <utility>

#include "host/Luxwell/LUXTextOrder.h"

namespace bvmake {

void AnchorTable::addPage(std::string_view path, const std::vector<std::string>& anchors) {
  if (anchors.empty()) {
    return;
  }
  const auto page = static_cast<uint32_t>(_paths.size());
  _paths.emplace_back(path);
  for (const std::string& anchor : anchors) {
    const uint32_t name = _names.numberOf(anchor);
    if (name == _pages.size()) {
      _pages.emplace_back();
    }
    _pages[name].push_back(page);
  }
}

platform::Value AnchorTable::value() const {
  platform::Value::Dictionary table;
  // In the dictionary's order each is added at its end.
  for (const uint32_t name :
       LUXOrderOfTexts(_names.size(), [this](uint32_t number) { return _names[number]; })) {
    platform::Value::Array paths;
    paths.reserve(_pages[name].size());
    for (const uint32_t page : _pages[name]) {
      paths.push_back(_paths[page]);
    }
    table.emplace_hint(table.end(), _names[name], std::move(paths));
  }
  return table;
}

}  // namespace bvmake
