// Files of remote books as they are judged when they arrive: exact-match lists and indexes, from
// arbitrary bytes that have the digest that they should have.
#include <cstdint>
#include <cstdlib>
#include <string_view>

#include "host/Zebrine/RNXExpectedAssets.h"
#include "host/Zebrine/ZEBBookLists.h"
#include "platform/Digest.h"
#include "platform/PropertyList.h"

namespace {

void require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::string_view input(reinterpret_cast<const char*>(data), size);
  const auto bytes = platform::Data::copy(input);
  RNXExpectedAsset asset{RNXExpectedAsset::Kind::exactMatch, platform::sha256Digest(input), {}};
  const bool isList = !asset.errorForData(bytes);
  const auto list = platform::propertyListFromData(bytes);
  require(isList == (list && list->dictionaryIf() != nullptr));
  if (isList) {
    for (const auto& entry : *list->dictionaryIf()) {
      const auto anchor = ZEBExactMatchAnchor(*list, entry.first);
      require(!anchor || entry.second.stringIf() != nullptr);
    }
  }
  asset.kind = RNXExpectedAsset::Kind::searchIndex;
  (void)asset.errorForData(bytes);
  asset.sha256[0] = asset.sha256[0] == '0' ? '1' : '0';
  require(asset.errorForData(bytes).has_value());
  return 0;
}
