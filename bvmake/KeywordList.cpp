#include "bvmake/KeywordList.h"

#include <utility>

#include "bvmake/TextRun.h"
#include "bvmake/UTF8.h"

namespace bvmake {

namespace {

bool isSeparator(UChar32 character) {
  switch (character) {
    case ',':
    case ';':
    case 0x060C:  // Arabic comma
    case 0x061B:  // Arabic semicolon
    case 0x3001:  // ideographic comma
    case 0xFF0C:  // full-width comma
    case 0xFF1B:  // full-width semicolon
      return true;
    default:
      return false;
  }
}

}  // namespace

void addKeywords(std::string_view list, std::vector<std::string>& keywords) {
  const auto add = [&keywords](std::string_view entry) {
    if (std::string text = collapsedText(entry); !text.empty()) {
      keywords.push_back(std::move(text));
    }
  };
  size_t start = 0;
  size_t at = 0;
  while (at < list.size()) {
    const size_t characterStart = at;
    if (isSeparator(nextCharacter(list, at))) {
      add(list.substr(start, characterStart - start));
      start = at;
    }
  }
  add(list.substr(start));
}

}  // namespace bvmake
