#include "zebd/Installation.h"

#include "platform/Environment.h"
#include "platform/Strings.h"

namespace zebd {

namespace {

bool isThere(const std::string& path) {
  return platform::Environment::current()->files->fileExistsAtPath(path);
}

}  // namespace

Installation Installation::ofProgramAtPath(const std::string& programPath) {
  const std::string folder = platform::stringByDeletingLastPathComponent(programPath);
  const std::string above = platform::stringByDeletingLastPathComponent(folder);
  Installation installation;
  // Build folders have a folder a room.
  const std::string builtBundle = above + "/plugin/HelpPlugin.bundle";
  const std::string builtTool = above + "/bvmake/bvmake";
  if (isThere(builtBundle) && isThere(builtTool)) {
    installation.pluginBundlePath = builtBundle;
    installation.indexingToolPath = builtTool;
    return installation;
  }
  installation.pluginBundlePath = above + "/lib/zeb/HelpPlugin.bundle";
  return installation;
}

}  // namespace zebd
