// Finds the pages of a folder.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "bvmake/PageReader.h"
#include "platform/Error.h"

namespace bvmake {

class Report;

struct FoundPage {
  /// Within the folder, beginning with a slash: the page's name in the index.
  std::string path;
  /// Where to read it.
  std::string file;
  PageKind kind = PageKind::html;
  /// Bytes of the file when it was found.
  uint64_t size = 0;
};

/// All files below `folder` whose names are those of pages, in the order of the bytes of their
/// paths. Sub-folders that cannot be listed and names that are not UTF-8 are reported and left out.
///
/// Symbolic links never lead out of the folder and never bring a page in twice: a link is followed
/// only where it leads to a file inside that is not found under a name of its own. So cycles of
/// links do no harm. Things that are neither files nor folders are left alone.
///
/// Absent, with `error` set when given, when `folder` is not there, is no folder or cannot be
/// listed.
std::optional<std::vector<FoundPage>> findPages(const std::string& folder, Report& report,
                                                platform::Error* error = nullptr);

}  // namespace bvmake
