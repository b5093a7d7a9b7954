// What the elements of DocBook mean to an indexer.
#pragma once

#include <cstdint>
#include <string_view>

namespace bvmake {

enum class DocBookElement : uint8_t {
  /// Marks up words in running text; what is not known is that too.
  inlined,
  /// Begins and ends a block of text.
  block,
  /// A block that is made to be read in sentences.
  prose,
  /// A block that is not, nor is anything in it: tables, program text.
  notProse,
  /// A chapter or another part of a document that may have sections in it.
  division,
  /// A section whose name does not tell how deep it is.
  section,
  /// A section below another one.
  subsection,
  /// What is said about a division.
  info,
  title,
  heading,
  abstract,
  keyword,
  indexTerm,
  /// What a manual page is about, by name and in one line.
  referenceName,
  referencePurpose,
  /// Menu entries and keys, written as sequences of elements.
  menuChoice,
  keyCombination,
  /// Not searched.
  skipped,
};

DocBookElement docBookElement(std::string_view name);

/// Whether a document may begin with this element.
bool isDocBookRoot(std::string_view name);

}  // namespace bvmake
