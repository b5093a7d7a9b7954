// Group lists from arbitrary bytes.
#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>

#include "host/Luxwell/LUXModelGroups.h"

namespace {

void require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::string_view input(reinterpret_cast<const char*>(data), size);
  const auto list = LUXModelGroups::listFromData(platform::Data::copy(input));
  if (!list) {
    return 0;
  }
  const LUXModelGroups groups(*list);
  const auto names = groups.names();
  require(!names.empty() && names.size() <= LUXModelGroups::maximumGroupCount + 1);
  require(std::find(names.begin(), names.end(), groups.defaultGroup()) != names.end());
  for (const std::string& name : names) {
    require(!name.empty() && name.size() <= LUXModelGroups::maximumNameLength);
    require(groups.weightOfGroup(name) >= 0);
    const auto all = groups.booksOfGroup(name, true);
    for (const std::string& book : all) {
      const std::string& own = groups.groupOfBook(book);
      require(groups.booksOfGroup(own, true).contains(book));
      require(groups.weightOfBook(book) >= 0);
      require(groups.propertiesOfBook(book, name)["SmoothingOnly"].boolValue() !=
              groups.booksOfGroup(name, false).contains(book));
      // Where it is for smoothing only it is at home only if it is so everywhere.
      require(groups.booksOfGroup(own, false).contains(book) ||
              !groups.booksOfGroup(name, false).contains(book));
      if (all.size() > 20) {
        break;
      }
    }
  }
  require(groups.groupOfBook("a book that nobody names") == groups.defaultGroup());
  return 0;
}
