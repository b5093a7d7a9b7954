#include "bvmake/HTMLElements.h"

#include <libxml/HTMLparser.h>

#include <algorithm>
#include <array>
#include <iterator>
#include <string>
#include <vector>

#include "bvmake/ASCII.h"
#include "host/Luxwell/LUXNumbering.h"

namespace bvmake {

namespace {

using namespace elementtraits;

struct Row {
  const char* name;
  ElementTraits traits;
};

constexpr Row rows[] = {
    {"html", root | noText},
    {"body", root | block},
    {"title", title},
    {"meta", meta},
    {"a", link | endsBeforeItself},

    {"script", skipped | rawText},
    {"style", skipped | rawText},
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

    {"p", prose | block | endsBeforeItself | endsWithParent},
    {"blockquote", prose | block},
    {"dd", prose | block | endsWithParent},
    {"div", block},
    {"center", block},
    {"address", block},
    {"form", block | endsBeforeItself},
    {"fieldset", block},
    {"details", block},
    {"figure", block},
    {"hgroup", block},
    {"hr", block},
    {"br", lineBreak},
    {"ul", notProse | block},
    {"ol", notProse | block},
    {"dir", notProse | block},
    {"dl", notProse | block},
    {"li", notProse | block | endsBeforeItself | endsWithParent},
    {"dt", notProse | block | endsWithParent},
    {"legend", notProse | block},
    {"summary", notProse | block},
    {"figcaption", notProse | block},
    {"table", neverProse | block},
    {"caption", neverProse | block},
    {"thead", neverProse | block},
    {"tbody", neverProse | block | endsBeforeItself},
    {"tfoot", neverProse | block},
    {"tr", neverProse | block | endsBeforeItself},
    {"td", neverProse | block | endsBeforeItself},
    {"th", neverProse | block | endsBeforeItself},
    {"pre", neverProse | block},
    {"listing", neverProse | block},
    {"xmp", neverProse | block},
    {"plaintext", neverProse | block},

    {"abbr", 0},
    {"acronym", 0},
    {"applet", 0},
    {"area", 0},
    {"b", 0},
    {"base", 0},
    {"basefont", 0},
    {"bdi", 0},
    {"bdo", 0},
    {"big", 0},
    {"cite", 0},
    {"code", 0},
    {"col", endsBeforeItself},
    {"colgroup", endsBeforeItself},
    {"data", 0},
    {"del", 0},
    {"dfn", 0},
    {"em", 0},
    {"embed", 0},
    {"font", 0},
    {"frame", 0},
    {"frameset", 0},
    {"i", 0},
    {"img", 0},
    {"input", 0},
    {"ins", 0},
    {"isindex", 0},
    {"kbd", 0},
    {"label", 0},
    {"link", 0},
    {"map", 0},
    {"mark", 0},
    {"math", 0},
    {"meter", 0},
    {"noframes", 0},
    {"object", 0},
    {"optgroup", 0},
    {"option", endsBeforeItself},
    {"output", 0},
    {"param", 0},
    {"picture", 0},
    {"progress", 0},
    {"q", 0},
    {"ruby", 0},
    {"s", 0},
    {"samp", 0},
    {"search", 0},
    {"slot", 0},
    {"small", 0},
    {"source", 0},
    {"span", 0},
    {"strike", 0},
    {"strong", 0},
    {"sub", 0},
    {"sup", 0},
    {"time", 0},
    {"track", 0},
    {"tt", 0},
    {"u", 0},
    {"var", 0},
    {"wbr", 0},
    {"head", noText},
};
static_assert(std::size(rows) <= maximumElementCount);

// No less than any name that is known.
constexpr size_t longestName = 20;

class Elements {
 public:
  Elements() {
    for (const Row& row : rows) {
      const htmlElemDesc* const known = htmlTagLookup(reinterpret_cast<const xmlChar*>(row.name));
      const bool isEmpty = known != nullptr && known->empty != 0;
      const size_t number = _names.numberOf(row.name);
      _elements.push_back({row.name, row.traits | (isEmpty ? noContent : 0), number});
    }
  }

  const std::vector<HTMLElement>& all() const { return _elements; }

  const HTMLElement* find(std::string_view name) const {
    std::array<char, longestName> lower;
    if (name.size() > lower.size()) {
      return nullptr;
    }
    std::transform(name.begin(), name.end(), lower.begin(),
                   [](char character) { return lowercased(character); });
    const uint32_t number = _names.find({lower.data(), name.size()});
    return number == LUXStringNumbering::none ? nullptr : &_elements[number];
  }

 private:
  LUXStringNumbering _names;
  std::vector<HTMLElement> _elements;
};

const Elements& elements() {
  static const Elements elements;
  return elements;
}

}  // namespace

const std::vector<HTMLElement>& htmlElements() { return elements().all(); }

const HTMLElement* elementOfName(std::string_view name) { return elements().find(name); }

ElementTraits traitsOfElement(std::string_view name) {
  const HTMLElement* const element = elementOfName(name);
  return element == nullptr ? 0 : element->traits;
}

bool isAttributeRead(std::string_view name) {
  constexpr std::array<std::string_view, 10> read = {"id",       "name",       "role",   "lang",
                                                     "open",     "style",      "hidden", "content",
                                                     "xml:lang", "aria-hidden"};
  return std::any_of(read.begin(), read.end(),
                     [&](std::string_view other) { return equalsIgnoringCase(name, other); });
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
