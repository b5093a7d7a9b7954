// Which files are help pages, and from their bytes to a Page.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "bvmake/DocBookPages.h"
#include "bvmake/Page.h"
#include "platform/Error.h"

namespace bvmake {

enum class PageKind : uint8_t {
  /// HTML and XHTML, as found in the wild.
  html,
  /// Mallard, the XML vocabulary of help pages.
  mallard,
  /// DocBook: the first file of a document, which has several pages.
  docBook,
};

/// Pages of more bytes than this are refused, so that a file that is no page at all (a disk image
/// under the wrong name) cannot take all memory.
inline constexpr size_t maximumPageSize = size_t{256} << 20;

/// What is said of them.
platform::Error tooLargeError();

/// The first file of a DocBook document, by which viewers find it.
inline constexpr std::string_view docBookFileName = "index.docbook";

/// The kind that the file name stands for: by its extension, whatever the case (.html, .htm,
/// .xhtml, .xht; .page), or as docBookFileName; absent for files that are no help pages.
std::optional<PageKind> pageKindOfFileName(std::string_view name);

/// Reads one page of HTML or Mallard. Absent, with `error` (format domain) set when given, for
/// bytes that are no page of this kind; the description says what is wrong and does not name the
/// file. Any bytes whatever are taken in time about linear in their length, without network, other
/// files or entity expansion. Thread-safety: pages may be read side by side.
std::optional<Page> readPage(PageKind kind, std::string_view bytes,
                             platform::Error* error = nullptr);

/// The same for a DocBook document, the file of which is called `name`; other files come from
/// `load` alone.
std::optional<DocBookPages> readDocBookPages(const std::string& name, std::string_view bytes,
                                             const DocBookLoader& load,
                                             platform::Error* error = nullptr);

}  // namespace bvmake
