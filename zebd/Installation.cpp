#include "zebd/Installation.h"

#include <filesystem>

#include "platform/Environment.h"
#include "platform/Strings.h"

namespace zebd {

namespace {

constexpr const char* usualToolPath = "/usr/bin/bvmake";

bool isThere(const std::string& path) {
  return platform::Environment::current()->files->fileExistsAtPath(path);
}

/// The path that leads from the folder by `way`, which may go up.
std::string pathFrom(const std::string& folder, const std::string& way) {
  return (std::filesystem::path(folder) / way).lexically_normal().string();
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
  installation.pluginBundlePath = pathFrom(folder, ZEB_CODE_FROM_PROGRAMS "/HelpPlugin.bundle");
  std::string tool = pathFrom(folder, "bvmake");
  const std::string bundleOfDaemon = pathFrom(folder, ZEB_CODE_FROM_DAEMON "/HelpPlugin.bundle");
  if (!isThere(installation.pluginBundlePath) && isThere(bundleOfDaemon)) {
    installation.pluginBundlePath = bundleOfDaemon;
    tool = pathFrom(folder, ZEB_PROGRAMS_FROM_DAEMON "/bvmake");
  }
  if (tool != usualToolPath && isThere(tool)) {
    installation.indexingToolPath = tool;
  }
  return installation;
}

}  // namespace zebd
