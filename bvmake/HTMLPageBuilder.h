// From the parser's events to a page.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "bvmake/HTMLElements.h"
#include "bvmake/Page.h"
#include "bvmake/TextRun.h"
#include "host/Luxwell/LUXNumbering.h"

namespace bvmake {

struct HTMLAttribute {
  /// In any case.
  std::string_view name;
  /// Empty where it has none.
  std::string_view value;
};

/// Takes the start tags, end tags and text of one HTML page, in order, and decides what of it is
/// searched. Keeps a few words for each open element, so that nesting costs neither stack nor time.
/// Thread-safety: confined to one thread.
class HTMLPageBuilder {
 public:
  using Attributes = const std::vector<HTMLAttribute>&;

  /// Of the attributes those are enough that isAttributeRead() names.
  void startElement(ElementTraits traits, Attributes attributes);
  void endElement();
  void characters(std::string_view text);

  /// How many elements are open.
  size_t depth() const noexcept { return _open.size(); }

  /// The page; the builder is not used afterwards.
  Page finish();

 private:
  /// Where the text of the moment belongs, as the innermost open element has it.
  struct Context {
    ElementTraits traits = 0;
    bool skipped = false;
    bool inHeading = false;
    bool inMain = false;
    /// In main content or a unit of it: headers, footers and asides are content here.
    bool inContent = false;
    bool inChrome = false;
    bool neverProse = false;
    TextBlock::Kind kind = TextBlock::Kind::prose;
  };

  struct Block {
    TextBlock block;
    bool heading;
    bool inMain;
  };

  const Context& _context() const;
  bool _isHidden(ElementTraits traits, Attributes attributes) const;
  void _collectAnchors(ElementTraits traits, Attributes attributes);
  void _readMeta(Attributes attributes);
  void _readLanguage(Attributes attributes);
  void _startLink();
  void _endLink();
  void _finishBlock();

  Page _page;
  std::vector<Context> _open;
  std::vector<Block> _blocks;
  LUXStringNumbering _anchorsSeen;
  TextRun _run;
  TextRun _title;
  bool _inTitle = false;
  bool _titleDone = false;
  /// The first heading anywhere but in navigation: a name for pages that have no other.
  std::string _firstHeading;
  /// Length of the run at the start of the open link; npos when there is none.
  size_t _linkStart = std::string::npos;
};

}  // namespace bvmake
