#include "bvmake/HTMLPageBuilder.h"

#include <algorithm>
#include <optional>
#include <utility>

#include "bvmake/ASCII.h"
#include "bvmake/KeywordList.h"

namespace bvmake {

namespace {

std::optional<std::string_view> attribute(HTMLPageBuilder::Attributes attributes,
                                          std::string_view name) {
  for (const HTMLAttribute& attribute : attributes) {
    if (equalsIgnoringCase(attribute.name, name)) {
      return attribute.value;
    }
  }
  return std::nullopt;
}

bool forbidsIndexing(std::string_view robots) {
  while (!robots.empty()) {
    const size_t end = robots.find_first_of(", \t\n\f\r");
    const std::string_view word = robots.substr(0, end);
    if (equalsIgnoringCase(word, "noindex") || equalsIgnoringCase(word, "none")) {
      return true;
    }
    robots.remove_prefix(end == std::string_view::npos ? robots.size() : end + 1);
  }
  return false;
}

}  // namespace

const HTMLPageBuilder::Context& HTMLPageBuilder::_context() const {
  static const Context outermost;
  return _open.empty() ? outermost : _open.back();
}

void HTMLPageBuilder::startElement(ElementTraits traits, Attributes attributes) {
  if (const auto role = attribute(attributes, "role")) {
    traits |= traitsOfRole(*role);
  }
  if (!attributes.empty()) {
    _collectAnchors(traits, attributes);
  }

  Context context = _context();
  context.traits = traits;
  if (context.skipped) {
    _open.push_back(context);
    return;
  }
  if ((traits & elementtraits::block) != 0) {
    _finishBlock();
  } else if ((traits & elementtraits::lineBreak) != 0) {
    characters(" ");
  }
  if ((traits & elementtraits::meta) != 0) {
    _readMeta(attributes);
  }
  if ((traits & elementtraits::root) != 0) {
    _readLanguage(attributes);
  }
  if ((traits & elementtraits::title) != 0 && !_titleDone) {
    _inTitle = true;
  }
  if ((traits & elementtraits::link) != 0) {
    _startLink();
  }
  context.skipped = _isHidden(traits, attributes);
  context.inHeading = context.inHeading || (traits & elementtraits::heading) != 0;
  context.inMain = context.inMain || (traits & elementtraits::mainContent) != 0;
  context.inChrome =
      context.inChrome || ((traits & elementtraits::chrome) != 0 && !context.inContent);
  context.inContent = context.inContent ||
                      (traits & (elementtraits::mainContent | elementtraits::contentUnit)) != 0;
  context.neverProse = context.neverProse || (traits & elementtraits::neverProse) != 0;
  if (context.neverProse || (traits & elementtraits::notProse) != 0) {
    context.kind = TextBlock::Kind::other;
  } else if ((traits & elementtraits::prose) != 0) {
    context.kind = TextBlock::Kind::prose;
  }
  _open.push_back(context);
}

void HTMLPageBuilder::endElement() {
  if (_open.empty()) {
    return;
  }
  const Context ended = _open.back();
  const bool outerSkipped = _open.size() > 1 && _open[_open.size() - 2].skipped;
  if (!outerSkipped) {
    if ((ended.traits & elementtraits::link) != 0) {
      _endLink();
    }
    if ((ended.traits & elementtraits::block) != 0) {
      // Still inside the element: the text belongs to it.
      _finishBlock();
    }
    if ((ended.traits & elementtraits::title) != 0 && _inTitle) {
      _inTitle = false;
      _page.title = _title.take();
      _titleDone = !_page.title.empty();
    }
  }
  _open.pop_back();
}

void HTMLPageBuilder::characters(std::string_view text) {
  if (_context().skipped) {
    return;
  }
  if (_inTitle) {
    _title.append(text);
    return;
  }
  _run.append(text);
}

Page HTMLPageBuilder::finish() {
  while (!_open.empty()) {
    endElement();
  }
  _finishBlock();
  const bool hasMain =
      std::any_of(_blocks.begin(), _blocks.end(), [](const Block& block) { return block.inMain; });
  for (Block& block : _blocks) {
    if (hasMain && !block.inMain) {
      continue;
    }
    if (block.heading) {
      _page.headings.push_back(std::move(block.block.text));
    } else {
      _page.body.push_back(std::move(block.block));
    }
  }
  if (_page.title.empty()) {
    _page.title = _page.headings.empty() ? _firstHeading : _page.headings.front();
  }
  return std::move(_page);
}

bool HTMLPageBuilder::_isHidden(ElementTraits traits, Attributes attributes) const {
  if ((traits & elementtraits::skipped) != 0) {
    return true;
  }
  if ((traits & elementtraits::hiddenUnlessOpen) != 0 && !attribute(attributes, "open")) {
    return true;
  }
  if ((traits & elementtraits::root) != 0 || attributes.empty()) {
    return false;
  }
  if (const auto hidden = attribute(attributes, "hidden")) {
    return !equalsIgnoringCase(*hidden, "until-found");
  }
  if (const auto hidden = attribute(attributes, "aria-hidden")) {
    if (equalsIgnoringCase(trimmed(*hidden), "true")) {
      return true;
    }
  }
  const auto style = attribute(attributes, "style");
  return style && styleHides(*style);
}

void HTMLPageBuilder::_collectAnchors(ElementTraits traits, Attributes attributes) {
  const auto add = [this](std::optional<std::string_view> name) {
    if (name && !name->empty() && _anchorsSeen.numberOf(*name) == _page.anchors.size()) {
      _page.anchors.emplace_back(*name);
    }
  };
  add(attribute(attributes, "id"));
  if ((traits & elementtraits::link) != 0) {
    add(attribute(attributes, "name"));
  }
}

void HTMLPageBuilder::_readMeta(Attributes attributes) {
  const auto name = attribute(attributes, "name");
  const auto content = attribute(attributes, "content");
  if (!name || !content) {
    return;
  }
  const std::string_view kind = trimmed(*name);
  if (equalsIgnoringCase(kind, "description")) {
    if (_page.description.empty()) {
      _page.description = collapsedText(*content);
    }
  } else if (equalsIgnoringCase(kind, "keywords")) {
    addKeywords(*content, _page.keywords);
  } else if (equalsIgnoringCase(kind, "robots")) {
    _page.excludedFromSearch = _page.excludedFromSearch || forbidsIndexing(*content);
  }
}

void HTMLPageBuilder::_readLanguage(Attributes attributes) {
  for (const char* const name : {"lang", "xml:lang"}) {
    const auto tag = attribute(attributes, name);
    if (_page.language.empty() && tag) {
      _page.language = collapsedText(*tag);
    }
  }
}

void HTMLPageBuilder::_startLink() { _linkStart = _run.text().size(); }

void HTMLPageBuilder::_endLink() {
  // Links that show only a mark ("¶", "#", "§") lead to the place where they stand.
  if (_linkStart < _run.text().size() &&
      !hasLetterOrDigit(std::string_view(_run.text()).substr(_linkStart))) {
    _run.truncate(_linkStart);
  }
  _linkStart = std::string::npos;
}

void HTMLPageBuilder::_finishBlock() {
  _linkStart = std::string::npos;
  if (_run.empty()) {
    return;
  }
  const Context& context = _context();
  std::string text = _run.take();
  if (!hasLetterOrDigit(text)) {
    return;
  }
  if (context.inHeading && _firstHeading.empty()) {
    _firstHeading = text;
  }
  if (!context.inChrome) {
    _blocks.push_back({{context.kind, std::move(text)}, context.inHeading, context.inMain});
  }
}

}  // namespace bvmake
