#include "bvmake/DocBookBuilder.h"

#include <algorithm>
#include <utility>

#include "bvmake/ASCII.h"

namespace bvmake {

namespace {

using Element = DocBookElement;

/// Whether a page may be named by this identifier. Others are anchors all the same.
bool canBeFragment(std::string_view id) {
  return !id.empty() && std::none_of(id.begin(), id.end(), [](char character) {
    return static_cast<unsigned char>(character) <= 0x20 || character == 0x7F || character == '/' ||
           character == '#';
  });
}

bool isDivision(Element element) {
  return element == Element::division || element == Element::section ||
         element == Element::subsection;
}

}  // namespace

void DocBookBuilder::startElement(std::string_view name, bool isDocBook, std::string_view id) {
  Context parent;
  if (_open.empty()) {
    _pages.emplace_back();
  } else {
    parent = _open.back();
    if (parent.separator != nullptr && std::exchange(_open.back().hasChildren, true)) {
      _run.append(parent.separator);
    }
  }
  Context context;
  if (isDocBook) {
    context = _contextOf(name, parent, id);
  } else {
    context.target = Target::nothing;
    context.page = parent.page;
    context.block = true;
  }
  if (context.block) {
    _finishBlock();
  }
  if (isDocBook && !id.empty()) {
    _addAnchor(id, context.page);
  }
  _open.push_back(context);
}

DocBookBuilder::Context DocBookBuilder::_contextOf(std::string_view name, const Context& parent,
                                                   std::string_view id) {
  Context context;
  context.element = docBookElement(name);
  context.target = parent.target;
  context.page = parent.page;
  context.sectionDepth = parent.sectionDepth;
  context.neverProse = parent.neverProse || context.element == Element::notProse;
  context.kind = parent.kind;
  context.block = context.element != Element::inlined && context.element != Element::indexTerm &&
                  context.element != Element::menuChoice &&
                  context.element != Element::keyCombination;
  if (parent.target == Target::indexTerm) {
    // Its parts are one term.
    context.element = Element::inlined;
    context.block = false;
    _indexTerm.appendBlank();
    return context;
  }
  if (parent.target == Target::nothing && parent.element != Element::info) {
    context.block = false;
    return context;
  }
  if (parent.element == Element::info) {
    // Groups of key words are as good as the element around them.
    context.target = Target::nothing;
    if (name == "keywordset" || name == "subjectset" || name == "subject") {
      context.element = Element::info;
    }
  }
  switch (context.element) {
    case Element::division:
    case Element::section:
    case Element::subsection:
      _startDivision(context.element, id, context);
      break;
    case Element::info:
    case Element::skipped:
      context.target = Target::nothing;
      break;
    case Element::title:
      _setTitleTarget(parent, context);
      break;
    case Element::heading:
      context.target = Target::heading;
      break;
    case Element::abstract:
      context.target = parent.element == Element::info ? Target::description : parent.target;
      break;
    case Element::keyword:
      context.target = Target::keyword;
      break;
    case Element::indexTerm:
      context.target = Target::indexTerm;
      break;
    case Element::referenceName:
      context.target = Target::referenceName;
      break;
    case Element::referencePurpose:
      context.target = Target::description;
      break;
    case Element::menuChoice:
      context.separator = " \u25B8 ";
      break;
    case Element::keyCombination:
      context.separator = "+";
      break;
    case Element::prose:
      context.kind = context.neverProse ? TextBlock::Kind::other : TextBlock::Kind::prose;
      break;
    case Element::block:
    case Element::notProse:
      context.kind = TextBlock::Kind::other;
      break;
    case Element::inlined:
      break;
  }
  return context;
}

void DocBookBuilder::_startDivision(Element element, std::string_view id, Context& context) {
  context.target = Target::body;
  context.kind = TextBlock::Kind::other;
  context.sectionDepth += element == Element::division ? 0 : 1;
  // What cannot be addressed, and what lies deeper than the sections of a chapter, is part of the
  // page around it.
  const bool isPage =
      element == Element::division || (element == Element::section && context.sectionDepth == 1);
  if (_open.empty()) {
    context.isPage = true;
  } else if (isPage && canBeFragment(id) && !_anchorsSeen.contains(std::string(id))) {
    context.isPage = true;
    context.page = _pages.size();
    _pages.emplace_back();
    _pages.back().fragment = id;
  }
}

void DocBookBuilder::_setTitleTarget(const Context& parent, Context& context) const {
  // The division that the title is of: the parent, or what is around its information.
  const Context* owner = &parent;
  if (parent.element == Element::info && _open.size() > 1) {
    owner = &_open[_open.size() - 2];
  }
  if (owner->isPage) {
    context.target = Target::title;
  } else if (isDivision(owner->element)) {
    context.target = Target::heading;
  } else if (parent.element != Element::info) {
    context.target = parent.target;
    context.kind = TextBlock::Kind::other;
  }
}

void DocBookBuilder::endElement() {
  if (_open.empty()) {
    return;
  }
  const Context ended = _open.back();
  if (ended.element == Element::indexTerm) {
    _addKeyword(_indexTerm.take(), ended.page);
  } else if (ended.block) {
    // Still inside the element: the text belongs to it.
    _finishBlock();
  }
  _open.pop_back();
}

void DocBookBuilder::characters(std::string_view text) {
  if (_open.empty() || _open.back().target == Target::nothing) {
    return;
  }
  (_open.back().target == Target::indexTerm ? _indexTerm : _run).append(text);
}

std::vector<Page> DocBookBuilder::finish() {
  if (_pages.empty()) {
    _pages.emplace_back();
  }
  for (Page& page : _pages) {
    page.language = _language;
    if (page.title.empty() && !page.headings.empty()) {
      page.title = page.headings.front();
    }
  }
  return std::move(_pages);
}

void DocBookBuilder::_addAnchor(std::string_view id, size_t page) {
  if (_anchorsSeen.emplace(id).second) {
    _pages[page].anchors.emplace_back(id);
  }
}

void DocBookBuilder::_addKeyword(std::string text, size_t page) {
  if (hasLetterOrDigit(text) && _keywordsSeen.insert(std::to_string(page) + ' ' + text).second) {
    _pages[page].keywords.push_back(std::move(text));
  }
}

void DocBookBuilder::_finishBlock() {
  std::string text = _run.take();
  if (_open.empty() || !hasLetterOrDigit(text)) {
    return;
  }
  const Context& context = _open.back();
  Page& page = _pages[context.page];
  switch (context.target) {
    case Target::nothing:
    case Target::indexTerm:
      break;
    case Target::title:
      if (page.title.empty()) {
        page.title = std::move(text);
      }
      break;
    case Target::heading:
      page.headings.push_back(std::move(text));
      break;
    case Target::description:
      page.description += page.description.empty() ? text : " " + text;
      break;
    case Target::keyword:
      _addKeyword(std::move(text), context.page);
      break;
    case Target::referenceName:
      if (page.title.empty()) {
        page.title = std::move(text);
      } else {
        page.headings.push_back(std::move(text));
      }
      break;
    case Target::body:
      page.body.push_back({context.kind, std::move(text)});
      break;
  }
}

}  // namespace bvmake
