// Where the parts of the system lie that this program needs.
#pragma once

#include <string>

namespace zebd {

/// Absolute paths; empty for what is not there.
struct Installation {
  /// The bundle of the plug-in: where it should be, when it is not there.
  std::string pluginBundlePath;
  /// The indexing tool; empty for the one that the plug-in starts by itself, /usr/bin/bvmake.
  std::string indexingToolPath;

  /// The parts that belong to the program at `programPath`: those of the same build folder when the
  /// program lies in one, else those of the same installation, wherever that has been moved to.
  static Installation ofProgramAtPath(const std::string& programPath);
};

}  // namespace zebd
