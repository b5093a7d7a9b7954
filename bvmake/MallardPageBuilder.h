// From the XML parser's events to a Mallard page.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <unordered_set>
#include <vector>

#include "bvmake/Page.h"
#include "bvmake/TextRun.h"

namespace bvmake {

/// Takes the elements and text of one Mallard page in document order.
/// Thread-safety: confined to one thread.
class MallardPageBuilder {
 public:
  /// `id` is the element's identifier, empty when it has none; `type` its attribute of that name.
  void startElement(std::string_view namespaceURI, std::string_view name, std::string_view id,
                    std::string_view type);
  /// The language of the text, from the page's own element.
  void setLanguage(std::string_view tag) { _page.language = collapsedText(tag); }
  void endElement();
  void characters(std::string_view text);

  /// Whether the root element is that of a Mallard page; false before there is one.
  bool isMallardPage() const noexcept { return _isMallardPage; }

  /// The page; the builder is not used afterwards.
  Page finish();

 private:
  enum class Element : uint8_t { page, section, info, other };
  enum class Target : uint8_t { nothing, title, description, keywords, heading, body };

  struct Context {
    Element element = Element::other;
    Target target = Target::nothing;
    bool block = false;
    bool neverProse = false;
    TextBlock::Kind kind = TextBlock::Kind::other;
    /// What stands between the children: menus and keys are written as sequences of elements.
    const char* separator = nullptr;
    bool hasChildren = false;
  };

  Context _contextOf(std::string_view name, std::string_view type, const Context& parent) const;
  void _finishBlock();

  Page _page;
  std::vector<Context> _open;
  std::unordered_set<std::string> _anchorsSeen;
  TextRun _run;
  bool _isMallardPage = false;
};

}  // namespace bvmake
