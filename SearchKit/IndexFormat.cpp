#include "SearchKit/IndexFormat.h"

namespace searchkit::format {

std::string_view sectionName(uint32_t id) noexcept {
  switch (static_cast<Section>(id)) {
    case Section::documents:
      return "documents";
    case Section::documentLengths:
      return "document lengths";
    case Section::blockKeys:
      return "block keys";
    case Section::blockOffsets:
      return "block offsets";
    case Section::dictionary:
      return "dictionary";
    case Section::postings:
      return "postings";
    case Section::storedText:
      return "stored text";
    case Section::positions:
      return "positions";
    case Section::mergedLists:
      return "merged lists";
  }
  return "unknown";
}

}  // namespace searchkit::format
