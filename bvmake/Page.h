// A help page as plain data: what its file says, whatever language it was written in.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace bvmake {

/// One block of running text: a paragraph, a list item, a table cell.
struct TextBlock {
  enum class Kind : uint8_t {
    /// Made to be read in sentences; abstracts are cut from these first.
    prose,
    /// List items, table cells, program text, captions.
    other,
  };

  Kind kind = Kind::prose;
  std::string text;

  friend bool operator==(const TextBlock&, const TextBlock&) = default;
};

/// What one page holds. All strings are well-formed UTF-8 in which runs of white space are one
/// blank, with none at the ends; lists hold no empty strings. A page knows nothing of the other
/// pages of its folder, so pages can be read in any order and side by side.
struct Page {
  /// Empty when the page names none.
  std::string title;
  /// The author's own abstract; empty when there is none.
  std::string description;
  /// Words and phrases that the author gave the page.
  std::vector<std::string> keywords;
  std::vector<std::string> headings;
  std::vector<TextBlock> body;
  /// Names by which places in the page can be addressed, each once, in document order.
  std::vector<std::string> anchors;
  /// Of a page that is a part of its file: the name of the place where it begins, one of the
  /// anchors. Empty for the page that begins with its file.
  std::string fragment;
  /// The tag of the language that the page says it is in, as written; empty when it does not say.
  std::string language;
  /// The page asks not to be found.
  bool excludedFromSearch = false;

  bool hasText() const noexcept {
    return !title.empty() || !description.empty() || !keywords.empty() || !headings.empty() ||
           !body.empty();
  }

  friend bool operator==(const Page&, const Page&) = default;
};

}  // namespace bvmake
