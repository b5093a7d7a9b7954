// Shows what is in a help-index file.
#pragma once

#include <optional>
#include <string>

#include "bvmake/Run.h"

namespace bvmake {

class Report;

struct InspectOptions {
  /// The help-index file.
  std::string path;
  /// Show the pages that have this word; split and folded as the index's own text was.
  std::optional<std::string> term;
  /// Show the pages that carry this anchor, spelled exactly so.
  std::optional<std::string> anchor;
  /// Show every page with title and abstract.
  bool pages = false;
};

/// Appends a description of the file to `output`, lines of text in UTF-8: its keys with their
/// sizes, the counts of pages, terms and anchors, and what the options ask for. Control characters
/// of the file's own strings come out as '?'. Fails, with a report, for a file that is no help
/// index.
ExitCode inspect(const InspectOptions& options, std::string& output, Report& report);

}  // namespace bvmake
