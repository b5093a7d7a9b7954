#include "bvmake/MallardPageBuilder.h"

#include <algorithm>
#include <array>
#include <utility>

#include "bvmake/KeywordList.h"
#include "bvmake/MallardPage.h"

namespace bvmake {

namespace {

constexpr const char* inclusionNamespace = "http://www.w3.org/2001/XInclude";

template <size_t count>
bool isOneOf(std::string_view name, const std::array<std::string_view, count>& names) {
  return std::find(names.begin(), names.end(), name) != names.end();
}

bool isInline(std::string_view name) {
  static constexpr std::array<std::string_view, 18> names = {
      "app", "cmd",    "code", "em",     "file", "gui", "guiseq", "hi",    "input",
      "key", "keyseq", "link", "output", "span", "sys", "var",    "email", "years"};
  return isOneOf(name, names);
}

bool isNeverProse(std::string_view name) {
  static constexpr std::array<std::string_view, 4> names = {"table", "screen", "synopsis", "tree"};
  return isOneOf(name, names);
}

bool isLeftOut(std::string_view name) {
  return name == "info" || name == "comment" || name == "media";
}

}  // namespace

void MallardPageBuilder::startElement(std::string_view namespaceURI, std::string_view name,
                                      std::string_view id, std::string_view type) {
  const bool isMallard = namespaceURI == mallardNamespace;
  if (_open.empty()) {
    _isMallardPage = isMallard && name == "page";
  }
  if (isMallard && !id.empty() && _anchorsSeen.emplace(id).second) {
    _page.anchors.emplace_back(id);
  }
  Context parent;
  if (!_open.empty()) {
    parent = _open.back();
    if (parent.separator != nullptr && std::exchange(_open.back().hasChildren, true)) {
      _run.append(parent.separator);
    }
  }
  Context context;
  if (isMallard) {
    context = _contextOf(name, type, parent);
  } else {
    // Extensions of the vocabulary wrap ordinary content; inclusions name other files.
    context = parent;
    context.element = Element::other;
    context.block = false;
    context.separator = nullptr;
    if (namespaceURI == inclusionNamespace) {
      context.target = Target::nothing;
      context.block = true;
    }
  }
  if (context.block) {
    _finishBlock();
  }
  _open.push_back(context);
}

MallardPageBuilder::Context MallardPageBuilder::_contextOf(std::string_view name,
                                                           std::string_view type,
                                                           const Context& parent) const {
  Context context;
  context.target = parent.target;
  context.kind = parent.kind;
  context.neverProse = parent.neverProse || isNeverProse(name);
  context.block = !isInline(name);
  if (_open.empty()) {
    context.element = Element::page;
    context.target = Target::body;
    return context;
  }
  if (parent.element == Element::info) {
    // Only the page's own abstract and keywords are wanted, not those of its sections.
    const bool ofPage = _open.size() == 2;
    context.target = Target::nothing;
    if (ofPage && name == "desc") {
      context.target = Target::description;
    } else if (ofPage && name == "keywords") {
      context.target = Target::keywords;
    }
    return context;
  }
  if (isLeftOut(name)) {
    context.element = name == "info" ? Element::info : Element::other;
    context.target = Target::nothing;
    return context;
  }
  if (name == "guiseq") {
    context.separator = " \u25B8 ";
  } else if (name == "keyseq") {
    context.separator = type == "sequence" ? " " : "+";
  }
  if (context.target != Target::body) {
    return context;
  }
  if (name == "section") {
    context.element = Element::section;
    context.kind = TextBlock::Kind::other;
  } else if (name == "title" && parent.element == Element::page) {
    context.target = Target::title;
  } else if (name == "title" && parent.element == Element::section) {
    context.target = Target::heading;
  } else if (context.block) {
    context.kind =
        name == "p" && !context.neverProse ? TextBlock::Kind::prose : TextBlock::Kind::other;
  }
  return context;
}

void MallardPageBuilder::endElement() {
  if (_open.empty()) {
    return;
  }
  if (_open.back().block) {
    // Still inside the element: the text belongs to it.
    _finishBlock();
  }
  _open.pop_back();
}

void MallardPageBuilder::characters(std::string_view text) {
  if (!_open.empty() && _open.back().target != Target::nothing) {
    _run.append(text);
  }
}

Page MallardPageBuilder::finish() {
  if (_page.title.empty() && !_page.headings.empty()) {
    _page.title = _page.headings.front();
  }
  return std::move(_page);
}

void MallardPageBuilder::_finishBlock() {
  std::string text = _run.take();
  if (_open.empty() || !hasLetterOrDigit(text)) {
    return;
  }
  const Context& context = _open.back();
  switch (context.target) {
    case Target::nothing:
      break;
    case Target::title:
      if (_page.title.empty()) {
        _page.title = std::move(text);
      }
      break;
    case Target::description:
      if (_page.description.empty()) {
        _page.description = std::move(text);
      }
      break;
    case Target::keywords:
      addKeywords(text, _page.keywords);
      break;
    case Target::heading:
      _page.headings.push_back(std::move(text));
      break;
    case Target::body:
      _page.body.push_back({context.kind, std::move(text)});
      break;
  }
}

}  // namespace bvmake
