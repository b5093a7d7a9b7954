// Where the parts of the system lie that this program needs.
#pragma once

#include <string>

namespace zebd {

/// Absolute paths; empty for what is not there.
struct Installation {
  /// The bundle of the plug-in.
  std::string pluginBundlePath;
  /// The indexing tool, where it is not the installed one; empty to use that.
  std::string indexingToolPath;

  /// The parts that belong to the program at `programPath`: those of the same build folder when the
  /// program lies in one, else those of the same installation.
  static Installation ofProgramAtPath(const std::string& programPath);
};

}  // namespace zebd
