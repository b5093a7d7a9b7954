// From the XML parser's events to the pages of a DocBook document.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <unordered_set>
#include <vector>

#include "bvmake/DocBookElements.h"
#include "bvmake/Page.h"
#include "bvmake/TextRun.h"

namespace bvmake {

/// Takes the elements and text of one document in order, those of included files where they are
/// included. Thread-safety: confined to one thread.
class DocBookBuilder {
 public:
  /// `id` is the element's identifier, empty when it has none; `isDocBook` whether it is of the
  /// vocabulary.
  void startElement(std::string_view name, bool isDocBook, std::string_view id);
  /// The language of the text, from the document's own element.
  void setLanguage(std::string_view tag) { _language = collapsedText(tag); }
  void endElement();
  void characters(std::string_view text);

  /// How many elements are open.
  size_t depth() const noexcept { return _open.size(); }

  /// The pages in document order, at least one; the builder is not used afterwards.
  std::vector<Page> finish();

 private:
  enum class Target : uint8_t {
    nothing,
    title,
    heading,
    description,
    keyword,
    indexTerm,
    referenceName,
    body
  };

  struct Context {
    DocBookElement element = DocBookElement::inlined;
    Target target = Target::body;
    /// Which of the pages its text belongs to.
    size_t page = 0;
    /// A division or section that is a page of its own.
    bool isPage = false;
    /// How many sections are around it or are it.
    size_t sectionDepth = 0;
    bool block = false;
    bool neverProse = false;
    TextBlock::Kind kind = TextBlock::Kind::other;
    const char* separator = nullptr;
    bool hasChildren = false;
  };

  Context _contextOf(std::string_view name, const Context& parent, std::string_view id);
  void _startDivision(DocBookElement element, std::string_view id, Context& context);
  void _setTitleTarget(const Context& parent, Context& context) const;
  void _addAnchor(std::string_view id, size_t page);
  void _addKeyword(std::string text, size_t page);
  void _finishBlock();

  std::string _language;
  std::vector<Page> _pages;
  std::vector<Context> _open;
  std::unordered_set<std::string> _anchorsSeen;
  /// Each after the number of its page.
  std::unordered_set<std::string> _keywordsSeen;
  TextRun _run;
  /// Terms of the index stand in the middle of sentences, which go on behind them.
  TextRun _indexTerm;
};

}  // namespace bvmake
