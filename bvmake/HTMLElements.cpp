#include "bvmake/HTMLElements.h"

#include <algorithm>
#include <array>
#include <string>
#include <unordered_map>

#include "bvmake/ASCII.h"

namespace bvmake {

namespace {

using namespace elementtraits;

using Table = std::unordered_map<std::string_view, ElementTraits>;

const Table& elementTable() {
  static const Table table = {
      {"html", root},
      {"body", root | block},
      {"title", title},
      {"meta", meta},
      {"a", link},

      {"script", skipped},
      {"style", skipped},
      {"template", skipped},
      {"noscript", skipped},
      {"svg", skipped},
      {"iframe", skipped},
      {"canvas", skipped},
      {"audio", skipped},
      {"video", skipped},
      {"select", skipped},
      {"datalist", skipped},
      {"button", skipped},
      {"textarea", skipped},
      {"annotation", skipped},
      {"annotation-xml", skipped},
      {"rt", skipped},
      {"rp", skipped},
      {"nav", skipped | block},
      {"menu", skipped | block},
      {"dialog", hiddenUnlessOpen | block},

      {"header", chrome | block},
      {"footer", chrome | block},
      {"aside", chrome | block},
      {"main", mainContent | block},
      {"article", contentUnit | block},
      {"section", contentUnit | block},

      {"h1", heading | block},
      {"h2", heading | block},
      {"h3", heading | block},
      {"h4", heading | block},
      {"h5", heading | block},
      {"h6", heading | block},

      {"p", prose | block},
      {"blockquote", prose | block},
      {"dd", prose | block},
      {"div", block},
      {"center", block},
      {"address", block},
      {"form", block},
      {"fieldset", block},
      {"details", block},
      {"figure", block},
      {"hgroup", block},
      {"hr", block},
      {"br", 0},
      {"ul", notProse | block},
      {"ol", notProse | block},
      {"dir", notProse | block},
      {"dl", notProse | block},
      {"li", notProse | block},
      {"dt", notProse | block},
      {"legend", notProse | block},
      {"summary", notProse | block},
      {"figcaption", notProse | block},
      {"table", neverProse | block},
      {"caption", neverProse | block},
      {"thead", neverProse | block},
      {"tbody", neverProse | block},
      {"tfoot", neverProse | block},
      {"tr", neverProse | block},
      {"td", neverProse | block},
      {"th", neverProse | block},
      {"pre", neverProse | block},
      {"listing", neverProse | block},
      {"xmp", neverProse | block},
      {"plaintext", neverProse | block},
  };
  return table;
}

}  // namespace

ElementTraits traitsOfElement(std::string_view name) {
  const Table& table = elementTable();
  const auto found = table.find(name);
  return found == table.end() ? 0 : found->second;
}

ElementTraits traitsOfRole(std::string_view role) {
  // Of several roles the first is the one that counts.
  const std::string_view list = trimmed(role);
  const std::string first = lowercased(list.substr(0, list.find_first_of(" \t\n\f\r")));
  constexpr std::array<std::string_view, 6> left = {"navigation", "search",  "menu",
                                                    "menubar",    "toolbar", "tablist"};
  if (std::find(left.begin(), left.end(), first) != left.end()) {
    return skipped;
  }
  if (first == "banner" || first == "contentinfo" || first == "complementary") {
    return chrome;
  }
  if (first == "main") {
    return mainContent;
  }
  return first == "article" ? contentUnit : 0;
}

bool styleHides(std::string_view style) {
  std::string plain = lowercased(style);
  std::erase_if(plain, isBlank);
  return plain.find("display:none") != std::string::npos ||
         plain.find("visibility:hidden") != std::string::npos;
}

}  // namespace bvmake
