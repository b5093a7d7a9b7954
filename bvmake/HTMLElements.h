// What the elements of HTML mean to an indexer.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>
#include <vector>

namespace bvmake {

/// Properties of an element, or-ed together; 0 is an inline element such as `b`.
using ElementTraits = uint32_t;

namespace elementtraits {
/// Begins and ends a block of text.
inline constexpr ElementTraits block = 1U << 0;
/// Its text is not the page's text.
inline constexpr ElementTraits skipped = 1U << 1;
inline constexpr ElementTraits heading = 1U << 2;
/// Belongs to the page around the content, unless inside the content.
inline constexpr ElementTraits chrome = 1U << 3;
inline constexpr ElementTraits mainContent = 1U << 4;
/// A unit of content whose headers and footers are its own.
inline constexpr ElementTraits contentUnit = 1U << 5;
/// Text directly in it is not made of sentences.
inline constexpr ElementTraits notProse = 1U << 6;
/// As notProse, and so is all that is inside.
inline constexpr ElementTraits neverProse = 1U << 7;
/// Text directly in it is prose again.
inline constexpr ElementTraits prose = 1U << 8;
inline constexpr ElementTraits title = 1U << 9;
inline constexpr ElementTraits meta = 1U << 10;
inline constexpr ElementTraits link = 1U << 11;
/// Hidden unless it has the attribute `open`.
inline constexpr ElementTraits hiddenUnlessOpen = 1U << 12;
/// The element that holds everything; hiding it is a trick of scripts.
inline constexpr ElementTraits root = 1U << 13;
/// Breaks the line, and is a blank in the text.
inline constexpr ElementTraits lineBreak = 1U << 14;
/// Has no content, and so no end tag.
inline constexpr ElementTraits noContent = 1U << 15;
/// Its content is no markup.
inline constexpr ElementTraits rawText = 1U << 16;
/// Has no text but blanks of its own.
inline constexpr ElementTraits noText = 1U << 17;
/// One that is directly in another ends it.
inline constexpr ElementTraits endsBeforeItself = 1U << 18;
/// May go without an end tag where the element around it ends.
inline constexpr ElementTraits endsWithParent = 1U << 19;
}  // namespace elementtraits

/// An element of HTML; there is one object for each, which lives for ever.
struct HTMLElement {
  /// In small letters.
  const char* name;
  ElementTraits traits;
  /// From 0, below maximumElementCount.
  size_t number;
};

inline constexpr size_t maximumElementCount = 160;

/// All of them, by number.
const std::vector<HTMLElement>& htmlElements();

/// The element of this name, in any case; null where nobody knows it.
const HTMLElement* elementOfName(std::string_view name);

/// The traits of an element by its name, 0 for one that nobody knows.
ElementTraits traitsOfElement(std::string_view name);

/// Whether anybody asks for the attribute of this name, in any case.
bool isAttributeRead(std::string_view name);

/// The traits that the attribute `role` adds; `role` as written.
ElementTraits traitsOfRole(std::string_view role);

/// Whether an inline style sheet makes the element invisible.
bool styleHides(std::string_view style);

}  // namespace bvmake
