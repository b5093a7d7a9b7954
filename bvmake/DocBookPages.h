// DocBook documents.
#pragma once

#include <cstddef>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "bvmake/Page.h"
#include "platform/Error.h"

namespace bvmake {

inline constexpr const char* docBookNamespace = "http://docbook.org/ns/docbook";

/// A file of a document.
struct DocBookFile {
  /// What files that it includes are found from; any text that tells files apart.
  std::string name;
  /// Well-formed UTF-8, no NUL.
  std::string text;
};

/// Gives the file that a document names, as found from `from`. Absent, with `why` set, where there
/// is none, or none that may be read.
using DocBookLoader = std::function<std::optional<DocBookFile>(
    const std::string& from, std::string_view reference, std::string& why)>;

/// Bounds of what one document may bring in beside its first file: bytes and number of files and
/// entities, and how deep they may include each other.
inline constexpr size_t maximumIncludedBytes = size_t{128} << 20;
inline constexpr size_t maximumIncludedCount = 10'000;
inline constexpr size_t maximumInclusionDepth = 16;

struct DocBookPages {
  /// In document order, at least one.
  std::vector<Page> pages;
  /// What was left out, one line each: files that could not be included.
  std::vector<std::string> notes;
};

/// Reads a document, of version 4 or 5, with the files that it includes: external entities
/// (`<!ENTITY a SYSTEM "a.docbook">`) and XInclude. Absent, with `error` set when given, for a
/// first file that is no well-formed XML or no document of the vocabulary, and where bounds are
/// passed.
///
/// The document is split into pages: one for each chapter and other division, and for each section
/// right below one, that has an identifier; what lies deeper, and what has none, belongs to the
/// page around it. Titles, abstracts, key words and terms of the index are those of the page that
/// they stand in; all other information about authors and rights is left out, as are remarks and
/// what stands in for media. Identifiers are anchors.
///
/// Entities that the document declares for text are replaced, with what they name in turn. For all
/// others, whose declarations are in files outside the document, their names stand, but for the
/// characters that HTML has names for.
std::optional<DocBookPages> readDocBook(const DocBookFile& file, const DocBookLoader& load,
                                        platform::Error* error = nullptr);

}  // namespace bvmake
