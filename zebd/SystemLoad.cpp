#include "zebd/SystemLoad.h"

#include <cstdlib>
#include <optional>
#include <vector>

#include "platform/Environment.h"
#include "platform/Files.h"

namespace zebd {

namespace {

using platform::stringByAppendingPathComponent;

/// The first line; empty where there is none.
std::string lineOf(const std::string& path) {
  const auto bytes = platform::Environment::current()->files->contentsAtPath(path);
  const std::string text = bytes ? std::string(bytes->view()) : std::string();
  return text.substr(0, text.find('\n'));
}

bool runsOnBattery(const std::string& root) {
  const std::string supplies = root + "/sys/class/power_supply";
  const auto names = platform::Environment::current()->files->namesInDirectory(supplies);
  bool hasDischarging = false;
  for (const std::string& name : names.value_or(std::vector<std::string>())) {
    const std::string supply = stringByAppendingPathComponent(supplies, name);
    const std::string type = lineOf(stringByAppendingPathComponent(supply, "type"));
    if (type == "Mains" && lineOf(stringByAppendingPathComponent(supply, "online")) == "1") {
      return false;
    }
    // Batteries of mice and pens have another scope.
    const bool isOurs = lineOf(stringByAppendingPathComponent(supply, "scope")) != "Device";
    hasDischarging = hasDischarging ||
                     (type == "Battery" && isOurs &&
                      lineOf(stringByAppendingPathComponent(supply, "status")) == "Discharging");
  }
  return hasDischarging;
}

}  // namespace

bool computerShouldBeLazy(int processorCount, const std::string& root) {
  // The average over the last minute comes first.
  const double load = std::strtod(lineOf(root + "/proc/loadavg").c_str(), nullptr);
  return load >= 1.5 * processorCount || runsOnBattery(root);
}

}  // namespace zebd
